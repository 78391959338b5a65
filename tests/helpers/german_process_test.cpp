#include <gtest/gtest.h>
#include "helpers/app_helpers.h"
#include "store/string_table.h"
#include "test_files.h"

TEST(GermanProcess, TableTextsComeFromTheTranslationFile) {
  ASSERT_EQ(GetThreadUILanguage(), 1031) << "start this test with LC_ALL=de_DE.UTF-8";
  const std::wstring app = kld::ft::GetAppPathW();
  const std::wstring title = std::filesystem::path(kld::ft::GetExecutablePath()).stem().wstring();
  testfiles::MarkNotInstalled(app);
  std::filesystem::create_directories(app + L"Languages\\de-DE");
  testfiles::WriteTranslation(app + L"Languages\\de-DE\\" + title + L".txt",
                              L"; Deutsch\r\n[Marlix Digital Levels]\r\n[Marlix Digitalnivelliere]\r\n"
                              L"[Delete]\r\n[Löschen]\r\n"
                              L"[Digital Level's name can not contain folowing symbols:\\n\\t\\t\\\\*/]\r\n"
                              L"[Der Name darf diese Zeichen nicht enthalten:\\n\\t\\t\\\\*/]\r\n");
  EXPECT_EQ(LoadTranslatedString(1001), L"Marlix Digitalnivelliere");
  EXPECT_EQ(LoadTranslatedString(1003), L"Löschen");
  EXPECT_EQ(LoadTranslatedString(1024), L"Der Name darf diese Zeichen nicht enthalten:\n\t\t\\*/");
  EXPECT_EQ(LoadTranslatedString(1004), L"Properties") << "missing from the file";
  EXPECT_EQ(LoadTranslatedString(1108), L"") << "no table entry, no translation";
  std::filesystem::remove_all(app + L"components");
  std::filesystem::remove_all(app + L"Languages");
}
