// Which translation file serves a module, and the translation of one text through it.
#pragma once
#include <windows.h>
#include <map>
#include <memory>
#include <string>

#include "helpers/translate_file.h"

namespace kld::ft {

struct CTranslateFileKey {
  LANGID sourceLanguage = 0;
  LANGID targetLanguage = 0;
  std::wstring name;  // base name of the file looked for
};

// Only the name counts: the first file found for a name serves every language.
struct CTranslateFileKeyNameLess {
  bool operator()(const CTranslateFileKey& a, const CTranslateFileKey& b) const {
    return a.name < b.name;
  }
};

struct CTranslateFileManager {
  std::map<std::wstring, std::shared_ptr<CTranslateFile>> loadedFiles;  // by full path
  std::map<CTranslateFileKey, std::wstring, CTranslateFileKeyNameLess> knownPaths;
};

// Probes the four places under the languages root; empty if none exists.
std::wstring FindTranslateFilePath(const CTranslateFileKey& key);

// The file for the module (or `name`), loaded once; null when there is none.
// `mapsLock`, if given, is held around each use of the maps and nowhere else.
std::shared_ptr<CTranslateFile> GetTranslateFile(CTranslateFileManager& manager, HMODULE module,
                                                 LANGID sourceLanguage, LANGID targetLanguage,
                                                 const wchar_t* name, SRWLOCK* mapsLock = nullptr);

// `text` in the target language; at worst `text` cut at its first "#$". Any thread may
// call it; GetTranslateFile on a manager of one's own needs the caller's own care.
std::wstring TranslateText(const std::wstring& text, LANGID sourceLanguage, LANGID targetLanguage,
                           HMODULE module, const wchar_t* name);

namespace test_only {
// Called as the probing for a file begins.
extern void (*TranslateProbeHook)();
}  // namespace test_only

// The process-wide manager, or null before the first real translation.
CTranslateFileManager* TranslateFileManagerIfCreated() noexcept;

}  // namespace kld::ft
