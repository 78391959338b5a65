// A German surveyor reads the level sheet in German, and German entries store the same codes.
#include <gtest/gtest.h>

#include "config/sheet_driver.h"
#include "helpers/app_helpers.h"
#include "helpers/test_files.h"

using namespace sheet;

namespace {

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

struct GermanSheet : testing::Test {
  static void SetUpTestSuite() {
    ASSERT_EQ(GetThreadUILanguage(), 1031) << "start this test with LC_ALL=de_DE.UTF-8";
    const std::wstring app = kld::ft::GetAppPathW();
    const std::wstring title = std::filesystem::path(kld::ft::GetExecutablePath()).stem().wstring();
    testfiles::MarkNotInstalled(app);
    std::filesystem::create_directories(app + L"Languages\\de-DE");
    testfiles::WriteTranslation(app + L"Languages\\de-DE\\" + title + L".txt", kGerman);
  }
  void SetUp() override { SetSerialPorts({{L"\\Device\\Serial3", L"COM3"}}); }
  RegistrySandbox sandbox{{HKEY_CURRENT_USER, HKEY_LOCAL_MACHINE}};
};

}  // namespace

TEST_F(GermanSheet, ShowsGermanTextsAndGermanEntriesStillMapToTheirCodes) {
  CStationRecord level;
  level.Name = L"Nord";
  level.Port = 3, level.Parity = 2, level.Flow = 1, level.CheckSum = 0;
  ASSERT_EQ(AddStation(level), S_OK);
  EXPECT_EQ(RunSheet(level, false, [](HWND sheet) {
    EXPECT_EQ(Text(sheet), L"Eigenschaften des Digitalnivelliers");
    EXPECT_EQ(TabText(sheet, 0), L"Allgemein");
    EXPECT_EQ(TabText(sheet, 1), L"Erweitert");
    EXPECT_EQ(Text(Page(sheet, 0), 312), L"Anschluss:");
    ShowTab(sheet, 1);
    HWND advanced = Page(sheet, 1);
    EXPECT_EQ(Text(advanced, 321), L"Flusssteuerung:");
    EXPECT_EQ(Entries(advanced, 209), (Strings{L"Keine", L"Ungerade", L"Gerade"}));
    EXPECT_EQ(Selected(advanced, 209), L"Ungerade");
    EXPECT_EQ(Selected(advanced, 219), L"Aus");
    Pick(advanced, 209, L"Gerade");
    Pick(advanced, 219, L"Ein");
    Pick(advanced, 218, L"Keine");
    Press(sheet, IDOK);
  }), IDOK);
  EXPECT_EQ(StoredLevels(), Strings{L"Nord|3|9600|1|1|8|0|1||HRA20"});
}

TEST_F(GermanSheet, NewLevelCaptionAndRefusalAreGerman) {
  CStationRecord level;
  EXPECT_EQ(RunSheet(level, true, [](HWND sheet) {
    EXPECT_EQ(Text(sheet), L"Digitalnivellier anlegen");
    Type(Page(sheet, 0), 203, L"");
    Press(sheet, IDOK);
    EXPECT_EQ(user::ReadBox(sheet).text, L"Bitte einen gültigen Gerätenamen eingeben!");
    Press(sheet, IDCANCEL);
  }), IDCANCEL);
  EXPECT_EQ(StoredLevels(), Strings{});
}

// Run by scripts/sheet-screenshots.
TEST_F(GermanSheet, DISABLED_Screenshots) { TakeScreenshots(L"sheet-de"); }
