// Formatting through the system's C library, one shape for narrow and wide text: the static
// C library would bring a printf of its own into the module.
#pragma once
#include <cstdarg>
#include <cstdio>
#include <string>

namespace kld::ft::format_detail {

inline int Count(const char* format, va_list args) { return _vscprintf(format, args); }
inline int Count(const wchar_t* format, va_list args) { return _vscwprintf(format, args); }
inline void Print(char* out, size_t size, const char* format, va_list args) { _vsnprintf(out, size, format, args); }
inline void Print(wchar_t* out, size_t size, const wchar_t* format, va_list args) {
  _vsnwprintf(out, size, format, args);
}

template <class Char>
std::basic_string<Char> FormatV(const Char* format, va_list args) {
  if (!format) return {};
  va_list copy;
  va_copy(copy, args);
  const int length = Count(format, copy);
  va_end(copy);
  if (length <= 0) return {};
  std::basic_string<Char> text(static_cast<size_t>(length) + 1, Char());
  Print(text.data(), text.size(), format, args);
  text.resize(static_cast<size_t>(length));
  return text;
}


}  // namespace kld::ft::format_detail
