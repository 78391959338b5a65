#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <thread>
#include <vector>

#include "helpers/app_helpers.h"
#include "helpers/translate_manager.h"
#include "server/module_instance.h"
#include "test_files.h"

using namespace kld::ft;

namespace {

constexpr LANGID kEnglish = 1033, kGerman = 1031, kFrench = 1036;

// Puts the languages root beside the test program for the life of the fixture.
class TranslationFiles : public testing::Test {
 protected:
  void SetUp() override {
    test_only::ForgetAppPath();
    app_ = GetAppPathW();
    std::filesystem::create_directories(app_ + L"components");
    testfiles::WriteBytes(app_ + L"components\\NotInstalledApp.txt", "");
    root_ = app_ + L"Languages\\";
    std::filesystem::remove_all(root_);
    std::filesystem::create_directories(root_ + L"de-DE");
    std::filesystem::create_directories(root_ + L"fr-FR");
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

TEST_F(TranslationFiles, FourProbesInTheirOrder) {
  CTranslateFileKey key{kEnglish, kGerman, L"probe"};
  EXPECT_EQ(FindTranslateFilePath(key), L"");
  Write(L"ShellExt.txt", L"");
  EXPECT_EQ(FindTranslateFilePath(key), root_ + L"ShellExt.txt");
  Write(L"de-DE\\ShellExt.txt", L"");
  EXPECT_EQ(FindTranslateFilePath(key), root_ + L"de-DE\\ShellExt.txt");
  Write(L"probe.txt", L"");
  EXPECT_EQ(FindTranslateFilePath(key), root_ + L"probe.txt");
  Write(L"de-DE\\probe.txt", L"");
  EXPECT_EQ(FindTranslateFilePath(key), root_ + L"de-DE\\probe.txt");
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
  const std::wstring title = std::filesystem::path(exe).stem().wstring();
  Write(L"fr-FR\\" + title + L".txt", L"[x]\n[y]\n");
  auto own = GetTranslateFile(files, ModuleInstance(), kEnglish, kFrench, nullptr);
  ASSERT_TRUE(own);
  EXPECT_EQ(own->Find(L"x", false), L"y");
}

TEST_F(TranslationFiles, TranslateTextFallsBackToTheCutEnglishText) {
  Write(L"de-DE\\words.txt", L"[Delete]\n[Löschen]\n[Open#$menu]\n[Öffnen]\n");
  const HMODULE module = ModuleInstance();
  EXPECT_EQ(TranslateText(L"Delete", kEnglish, kGerman, module, L"words"), L"Löschen");
  EXPECT_EQ(TranslateText(L"Open#$menu", kEnglish, kGerman, module, L"words"), L"Öffnen");
  EXPECT_EQ(TranslateText(L"Open#$other", kEnglish, kGerman, module, L"words"), L"Open");
  EXPECT_EQ(TranslateText(L"Missing", kEnglish, kGerman, module, L"words"), L"Missing");
  EXPECT_EQ(TranslateText(L"Delete", kEnglish, kFrench, module, L"words"), L"Löschen")
      << "the name's first path serves every language";
  EXPECT_EQ(TranslateText(L"Löschen", kGerman, kEnglish, module, L"words"), L"Delete");
  EXPECT_EQ(TranslateText(L"Delete#$x", kEnglish, kEnglish, module, L"words"), L"Delete");
  EXPECT_EQ(TranslateText(L"", kEnglish, kGerman, module, L"words"), L"");
  EXPECT_EQ(TranslateText(L"a#$b", kEnglish, kGerman, module, L"nofile"), L"a");
  EXPECT_NE(TranslateFileManagerIfCreated(), nullptr);
}

TEST_F(TranslationFiles, ThreadsTranslatingAtOnceShareOneFile) {
  Write(L"de-DE\\threads.txt", L"[Start]\n[Starten]\n");
  std::atomic<int> translated{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 8; ++t) {
    threads.emplace_back([&translated] {
      for (int i = 0; i < 200; ++i) {
        const wchar_t* name = i % 2 ? L"threads" : L"threads_missing";
        std::wstring text = TranslateText(L"Start", kEnglish, kGerman, ModuleInstance(), name);
        translated += text == (i % 2 ? L"Starten" : L"Start");
      }
    });
  }
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(translated.load(), 8 * 200);
}
