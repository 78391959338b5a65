#include <gtest/gtest.h>

#include <string>

#include "store/string_table.h"

namespace {

size_t Count(const std::wstring& text, const std::wstring& part) {
  size_t n = 0;
  for (size_t at = text.find(part); at != std::wstring::npos; at = text.find(part, at + 1)) ++n;
  return n;
}

TEST(StringTable, GivesExactTexts) {
  struct Case { UINT id; const wchar_t* text; };
  for (const Case& c : {Case{270, L"%d bytes"}, Case{1001, L"Marlix Digital Levels"},
                        Case{1014, L"Performing file transfer - %d%% done"},
                        Case{1024, L"Digital Level's name can not contain folowing symbols:\n\t\t\\*/"},
                        Case{1047, L"HRA20"}, Case{1049, L"HRB1X"},
                        Case{2010, L"Can not open COM port. Port is already open by another program"}})
    EXPECT_EQ(LoadTranslatedString(c.id), c.text) << c.id;

  // The instructions: CR LF between lines, and no line end after the last.
  struct Lines { UINT id; size_t breaks; const wchar_t* last; };
  for (const Lines& c : {Lines{1050, 6, L"7. Press 'Enter' on HRA20 and this will start the download"},
                         Lines{1051, 6, L"7. Press 'Enter' on HRA40 and this will start the download"},
                         Lines{1052, 9, L"10. Press 'Enter' on HRB1X and this will start the download"}}) {
    std::wstring text = LoadTranslatedString(c.id);
    EXPECT_EQ(Count(text, L"\r\n"), c.breaks) << c.id;
    EXPECT_EQ(Count(text, L"\n"), c.breaks) << c.id;
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
  // Gaps inside loaded blocks, and blocks that don't exist.
  for (UINT id : {0u, 1019u, 1035u, 1054u, 1107u, 1108u, 1115u, 2011u, 4001u, 4041u, 4064u, 65535u})
    EXPECT_EQ(LoadTranslatedString(id), L"") << id;

  EXPECT_EQ(CutAtTailMarker(L"abc#$1"), L"abc");
  EXPECT_EQ(CutAtTailMarker(L"a#b$c#$x#$y"), L"a#b$c");
  EXPECT_EQ(CutAtTailMarker(L"plain"), L"plain");
}

}  // namespace
