#include <gtest/gtest.h>

#include "config/sheet_driver.h"

using namespace sheet;
using Strings = std::vector<std::wstring>;

namespace {

const std::wstring kErrorCaption = L"Add New Digital Level";

struct StationSheet : testing::Test {
  void SetUp() override { SetSerialPorts({{L"\\Device\\Serial2", L"COM2"}, {L"\\Device\\Serial10", L"COM10"},
                                          {L"\\Device\\Serial1", L"COM1"}, {L"\\Device\\VSer", L"XYZ"}}); }
  static CStationRecord Stored(const std::wstring& name, const std::wstring& note = L"") {
    CStationRecord level;
    level.Name = name;
    level.Manufacturer = note;
    EXPECT_EQ(AddStation(level), S_OK);
    return level;
  }
  static CStationRecord Level(const std::wstring& name) {  // as the store hands it out
    CStationRecord level;
    level.Name = name;
    EXPECT_EQ(FindStation(level), S_OK);
    return level;
  }
  RegistrySandbox sandbox{{HKEY_CURRENT_USER, HKEY_LOCAL_MACHINE}};
};

}  // namespace

TEST(SerialPorts, PortNumberFromTheFirstDigitOn) {
  EXPECT_EQ(PortNumberOf(L"COM12"), 12);
  EXPECT_EQ(PortNumberOf(L"A2COM7"), 2);
  EXPECT_EQ(PortNumberOf(L"USB2COM5"), 2);
  EXPECT_EQ(PortNumberOf(L"XYZ"), 0);
  EXPECT_EQ(PortNumberOf(L""), 0);
}

TEST_F(StationSheet, SerialPortListEndsAtTheFirstValueItCannotTake) {
  const std::wstring path = L"HARDWARE\\DEVICEMAP\\SERIALCOMM", longest(63, L'P');
  auto ports = [] { Strings found; int n = EnumSerialPorts(found); EXPECT_EQ(n, int(found.size())); return found; };
  SetSerialPorts({});
  EXPECT_EQ(ports(), Strings{}) << "no key";
  SetSerialPorts({{L"a", L"COM3"}, {L"b", longest}});
  EXPECT_EQ(ports(), (Strings{L"COM3", longest})) << "the data, not the names; 128 bytes fit";
  RegWriteDword(HKEY_LOCAL_MACHINE, path, L"c", 4);
  RegWriteString(HKEY_LOCAL_MACHINE, path, L"d", L"COM4");
  EXPECT_EQ(ports(), (Strings{L"COM3", longest})) << "a number ends the list";
  SetSerialPorts({{L"a", L"COM3"}, {L"b", longest + L"Q"}, {L"c", L"COM4"}});
  EXPECT_EQ(ports(), Strings{L"COM3"}) << "a datum too long for 128 bytes";
  SetSerialPorts({{L"a", L"COM3"}, {L"b" + std::wstring(63, L'n'), L"COM5"}, {L"c", L"COM4"}});
  EXPECT_EQ(ports(), Strings{L"COM3"}) << "a name too long for 64 characters";
}

TEST_F(StationSheet, NewLevelListsThePortsSortedShowsTheDefaultsAndAddsWithEveryCodeMapped) {
  ASSERT_TRUE(_wsetlocale(LC_ALL, L"German")) << "a host that writes decimal commas";
  CStationRecord level;  // the defaults a new level starts from
  EXPECT_EQ(RunSheet(level, true, [](HWND sheet) {
    HWND general = Page(sheet, 0);
    EXPECT_EQ(Entries(general, 205), (Strings{L"COM1", L"COM10", L"COM2", L"XYZ"}));
    EXPECT_EQ(Selected(general, 205), L"COM1");
    EXPECT_EQ(Selected(general, 206), L"HRA20");
    Type(general, 203, L"North");
    Type(general, 204, L"tripod 4");
    Pick(general, 205, L"COM10");
    Pick(general, 206, L"HRB1X");
    EXPECT_FALSE(ApplyEnabled(sheet)) << "a new level has no Apply";

    ShowTab(sheet, 1);
    HWND advanced = Page(sheet, 1);
    ASSERT_NE(advanced, nullptr);
    Strings shown;
    for (int id : {208, 209, 210, 211, 218, 219}) shown.push_back(Selected(advanced, id));
    EXPECT_EQ(shown, (Strings{L"9600", L"None", L"8", L"1", L"None", L"Set"}));
    Pick(advanced, 208, L"115200");
    Pick(advanced, 209, L"Even");
    Pick(advanced, 210, L"7");
    Pick(advanced, 211, L"1.5");
    Pick(advanced, 218, L"Xon/Xoff");
    Pick(advanced, 219, L"Not set");
    EXPECT_FALSE(ApplyEnabled(sheet));
    Press(sheet, IDOK);
  }), IDOK);
  _wsetlocale(LC_ALL, L"C");
  EXPECT_EQ(StoredLevels(), Strings{L"North|10|115200|15|1|7|1|0|tripod 4|HRB1X"});
}

