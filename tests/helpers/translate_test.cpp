// A user's translation file gives the module's texts in their language, and bad files never crash it.
#include <gtest/gtest.h>
#include <atomic>
#include <random>
#include <thread>
#include "helpers/app_helpers.h"
#include "helpers/translate_file.h"
#include "helpers/translate_manager.h"
#include "base/module_instance.h"
#include "support/test_files.h"
using namespace kld::ft;
namespace {
constexpr LANGID kEnglish = 1033, kGerman = 1031, kFrench = 1036;
CTranslateFile Parsed(const std::wstring& text) {
  CTranslateFile file;
  file.Parse(text.data(), text.size());
  return file;
}
HRESULT LoadBytes(const std::string& bytes, CTranslateFile* file) {
  const std::wstring path = testfiles::TempDirectory() + L"marlix_tf_test.txt";
  testfiles::WriteBytes(path, bytes);
  HRESULT hr = file->Load(path.c_str());
  DeleteFileW(path.c_str());
  return hr;
}
// Parses from the end of a page followed by an inaccessible one, so that any read past the text faults.
void ParseAtPageEnd(CTranslateFile* file, const std::wstring& text) {
  const size_t bytes = text.size() * sizeof(wchar_t), page = 4096, pages = bytes / page + 1;
  auto* base = static_cast<char*>(VirtualAlloc(nullptr, (pages + 1) * page, MEM_RESERVE | MEM_COMMIT,
                                               PAGE_READWRITE));
  ASSERT_TRUE(base);
  DWORD old = 0;
  VirtualProtect(base + pages * page, page, PAGE_NOACCESS, &old);
  char* start = base + pages * page - bytes;
  memcpy(start, text.data(), bytes);
  file->Parse(reinterpret_cast<const wchar_t*>(start), text.size());
  VirtualFree(base, 0, MEM_RELEASE);
}
// Puts the languages root beside the test program for the life of the fixture.
struct TranslationFiles : testing::Test {
  void SetUp() override {
    test_only::ForgetAppPath();
    app_ = GetAppPathW();
    root_ = app_ + L"Languages\\";
    testfiles::MarkNotInstalled(app_);
    std::filesystem::remove_all(root_);
    for (const wchar_t* language : {L"de-DE", L"fr-FR"}) std::filesystem::create_directories(root_ + language);
  }
  void TearDown() override {
    std::filesystem::remove_all(app_ + L"components");
    std::filesystem::remove_all(root_);
  }
  void Write(const std::wstring& relative, const std::wstring& text) {
    testfiles::WriteTranslation(root_ + relative, text);
  }
  std::wstring app_, root_;
};
}  // namespace
TEST(TranslateFile, EscapesPairingAndTails) {
  // \n goes first, and \t is replaced before a double backslash.
  const wchar_t* escapes[][2] = {
      {L"\\\\n", L"\\\n"},
      {L"a\\tb\\rc\\\\d\\x", L"a\tb\rc\\d\\x"},
      {L"end\\", L"end\\"}};
  for (const auto& e : escapes) EXPECT_EQ(UnescapeTranslationText(e[0]), e[1]) << e[0];
  CTranslateFile file = Parsed(L"[a\\nb\\\\]\r\n[x\\\\n\\t]\r\n");
  EXPECT_EQ(file.Find(L"a\nb\\", false), L"x\\\n\t");
  EXPECT_EQ(file.Find(L"x\\\n\t", true), L"a\nb\\");
  // Pairing follows the line rules; a tail picks its own entry or falls back to the plain one.
  // Lines longer than any 16-bit count are neither kept nor skipped.
  const std::wstring longText(70000, L'x');
  file = Parsed(L"[" + longText + L"\r\n[" + longText + L"]\n[long]\n"
                L"; comment\r\n[Open#$menu]\n[Öffnen]\n[Open]\n[Offen]\n"
                L"[]\n[first]\nnot a bracket line\n[erste]\r\n [indented]\n[dropped]\n[]\n[again]\n[wieder]\n"
                L"[lone bracket\n[a]b]c\n[t]x\n[dup]\r\r\n\n[one]\r[dup]\n[two]\n[other]\n[one]\n[orphan]");
  struct { const wchar_t *text, *found; bool reverse; const char* why; } rows[] = {
      {L"first", L"erste"},
      {L"again", L"wieder"},
      {L"a]b", L"t", false, "text runs to the last ]"},
      {L"dup", L"one", false, "first pair wins forward"},
      {L"one", L"dup", true, "first pair wins in reverse"},
      {L"orphan", L""},
      {L"Open#$menu", L"Öffnen"},
      {L"Open#$button", L"Offen", false, "falls back to the plain entry"},
      {L"Öffnen", L"Open#$menu", true},
      {longText.c_str(), L"long", false, "no limit on a line"}};
  for (const auto& r : rows) EXPECT_EQ(file.Find(r.text, r.reverse), r.found) << r.text << " " << (r.why ?: "");
  EXPECT_EQ(file.Size(), 8u);
  EXPECT_EQ(Parsed(L"[src]\n[last line]").Find(L"src", false), L"last line");
}
TEST(TranslateFile, LoadRefusesAnythingButUtf16WithMarkAndTakesHugeFiles) {
  struct { std::string bytes; HRESULT hr; const char* what; } rows[] = {
      {"", E_FAIL, "empty"},
      {"\xEF\xBB\xBF[a]\r\n[b]\r\n", E_FAIL, "UTF-8"},
      {testfiles::Utf16File(L"[a]\r\n[b]\r\n").substr(2), E_FAIL, "no mark"},
      {"\xFF\xFE", S_OK, "mark only"},
      {testfiles::Utf16File(L"[[[[\n]]]\n[\n"), S_OK, "brackets without pairs"}};
  for (const auto& r : rows) {
    CTranslateFile file;
    EXPECT_EQ(LoadBytes(r.bytes, &file), r.hr) << r.what;
    EXPECT_EQ(file.Size(), 0u) << r.what;
  }
  CTranslateFile file;
  // A stray last byte is no character and is never read.
  EXPECT_EQ(LoadBytes(testfiles::Utf16File(L"[k]\n[v]") + "\x5D", &file), S_OK);
  EXPECT_EQ(file.Find(L"k", false), L"v");
}
TEST(TranslateFile, RandomMutationsNeverReadPastTheEnd) {
  const std::wstring base =
      L"[Name:]\r\n[Name:]\r\n[Delete]\n[Löschen]\r[a\\nb]\n[c\\\\d]\n[]\n[x]y]\n[z]\r\n[tail";
  const std::wstring alphabet = L"[]\\\r\nnt#$ aZ";
  std::mt19937 random(20261121);
  for (int round = 0; round < 3000; ++round) {
    std::wstring text = base;
    for (int e = 0, edits = 1 + random() % 8; e < edits; ++e) {
      const size_t at = text.empty() ? 0 : random() % text.size();
      const wchar_t c = alphabet[random() % alphabet.size()];
      switch (random() % 4) {
        case 0: if (!text.empty()) text[at] = c; break;
        case 1: text.insert(text.begin() + at, c); break;
        case 2: if (!text.empty()) text.erase(at, 1 + random() % 4); break;
        case 3: text.resize(at); break;
      }
    }
    CTranslateFile file;
    ParseAtPageEnd(&file, text);
    ASSERT_LE(file.Size() * 2, size_t(std::count(text.begin(), text.end(), L'['))) << "round " << round;
  }
  for (int round = 0; round < 200; ++round) {  // raw bytes behind a valid mark
    std::string bytes("\xFF\xFE", 2);
    for (size_t i = 0, length = random() % 600; i < length; ++i) bytes += static_cast<char>(random());
    CTranslateFile file;
    ASSERT_EQ(LoadBytes(bytes, &file), S_OK);
  }
}
TEST_F(TranslationFiles, FourProbesInTheirOrder) {
  const CTranslateFileKey key{kEnglish, kGerman, L"probe"};
  EXPECT_EQ(FindTranslateFilePath(key), L"");
  for (const wchar_t* file : {L"ShellExt.txt", L"de-DE\\ShellExt.txt", L"probe.txt", L"de-DE\\probe.txt"}) {
    Write(file, L"");
    EXPECT_EQ(FindTranslateFilePath(key), root_ + file);
  }
  EXPECT_EQ(FindTranslateFilePath({kGerman, kEnglish, L"probe"}), L"") << "files are keyed from English";
}
TEST_F(TranslationFiles, FirstPathFoundForANameServesEveryLanguage) {
  Write(L"de-DE\\shared.txt", L"[Open]\n[Öffnen]\n");
  Write(L"fr-FR\\shared.txt", L"[Open]\n[Ouvrir]\n");
  CTranslateFileManager files;
  EXPECT_EQ(GetTranslateFile(files, nullptr, kEnglish, kEnglish, L"shared"), nullptr);
  auto german = GetTranslateFile(files, nullptr, kEnglish, kGerman, L"shared");
  ASSERT_TRUE(german);
  EXPECT_EQ(GetTranslateFile(files, nullptr, kEnglish, kFrench, L"shared"), german);
  EXPECT_EQ(german->Find(L"Open", false), L"Öffnen");
  EXPECT_EQ(GetTranslateFile(files, nullptr, kEnglish, kEnglish, L"shared"), german)
      << "a known name answers even for equal languages";
  // A missing file is not remembered, and a refused one is read again at the next text.
  EXPECT_EQ(GetTranslateFile(files, nullptr, kEnglish, kGerman, L"late"), nullptr);
  testfiles::WriteBytes(root_ + L"late.txt", "[a]\r\n[b]\r\n");
  EXPECT_EQ(GetTranslateFile(files, nullptr, kEnglish, kGerman, L"late"), nullptr);
  Write(L"late.txt", L"[a]\r\n[b]\r\n");
  auto late = GetTranslateFile(files, nullptr, kEnglish, kFrench, L"late");
  ASSERT_TRUE(late);
  EXPECT_EQ(late->Find(L"a", false), L"b");
  // Without a name the module's own title is looked for.
  wchar_t exe[MAX_PATH];
  GetModuleFileNameW(ModuleInstance(), exe, MAX_PATH);
  Write(L"fr-FR\\" + std::filesystem::path(exe).stem().wstring() + L".txt", L"[x]\n[y]\n");
  auto own = GetTranslateFile(files, ModuleInstance(), kEnglish, kFrench, nullptr);
  ASSERT_TRUE(own);
  EXPECT_EQ(own->Find(L"x", false), L"y");
}
TEST_F(TranslationFiles, TranslateTextFallsBackToTheCutEnglishText) {
  Write(L"de-DE\\words.txt", L"[Delete]\n[Löschen]\n[Open#$menu]\n[Öffnen]\n");
  struct { const wchar_t *text, *result; LANGID from, to; const wchar_t* name = L"words"; } rows[] = {
      {L"Delete", L"Löschen", kEnglish, kGerman},
      {L"Open#$other", L"Open", kEnglish, kGerman},
      {L"Missing", L"Missing", kEnglish, kGerman},
      {L"Delete", L"Löschen", kEnglish, kFrench},  // the name's first path serves every language
      {L"Löschen", L"Delete", kGerman, kEnglish},
      {L"a#$b", L"a", kEnglish, kGerman, L"nofile"}};
  for (const auto& r : rows)
    EXPECT_EQ(TranslateText(r.text, r.from, r.to, ModuleInstance(), r.name), r.result) << r.text << r.to;
}
// One thread probing a slow path holds up no other thread's translation.
TEST_F(TranslationFiles, ProbingIsOutsideTheLock) {
  Write(L"de-DE\\quick.txt", L"[Start]\n[Starten]\n");
  ASSERT_EQ(TranslateText(L"Start", kEnglish, kGerman, ModuleInstance(), L"quick"), L"Starten");
  static HANDLE entered, release;
  static DWORD slowThread;
  static std::atomic<bool> probing;
  entered = CreateEventW(nullptr, TRUE, FALSE, nullptr);
  release = CreateEventW(nullptr, TRUE, FALSE, nullptr);
  test_only::TranslateProbeHook = [] {
    if (GetCurrentThreadId() != slowThread) return;
    probing = true;
    SetEvent(entered);
    WaitForSingleObject(release, 5000);
    probing = false;
  };
  std::thread slow([] {
    slowThread = GetCurrentThreadId();
    TranslateText(L"Start", kEnglish, kGerman, ModuleInstance(), L"slow");
  });
  ASSERT_EQ(WaitForSingleObject(entered, 5000), WAIT_OBJECT_0);
  EXPECT_EQ(TranslateText(L"Start", kEnglish, kGerman, ModuleInstance(), L"quick"), L"Starten");
  EXPECT_TRUE(probing) << "the second thread waited for the first one's probing";
  SetEvent(release);
  slow.join();
  test_only::TranslateProbeHook = nullptr;
  CloseHandle(entered);
  CloseHandle(release);
}
