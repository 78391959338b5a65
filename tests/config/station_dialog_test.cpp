// A surveyor adding or editing a level in its property sheet stores exactly what the sheet shows.
#include <gtest/gtest.h>

#include <filesystem>

#include "config/sheet_driver.h"
#include "helpers/app_helpers.h"
#include "support/test_files.h"

using namespace sheet;
using namespace ui;
using user::Box;
using user::ReadBox;

namespace {

Box Refusal(const std::wstring& text) { return {L"Add New Digital Level", text, L"error"}; }

const wchar_t kGerman[] =
    L"; Deutsch\r\n"
    L"[Create Digital Level]\r\n[Digitalnivellier anlegen]\r\n"
    L"[Digital Level properties]\r\n[Eigenschaften des Digitalnivelliers]\r\n"
    L"[General]\r\n[Allgemein]\r\n[Advanced]\r\n[Erweitert]\r\n"
    L"[Name:]\r\n[Bezeichnung:]\r\n[Note:]\r\n[Notiz:]\r\n[Port:]\r\n[Anschluss:]\r\n[Model:]\r\n[Modell:]\r\n"
    L"[Baudrate:]\r\n[Übertragungsrate:]\r\n[Parity:]\r\n[Parität:]\r\n[Data bits:]\r\n[Datenbits:]\r\n"
    L"[Stop bits:]\r\n[Stoppbits:]\r\n[Flow control:]\r\n[Flusssteuerung:]\r\n[Checksum:]\r\n[Prüfsumme:]\r\n"
    L"[None]\r\n[Keine]\r\n[Odd]\r\n[Ungerade]\r\n[Even]\r\n[Gerade]\r\n[Not set]\r\n[Aus]\r\n[Set]\r\n[Ein]\r\n"
    L"[Add New Digital Level]\r\n[Neues Digitalnivellier]\r\n"
    L"[Please enter valid device name!]\r\n[Bitte einen gültigen Gerätenamen eingeben!]\r\n";
bool German() { return GetThreadUILanguage() == 1031; }

struct StationSheet : testing::Test {
  // Started with LC_ALL=de_DE.UTF-8 (CTest config_german_tests), the program reads its texts from
  // a German translation beside it.
  static void SetUpTestSuite() {
    if (!German()) return;
    const std::wstring app = kld::ft::GetAppPathW();
    const std::wstring title = std::filesystem::path(kld::ft::GetExecutablePath()).stem().wstring();
    testfiles::MarkNotInstalled(app);
    std::filesystem::create_directories(app + L"Languages\\de-DE");
    testfiles::WriteTranslation(app + L"Languages\\de-DE\\" + title + L".txt", kGerman);
  }
  void SetUp() override { SetSerialPorts({{L"\\Device\\Serial2", L"COM2"}, {L"\\Device\\Serial10", L"COM10"},
                                          {L"\\Device\\Serial1", L"COM1"}, {L"\\Device\\VSer", L"XYZ"}}); }
  // Stores a level with `change` made to its record, and returns it as the store hands it out.
  static CStationRecord Stored(const std::wstring& name, const std::function<void(CStationRecord&)>& change = {}) {
    CStationRecord level;
    level.Name = name;
    EXPECT_EQ(AddStation(level), S_OK);
    if (change) change(level);
    EXPECT_EQ(UpdateStation(name, level), S_OK);
    EXPECT_EQ(FindStation(level), S_OK);
    return level;
  }
  RegistrySandbox sandbox{{HKEY_CURRENT_USER, HKEY_LOCAL_MACHINE}};
};

}  // namespace

// The list ends at the first value it cannot take whole, never reading past its buffers.
TEST_F(StationSheet, SerialPortListStopsAtTheFirstValueItCannotTake) {
  const std::wstring longest(63, L'P');
  auto ports = [] {
    Strings found;
    const int count = EnumSerialPorts(found);
    EXPECT_EQ(count, int(found.size()));
    return found;
  };
  SetSerialPorts({{L"a", L"COM3"}, {L"b", longest}});
  EXPECT_EQ(ports(), (Strings{L"COM3", longest}));
  SetSerialPorts({{L"a", L"COM3"}, {L"b", longest + L"Q"}, {L"c", L"COM4"}});
  EXPECT_EQ(ports(), Strings{L"COM3"}) << "a datum over 128 bytes";
  SetSerialPorts({{L"a", L"COM3"}, {L"b" + std::wstring(63, L'n'), L"COM5"}, {L"c", L"COM4"}});
  EXPECT_EQ(ports(), Strings{L"COM3"}) << "a name over 64 characters";
}

