#include <gtest/gtest.h>

#include <string>

#include "server/resource_ids.h"
#include "store/string_table.h"

namespace {

TEST(StringTable, GivesExactTexts) {
  struct Case { UINT id; const wchar_t* text; };
  const Case cases[] = {
      {270, L"%d bytes"},
      {350, L"Name:"},
      {1001, L"Marlix Digital Levels"},
      {1014, L"Performing file transfer - %d%% done"},
      {1024, L"Digital Level's name can not contain folowing symbols:\n\t\t\\*/"},
      {1047, L"HRA20"},
      {1049, L"HRB1X"},
      {1113, L"Unable to receive file"},
      {2010, L"Can not open COM port. Port is already open by another program"},
  };
  for (const auto& c : cases) EXPECT_EQ(LoadTranslatedString(c.id), c.text) << c.id;
}

TEST(StringTable, InstructionsAreCrLfLinesWithoutTrailingBreak) {
  struct Case { UINT id; size_t lines; const wchar_t* first; const wchar_t* last; };
  const Case cases[] = {
      {1050, 7, L"1. Press the 'Menu' button", L"7. Press 'Enter' on HRA20 and this will start the download"},
      {1051, 7, L"1. Press the 'Menu' button", L"7. Press 'Enter' on HRA40 and this will start the download"},
      {1052, 10, L"1. Press 'F2' for menu", L"10. Press 'Enter' on HRB1X and this will start the download"},
  };
  for (const auto& c : cases) {
    std::wstring text = LoadTranslatedString(c.id);
    size_t lines = 1;
    for (size_t at = text.find(L"\r\n"); at != std::wstring::npos; at = text.find(L"\r\n", at + 2)) ++lines;
    EXPECT_EQ(lines, c.lines) << c.id;
    EXPECT_EQ(text.find(L'\n'), text.find(L"\r\n") + 1) << c.id;
    EXPECT_EQ(text.substr(0, text.find(L"\r\n")), c.first) << c.id;
    EXPECT_EQ(text.substr(text.rfind(L"\r\n") + 2), c.last) << c.id;
  }
}

TEST(StringTable, HasAllEightyEntriesAndNothingElse) {
  const UINT ids[] = {270,  271,  272,  273,  350,  351,  352,  353,  354,  355,  356,  357,  358,  359,
                      360,  361,  362,  363,  364,  1000, 1001, 1002, 1003, 1004, 1005, 1006, 1007, 1008,
                      1009, 1010, 1011, 1012, 1013, 1014, 1015, 1016, 1017, 1018, 1022, 1023, 1024, 1025,
                      1026, 1027, 1028, 1029, 1030, 1031, 1032, 1033, 1034, 1036, 1037, 1038, 1039, 1040,
                      1041, 1042, 1043, 1044, 1045, 1046, 1047, 1048, 1049, 1050, 1051, 1052, 1053, 1103,
                      1104, 1105, 1106, 1109, 1110, 1111, 1112, 1113, 1114, 2010};
  static_assert(sizeof(ids) / sizeof(ids[0]) == 80);
  for (UINT id : ids) EXPECT_FALSE(LoadTranslatedString(id).empty()) << id;

  // Neighbours inside loaded blocks, and whole blocks that don't exist.
  for (UINT id : {0u, 1019u, 1035u, 1054u, 1107u, 1108u, 1115u, 2011u, 4001u, 4041u, 4064u, 65535u})
    EXPECT_EQ(LoadTranslatedString(id), L"") << id;
}

TEST(StringTable, CutsAtTheFirstTailMarker) {
  EXPECT_EQ(CutAtTailMarker(L"abc#$1"), L"abc");
  EXPECT_EQ(CutAtTailMarker(L"a#b$c#$x#$y"), L"a#b$c");
  EXPECT_EQ(CutAtTailMarker(L"#$only"), L"");
  EXPECT_EQ(CutAtTailMarker(L"plain"), L"plain");
}

}  // namespace
