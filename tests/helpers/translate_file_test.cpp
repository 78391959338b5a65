#include <gtest/gtest.h>

#include <random>

#include "helpers/translate_file.h"
#include "test_files.h"

using kld::ft::CTranslateFile;
using kld::ft::UnescapeTranslationText;

namespace {

CTranslateFile Parsed(const std::wstring& text) {
  CTranslateFile file;
  file.Parse(text.data(), text.size());
  return file;
}

HRESULT LoadBytes(const std::string& bytes, CTranslateFile* file) {
  std::wstring path = testfiles::TempDirectory() + L"marlix_tf_test.txt";
  testfiles::WriteBytes(path, bytes);
  HRESULT hr = file->Load(path.c_str());
  DeleteFileW(path.c_str());
  return hr;
}

// Parses from the end of a page that is followed by an inaccessible one, so that any
// read past the text faults.
void ParseAtPageEnd(CTranslateFile* file, const std::wstring& text) {
  SYSTEM_INFO info;
  GetSystemInfo(&info);
  const size_t bytes = text.size() * sizeof(wchar_t);
  const size_t pages = bytes / info.dwPageSize + 1;
  auto* base = static_cast<char*>(VirtualAlloc(nullptr, (pages + 1) * info.dwPageSize,
                                               MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE));
  ASSERT_TRUE(base);
  DWORD old = 0;
  VirtualProtect(base + pages * info.dwPageSize, info.dwPageSize, PAGE_NOACCESS, &old);
  char* start = base + pages * info.dwPageSize - bytes;
  memcpy(start, text.data(), bytes);
  file->Parse(reinterpret_cast<const wchar_t*>(start), text.size());
  VirtualFree(base, 0, MEM_RELEASE);
}

}  // namespace

TEST(TranslateFile, EscapesAreReplacedInTheirFixedOrder) {
  EXPECT_EQ(UnescapeTranslationText(L"\\\\n"), L"\\\n") << "\\n goes first";
  EXPECT_EQ(UnescapeTranslationText(L"a\\tb\\rc\\\\d\\x"), L"a\tb\rc\\d\\x");
  EXPECT_EQ(UnescapeTranslationText(L"\\\\\\\\t"), L"\\\\\t") << "\\t is replaced before \\\\";
  EXPECT_EQ(UnescapeTranslationText(L"end\\"), L"end\\");
  CTranslateFile file = Parsed(L"[a\\nb\\\\]\r\n[x\\\\n\\t]\r\n");
  EXPECT_EQ(file.Find(L"a\nb\\", false), L"x\\\n\t");
  EXPECT_EQ(file.Find(L"x\\\n\t", true), L"a\nb\\");
}

TEST(TranslateFile, PairingFollowsTheLineRules) {
  CTranslateFile file = Parsed(
      L"; comment\r\n"
      L"[]\n[first]\nnot a bracket line\n[erste]\r\n"
      L" [indented]\n"
      L"[dropped]\n[]\n[again]\n[wieder]\n"
      L"[lone bracket\n[a]b]c\n[t]x\n"
      L"[dup]\r\r\n\n[one]\r[dup]\n[two]\n[other]\n[one]\n"
      L"[orphan]");
  EXPECT_EQ(file.Find(L"first", false), L"erste");
  EXPECT_EQ(file.Find(L"dropped", false), L"");
  EXPECT_EQ(file.Find(L"", false), L"");
  EXPECT_EQ(file.Find(L"again", false), L"wieder");
  EXPECT_EQ(file.Find(L"a]b", false), L"t") << "text runs to the last ]";
  EXPECT_EQ(file.Find(L"dup", false), L"one") << "first pair wins forward";
  EXPECT_EQ(file.Find(L"one", true), L"dup") << "first pair wins in reverse";
  EXPECT_EQ(file.Find(L"two", true), L"dup");
  EXPECT_EQ(file.Find(L"other", false), L"one");
  EXPECT_EQ(file.Find(L"orphan", false), L"");
  EXPECT_EQ(file.Find(L"indented", false), L"");
  EXPECT_EQ(file.Size(), 5u);
  EXPECT_EQ(Parsed(L"[src]\n[last line]").Find(L"src", false), L"last line");
}

TEST(TranslateFile, TailsPickTheirOwnEntryOrFallBackToThePlainOne) {
  CTranslateFile file = Parsed(L"[Open#$menu]\n[Öffnen]\n[Open]\n[Offen]\n");
  EXPECT_EQ(file.Find(L"Open#$menu", false), L"Öffnen");
  EXPECT_EQ(file.Find(L"Open#$button", false), L"Offen");
  EXPECT_EQ(file.Find(L"Open", false), L"Offen");
  EXPECT_EQ(file.Find(L"Öffnen", true), L"Open#$menu");
  EXPECT_EQ(file.Find(L"Close#$x", false), L"");
}