TEST_F(StationSheet, RefusedNamesKeepTheSheetOpenAndTheStoreUntouched) {
  Stored(L"Level");
  const Strings before = StoredLevels();
  CStationRecord level;
  EXPECT_EQ(RunSheet(level, true, [&](HWND sheet) {
    HWND general = Page(sheet, 0);
    const std::wstring badChars = L"Digital Level's name can not contain folowing symbols:\n\t\t\\*/";
    const std::pair<std::wstring, std::wstring> cases[] = {
        {L"", L"Please enter valid device name!"},
        {L"A/B", badChars},
        {L"A\\B", badChars},
        {L"A*B", badChars},
        {L"A\"B", badChars},
        {L"Level", L"The digital level 'Level' already exists"}};
    for (const auto& [name, message] : cases) {
      Type(general, 203, name);
      Press(sheet, IDOK);
      EXPECT_EQ(ReadBox(sheet, kErrorCaption), message) << testing::PrintToString(name);
      EXPECT_EQ(Text(general, 203), name) << "what the user typed stays";
      EXPECT_EQ(StoredLevels(), before);
    }
    Type(general, 204, std::wstring(300, L'n'));
    EXPECT_EQ(Text(general, 204).size(), kMaxStationTextLength) << "a note the store can read back";
    Type(general, 203, std::wstring(300, L'l'));
    EXPECT_EQ(Text(general, 203).size(), kMaxStationNameLength) << "a name every road can carry";
    Type(general, 203, L"level");
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels().size(), 2u);
  EXPECT_EQ(Level(L"level").Name, L"level") << "case counts";
}

TEST_F(StationSheet, EditingWithoutTheAdvancedTabStoresItsFieldsExactlyAsRead) {
  CStationRecord odd = Stored(L"Odd codes", L"old");
  odd.BaudRate = 7, odd.StopBits = 0, odd.Parity = 7, odd.DataBits = 5, odd.Flow = 3, odd.CheckSum = 9;
  ASSERT_EQ(UpdateStation(L"Odd codes", odd), S_OK);
  CStationRecord level = Level(L"Odd codes");
  SetSerialPorts({});  // no SERIALCOMM key: the stored port, unplugged, shows all the same
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    EXPECT_EQ(Entries(Page(sheet, 0), 205), Strings{L"COM1"});
    EXPECT_FALSE(ApplyEnabled(sheet)) << "nothing changed yet";
    Type(Page(sheet, 0), 204, L"new");
    EXPECT_TRUE(ApplyEnabled(sheet));
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Odd codes|1|7|0|7|5|3|9|new|HRA20"});
}

TEST_F(StationSheet, UnknownStoredValuesShowAsTheTablesSayAndStoreBackSo) {
  SetSerialPorts({{L"a", L"COM10"}, {L"b", L"XYZ"}});
  CStationRecord stored = Stored(L"Twelve");
  stored.Port = 1, stored.Model = L"HRA2", stored.BaudRate = 12, stored.StopBits = 0, stored.Parity = 7;
  ASSERT_EQ(UpdateStation(L"Twelve", stored), S_OK);
  CStationRecord level = Level(L"Twelve");
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    EXPECT_EQ(Selected(Page(sheet, 0), 205), L"COM1") << "no port here today, yet the level's";
    EXPECT_EQ(Selected(Page(sheet, 0), 206), L"<none>") << "HRA2 is no model";
    ShowTab(sheet, 1);
    Strings shown;
    for (int id : {208, 209, 211}) shown.push_back(Selected(Page(sheet, 1), id));
    EXPECT_EQ(shown, (Strings{L"1200", L"None", L"1"})) << "12 begins 1200";
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Twelve|1|1200|1|0|8|0|1||"});

  level = Level(L"Twelve");
  level.BaudRate = 7, level.StopBits = 15, level.Parity = 2;
  ASSERT_EQ(UpdateStation(L"Twelve", level), S_OK);
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    Pick(Page(sheet, 0), 205, L"XYZ");
    ShowTab(sheet, 1);
    EXPECT_EQ(Selected(Page(sheet, 1), 208), L"<none>") << "no entry begins with 7";
    EXPECT_EQ(Selected(Page(sheet, 1), 209), L"Odd");
    EXPECT_EQ(Selected(Page(sheet, 1), 211), L"1.5");
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Twelve|0|0|15|2|8|0|1||"});
}

TEST_F(StationSheet, ARenameMakesNoTwinAndLaterSavesFollowTheNewName) {
  Stored(L"A", L"first");
  Stored(L"Other");
  CStationRecord level = Level(L"A");
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    Type(Page(sheet, 0), 203, L"Other");
    Press(sheet, 12321);
    EXPECT_EQ(ReadBox(sheet, kErrorCaption), L"The digital level 'Other' already exists");
    Type(Page(sheet, 0), 203, L"B");
    Press(sheet, 12321);
    EXPECT_TRUE(WaitFor([] { return StoredLevels()[0] == L"B|1|9600|1|0|8|0|1|first|HRA20"; }));
    Type(Page(sheet, 0), 204, L"second");
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), (Strings{L"B|1|9600|1|0|8|0|1|second|HRA20", L"Other|1|9600|1|0|8|0|1||HRA20"}));
}

// Run by scripts/sheet-screenshots.
TEST_F(StationSheet, DISABLED_Screenshots) { TakeScreenshots(L"sheet-en"); }