TEST_F(StationSheet, NewLevelShowsTheDefaultsAndStoresEveryCodeUnderADecimalCommaLocale) {
  ASSERT_TRUE(_wsetlocale(LC_ALL, L"German")) << "a host that writes decimal commas";
  CStationRecord level;
  EXPECT_EQ(RunSheet(level, true, [](HWND sheet) {
    HWND general = Page(sheet, 0);
    EXPECT_EQ(Entries(general, 205), (Strings{L"COM1", L"COM10", L"COM2", L"XYZ"}));
    EXPECT_EQ(Selected(general, 206), L"HRA20");
    Type(general, 203, L"North");
    Type(general, 204, L"tripod 4");
    Pick(general, 205, L"COM10");
    Pick(general, 206, L"HRB1X");
    ShowTab(sheet, 1);
    HWND advanced = Page(sheet, 1);
    ASSERT_NE(advanced, nullptr);
    EXPECT_EQ(Selected(advanced, 211), L"1");
    Pick(advanced, 208, L"115200");
    Pick(advanced, 209, L"Even");
    Pick(advanced, 210, L"7");
    Pick(advanced, 211, L"1.5");
    Pick(advanced, 218, L"Xon/Xoff");
    Pick(advanced, 219, L"Not set");
    EXPECT_FALSE(ApplyEnabled(sheet)) << "a new level has no Apply";
    user::Click(sheet, IDOK);
  }), IDOK);
  _wsetlocale(LC_ALL, L"C");
  EXPECT_EQ(StoredLevels(), Strings{L"North|10|115200|15|1|7|1|0|tripod 4|HRB1X"});
}