TEST(TranslateFile, RefusesAnythingButUtf16WithMark) {
  CTranslateFile file;
  EXPECT_EQ(LoadBytes("", &file), E_FAIL);
  EXPECT_EQ(LoadBytes("\xFF", &file), E_FAIL);
  EXPECT_EQ(LoadBytes("\xEF\xBB\xBF[a]\r\n[b]\r\n", &file), E_FAIL) << "UTF-8";
  std::string noMark = testfiles::Utf16File(L"[a]\r\n[b]\r\n").substr(2);
  EXPECT_EQ(LoadBytes(noMark, &file), E_FAIL);
  EXPECT_EQ(file.Size(), 0u);
  EXPECT_EQ(file.Load(L"c:\\no\\such\\file.txt"), HRESULT_FROM_WIN32(ERROR_PATH_NOT_FOUND));

  EXPECT_EQ(LoadBytes("\xFF\xFE", &file), S_OK);
  EXPECT_EQ(LoadBytes(testfiles::Utf16File(L"\r\n\n\r\r\r\n"), &file), S_OK);
  EXPECT_EQ(LoadBytes(testfiles::Utf16File(L"[[[[\n]]]\n[\n"), &file), S_OK);
  EXPECT_EQ(file.Size(), 0u);
  // A stray last byte is no character and is never read.
  EXPECT_EQ(LoadBytes(testfiles::Utf16File(L"[k]\n[v]") + "\x5D", &file), S_OK);
  EXPECT_EQ(file.Find(L"k", false), L"v");
}

TEST(TranslateFile, HugeFileIsParsedInOnePass) {
  std::wstring path = testfiles::TempDirectory() + L"marlix_tf_huge.txt";
  HANDLE h = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  ASSERT_NE(h, INVALID_HANDLE_VALUE);
  auto put = [h](const std::string& bytes) {
    DWORD written = 0;
    WriteFile(h, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
  };
  put(testfiles::Utf16File(L"[big]\r\n[groß]\r\n["));
  std::wstring chunk(512 * 1024, L'x');  // one line of 100 MB with no closing bracket
  std::string bytes(reinterpret_cast<const char*>(chunk.data()), chunk.size() * sizeof(wchar_t));
  for (int i = 0; i < 100; ++i) put(bytes);
  std::wstring tail = L"\r\n[end]\r\n[ende]";
  put(std::string(reinterpret_cast<const char*>(tail.data()), tail.size() * sizeof(wchar_t)));
  CloseHandle(h);

  CTranslateFile file;
  EXPECT_EQ(file.Load(path.c_str()), S_OK);
  DeleteFileW(path.c_str());
  EXPECT_EQ(file.Find(L"big", false), L"groß");
  EXPECT_EQ(file.Find(L"end", false), L"ende");
  EXPECT_EQ(file.Size(), 2u);
}

TEST(TranslateFile, RandomMutationsNeverReadPastTheEnd) {
  const std::wstring base =
      L"[Name:]\r\n[Name:]\r\n[Delete]\n[Löschen]\r[a\\nb]\n[c\\\\d]\n[]\n[x]y]\n[z]\r\n[tail";
  const wchar_t alphabet[] = L"[]\\\r\nnt#$ aZ";
  std::mt19937 random(20261121);
  for (int round = 0; round < 3000; ++round) {
    std::wstring text = base;
    int edits = 1 + random() % 8;
    for (int e = 0; e < edits; ++e) {
      size_t at = text.empty() ? 0 : random() % text.size();
      wchar_t c = alphabet[random() % (sizeof(alphabet) / sizeof(wchar_t) - 1)];
      switch (random() % 4) {
        case 0: if (!text.empty()) text[at] = c; break;
        case 1: text.insert(text.begin() + at, c); break;
        case 2: if (!text.empty()) text.erase(at, 1 + random() % 4); break;
        case 3: text.resize(at); break;
      }
    }
    CTranslateFile file;
    ParseAtPageEnd(&file, text);
    size_t brackets = 0;
    for (wchar_t c : text) brackets += c == L'[';
    ASSERT_LE(file.Size() * 2, brackets) << "round " << round;
  }
  for (int round = 0; round < 200; ++round) {  // raw bytes behind a valid mark
    std::string bytes("\xFF\xFE", 2);
    size_t length = random() % 600;
    for (size_t i = 0; i < length; ++i) bytes += static_cast<char>(random());
    CTranslateFile file;
    ASSERT_EQ(LoadBytes(bytes, &file), S_OK);
  }
}
