#include "helpers/translate_manager.h"

#include <shlwapi.h>

#include <new>

#include "helpers/app_helpers.h"
#include "helpers/path_parts.h"

namespace kld::ft {

namespace {

constexpr LANGID kEnglish = 1033;

// Created at the first real translation; its destruction comes with the module's unload.
bool managerCreated = false;
std::unique_ptr<CTranslateFileManager> manager;
// Every Explorer window has a thread of its own, and several may open at once: the
// maps are guarded. A loaded file is never changed, so lookups in it need no lock.
SRWLOCK managerLock = SRWLOCK_INIT;

class ExclusiveLock {
 public:
  explicit ExclusiveLock(SRWLOCK* lock) : lock_(lock) { AcquireSRWLockExclusive(lock_); }
  ~ExclusiveLock() { ReleaseSRWLockExclusive(lock_); }
  ExclusiveLock(const ExclusiveLock&) = delete;
  ExclusiveLock& operator=(const ExclusiveLock&) = delete;

 private:
  SRWLOCK* lock_;
};

std::wstring CutAtMarker(const std::wstring& text) {
  size_t marker = text.find(L"#$");
  return marker == std::wstring::npos ? text : text.substr(0, marker);
}

std::wstring ModuleTitle(HMODULE module) {
  wchar_t path[MAX_PATH] = {};
  GetModuleFileNameW(module, path, MAX_PATH);
  path[MAX_PATH - 1] = L'\0';
  return CPathParts(path).Compose(CPathParts::Title);
}

}  // namespace

std::wstring FindTranslateFilePath(const CTranslateFileKey& key) {
  if (key.sourceLanguage != kEnglish) return {};
  const std::wstring root = GetLanguagesRootDirW(GetAppNameW().c_str());
  wchar_t locale[85] = {};
  if (!LCIDToLocaleName(key.targetLanguage, locale, 85, 0)) locale[0] = L'\0';
  const std::wstring language(locale);
  const std::wstring probes[] = {
      root + language + L"\\" + key.name + L".txt",
      root + key.name + L".txt",
      root + language + L"\\ShellExt.txt",
      root + L"ShellExt.txt",
  };
  for (const std::wstring& probe : probes) {
    if (PathFileExistsW(probe.c_str())) return probe;
  }
  return {};
}

std::shared_ptr<CTranslateFile> GetTranslateFile(CTranslateFileManager& files, HMODULE module,
                                                 LANGID sourceLanguage, LANGID targetLanguage,
                                                 const wchar_t* name) {
  CTranslateFileKey key{sourceLanguage, targetLanguage, name ? name : ModuleTitle(module)};
  std::wstring path;
  auto known = files.knownPaths.find(key);
  if (known != files.knownPaths.end()) {
    path = known->second;
  } else {
    if (sourceLanguage == targetLanguage) return nullptr;
    path = FindTranslateFilePath(key);
    if (path.empty()) return nullptr;
    files.knownPaths.emplace(key, path);
  }
  auto loaded = files.loadedFiles.find(path);
  if (loaded != files.loadedFiles.end()) return loaded->second;
  auto file = std::make_shared<CTranslateFile>();
  if (FAILED(file->Load(path.c_str()))) return nullptr;
  files.loadedFiles.emplace(path, file);
  return file;
}

std::wstring TranslateText(const std::wstring& text, LANGID sourceLanguage, LANGID targetLanguage,
                           HMODULE module, const wchar_t* name) {
  if (text.empty()) return text;
  if (sourceLanguage == targetLanguage) return CutAtMarker(text);
  bool reverse = false;
  if (sourceLanguage != kEnglish) {
    std::swap(sourceLanguage, targetLanguage);
    reverse = true;
  }
  try {
    std::shared_ptr<CTranslateFile> file;
    {
      ExclusiveLock lock(&managerLock);
      if (!managerCreated) {
        manager = std::make_unique<CTranslateFileManager>();
        managerCreated = true;
      }
      file = GetTranslateFile(*manager, module, sourceLanguage, targetLanguage, name);
    }
    if (file) {
      std::wstring translated = file->Find(text, reverse);
      if (!translated.empty()) return translated;
    }
    return CutAtMarker(text);
  } catch (const std::bad_alloc&) {
    return text;
  }
}

CTranslateFileManager* TranslateFileManagerIfCreated() noexcept { return manager.get(); }

}  // namespace kld::ft