TEST_F(StationSheet, RefusedNamesKeepTheSheetOpenAndTheStoreUntouched) {
  Stored(L"Level");
  const Strings before = StoredLevels();
  const std::wstring badChars = L"Digital Level's name can not contain folowing symbols:\n\t\t\\*/";
  CStationRecord level;
  EXPECT_EQ(RunSheet(level, true, [&](HWND sheet) {
    HWND general = Page(sheet, 0);
    const std::pair<std::wstring, std::wstring> cases[] = {
        {L"", L"Please enter valid device name!"},
        {L"A/B", badChars},
        {L"A\\B", badChars},
        {L"A*B", badChars},
        {L"A\"B", badChars},
        {L"Level", L"The digital level 'Level' already exists"}};
    for (const auto& [name, message] : cases) {
      Type(general, 203, name.empty() ? L"\b" : name);
      user::Click(sheet, IDOK);
      EXPECT_EQ(ReadBox(sheet), Refusal(message));
      EXPECT_EQ(StoredLevels(), before);
    }
    Type(general, 204, std::wstring(300, L'n'));
    EXPECT_EQ(Text(general, 204).size(), kMaxStationTextLength) << "a note the store can read back";
    Type(general, 203, std::wstring(300, L'l'));
    EXPECT_EQ(Text(general, 203).size(), kMaxStationNameLength) << "a name every road can carry";
    user::Click(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels().size(), 2u);
}

// An OK stores back what it read, even what no list offers today: an unplugged port, odd codes.
TEST_F(StationSheet, AnOkStoresBackWhatTheSheetCouldNotShow) {
  CStationRecord odd = Stored(L"Odd", [](CStationRecord& r) {
    r.BaudRate = 7, r.StopBits = 0, r.Parity = 7, r.DataBits = 5, r.Flow = 3, r.CheckSum = 9;
  });
  SetSerialPorts({});
  EXPECT_EQ(RunSheet(odd, false, [](HWND sheet) {
    EXPECT_EQ(Selected(Page(sheet, 0), 205), L"COM1") << "the stored port, unplugged";
    EXPECT_FALSE(ApplyEnabled(sheet)) << "nothing changed yet";
    Type(Page(sheet, 0), 204, L"new");
    EXPECT_TRUE(ApplyEnabled(sheet));
    user::Click(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Odd|1|7|0|7|5|3|9|new|HRA20"}) << "the page never opened keeps its codes";
}

TEST_F(StationSheet, StoredValuesShowAsTheListsOfferThem) {
  CStationRecord level = Stored(L"Twelve", [](CStationRecord& r) {
    r.Model = L"HRA2", r.BaudRate = 12, r.StopBits = 15, r.Parity = 2, r.Flow = 1;
  });
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    EXPECT_EQ(Selected(Page(sheet, 0), 206), L"<none>") << "HRA2 is no model";
    Pick(Page(sheet, 0), 205, L"XYZ");
    ShowTab(sheet, 1);
    HWND advanced = Page(sheet, 1);
    EXPECT_EQ(Selected(advanced, 208), L"1200") << "12 begins 1200";
    EXPECT_EQ(Selected(advanced, 209), L"Odd");
    EXPECT_EQ(Selected(advanced, 211), L"1.5");
    EXPECT_EQ(Selected(advanced, 218), L"Xon/Xoff");
    user::Click(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Twelve|0|1200|15|2|8|1|1||"});
}

TEST_F(StationSheet, ARenameMakesNoTwinAndLaterSavesFollowTheNewName) {
  CStationRecord level = Stored(L"A", [](CStationRecord& r) { r.Manufacturer = L"first"; });
  Stored(L"Other");
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    Type(Page(sheet, 0), 203, L"Other");
    user::Click(sheet, 12321);
    EXPECT_EQ(ReadBox(sheet), Refusal(L"The digital level 'Other' already exists"));
    Type(Page(sheet, 0), 203, L"B");
    user::Click(sheet, 12321);
    EXPECT_TRUE(WaitFor([] { return StoredLevels()[0] == L"B|1|9600|1|0|8|0|1|first|HRA20"; }));
    Type(Page(sheet, 0), 204, L"second");
    user::Click(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), (Strings{L"B|1|9600|1|0|8|0|1|second|HRA20", L"Other|1|9600|1|0|8|0|1||HRA20"}));
}

// German entries are read and stored as the codes the English ones stand for.
TEST_F(StationSheet, DISABLED_GermanTextsAndEntriesKeepTheirCodes) {
  ASSERT_TRUE(German()) << "run with LC_ALL=de_DE.UTF-8";
  CStationRecord level = Stored(L"Nord", [](CStationRecord& r) { r.Port = 3, r.Parity = 2, r.Flow = 1, r.CheckSum = 0; });
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    EXPECT_EQ(Text(sheet), L"Eigenschaften des Digitalnivelliers");
    EXPECT_EQ(Text(Page(sheet, 0), 312), L"Anschluss:");
    Type(Page(sheet, 0), 203, L"\b");
    user::Click(sheet, IDOK);
    EXPECT_EQ(ReadBox(sheet).text, L"Bitte einen gültigen Gerätenamen eingeben!");
    Type(Page(sheet, 0), 203, L"Nord");
    ShowTab(sheet, 1);
    HWND advanced = Page(sheet, 1);
    EXPECT_EQ(Entries(advanced, 209), (Strings{L"Keine", L"Ungerade", L"Gerade"}));
    EXPECT_EQ(Selected(advanced, 209), L"Ungerade");
    EXPECT_EQ(Selected(advanced, 219), L"Aus");
    Pick(advanced, 209, L"Gerade");
    Pick(advanced, 219, L"Ein");
    Pick(advanced, 218, L"Keine");
    user::Click(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Nord|3|9600|1|1|8|0|1||HRA20"});
}

// Saves what the screen shows of `window`, once painted, as a 24-bit BMP.
bool SaveScreenshot(HWND window, const std::wstring& path) {
  RECT r{};
  return WaitFor([&] { return ui::Painted(window); }) && GetWindowRect(window, &r) && ui::Screenshot(r, path);
}

// Pictures of both pages over a sample level for docs/, in the language the program runs in, into
// the folder named by MARLIX_SCREENSHOTS (scripts/sheet-screenshots).
TEST_F(StationSheet, DISABLED_Screenshots) {
  wchar_t folder[MAX_PATH] = {};
  if (!GetEnvironmentVariableW(L"MARLIX_SCREENSHOTS", folder, MAX_PATH)) GTEST_SKIP() << "MARLIX_SCREENSHOTS not set";
  const std::wstring prefix = std::wstring(folder) + (German() ? L"\\sheet-de" : L"\\sheet-en");
  SetSerialPorts({{L"\\Device\\Serial0", L"COM1"}, {L"\\Device\\Serial1", L"COM3"}});
  CStationRecord level = Stored(L"North benchmark line", [](CStationRecord& r) {
    r.Manufacturer = L"Tripod 4, spare battery", r.Port = 3, r.Parity = 1, r.BaudRate = 19200;
  });
  RunSheet(level, false, [&](HWND window) {
    SetWindowPos(window, HWND_TOP, 20, 20, 0, 0, SWP_NOSIZE);
    EXPECT_TRUE(SaveScreenshot(window, prefix + L"-general.bmp"));
    ShowTab(window, 1);
    EXPECT_TRUE(SaveScreenshot(window, prefix + L"-advanced.bmp"));
    user::Click(window, IDCANCEL);
  });
}
