#include "store/string_table.h"

#include "helpers/translate_manager.h"
#include "base/module_instance.h"

namespace {

// The English text of one entry, read from the 1033 table whatever the thread's language.
std::wstring LoadEnglishEntry(UINT id) {
  HMODULE module = ModuleInstance();
  HRSRC info = FindResourceExW(module, RT_STRING, MAKEINTRESOURCEW(id / 16 + 1),
                               MAKELANGID(LANG_ENGLISH, SUBLANG_ENGLISH_US));
  if (!info) return {};
  HGLOBAL loaded = LoadResource(module, info);
  if (!loaded) return {};
  const auto* block = static_cast<const WCHAR*>(LockResource(loaded));
  if (!block) return {};
  // A block holds 16 strings, each a length in characters followed by that many characters.
  const size_t total = SizeofResource(module, info) / sizeof(WCHAR);
  size_t pos = 0;
  for (UINT place = 0; place < id % 16; ++place) {
    if (pos >= total) return {};
    pos += 1 + block[pos];
  }
  if (pos >= total) return {};
  size_t length = block[pos];
  if (length > total - pos - 1) return {};
  return std::wstring(block + pos + 1, length);
}

// Translation files are keyed by the English text; without one, the text is only cut.
std::wstring TranslateTableText(const std::wstring& text, LANGID threadLanguage) {
  return kld::ft::TranslateText(text, 1033, threadLanguage, ModuleInstance(), nullptr);
}

}  // namespace

std::wstring LoadTranslatedString(UINT id) {
  LANGID threadLanguage = GetThreadUILanguage();
  std::wstring text = LoadEnglishEntry(id);
  if (text.empty()) return {};
  return TranslateTableText(text, threadLanguage);
}
