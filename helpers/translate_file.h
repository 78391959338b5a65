// A translation text file in memory: English sentences and their translations, both ways.
#pragma once
#include <windows.h>
#include <map>
#include <string>

namespace kld::ft {

class CTranslateFile {
 public:
  // Reads a UTF-16LE file with byte order mark; anything else is refused with E_FAIL.
  HRESULT Load(const wchar_t* path);
  // Parses the characters behind the byte order mark. Never reads past `count`.
  void Parse(const wchar_t* text, size_t count);

  // The stored text for `text`, falling back to its part before "#$"; empty if none.
  std::wstring Find(const std::wstring& text, bool reverse) const;

  size_t Size() const noexcept { return forward_.size(); }

 private:
  void AddPair(std::wstring source, std::wstring translation);

  std::map<std::wstring, std::wstring> forward_;
  std::map<std::wstring, std::wstring> reverse_;
};

// Replaces \n, \t, \r and \\ in that order, each pass over the whole text.
std::wstring UnescapeTranslationText(std::wstring text);

}  // namespace kld::ft
