#include "helpers/translate_manager.h"

#include <shlwapi.h>

#include "base/boundary.h"
#include "base/win_handles.h"
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
// Only the maps are: probing the disk, making folders and mapping a file happen outside,
// so one slow or dead path holds up nobody else.
SRWLOCK managerLock = SRWLOCK_INIT;


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

namespace test_only {
void (*TranslateProbeHook)() = nullptr;
}

std::wstring FindTranslateFilePath(const CTranslateFileKey& key) {
  if (key.sourceLanguage != kEnglish) return {};
  if (test_only::TranslateProbeHook) test_only::TranslateProbeHook();
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
                                                 const wchar_t* name, SRWLOCK* mapsLock) {
  CTranslateFileKey key{sourceLanguage, targetLanguage, name ? name : ModuleTitle(module)};
  std::wstring path;
  {
    win::ExclusiveLock lock(mapsLock);
    auto known = files.knownPaths.find(key);
    if (known != files.knownPaths.end()) path = known->second;
  }
  if (path.empty()) {
    if (sourceLanguage == targetLanguage) return nullptr;
    path = FindTranslateFilePath(key);
    if (path.empty()) return nullptr;
    win::ExclusiveLock lock(mapsLock);
    // A thread that found a path first has fixed it for the name.
    path = files.knownPaths.emplace(key, path).first->second;
  }
  {
    win::ExclusiveLock lock(mapsLock);
    auto loaded = files.loadedFiles.find(path);
    if (loaded != files.loadedFiles.end()) return loaded->second;
  }
  auto file = std::make_shared<CTranslateFile>();
  if (FAILED(file->Load(path.c_str()))) return nullptr;
  win::ExclusiveLock lock(mapsLock);
  // Two threads may have loaded it at once: the first one stored is the one kept.
  return files.loadedFiles.emplace(path, file).first->second;
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
  // Out of memory, the text stays as it came.
  return boundary::CallOr(text, [&] {
    {
      win::ExclusiveLock lock(&managerLock);
      if (!managerCreated) {
        manager = std::make_unique<CTranslateFileManager>();
        managerCreated = true;
      }
    }
    std::shared_ptr<CTranslateFile> file =
        GetTranslateFile(*manager, module, sourceLanguage, targetLanguage, name, &managerLock);
    if (file) {
      std::wstring translated = file->Find(text, reverse);
      if (!translated.empty()) return translated;
    }
    return CutAtMarker(text);
  });
}

CTranslateFileManager* TranslateFileManagerIfCreated() noexcept { return manager.get(); }

}  // namespace kld::ft
