// Failure codes as sentences: a process-wide chain of reporters asked in the order
// they were built, and a numeric fallback that always prints something.
#pragma once
#include <windows.h>
#include <string>

namespace kld::ft {

// Registers itself on construction and leaves the list on destruction. Reporters are
// never deleted through a base pointer, hence no virtual destructor.
class TErrorReporter {
 public:
  TErrorReporter() noexcept;
  ~TErrorReporter();
  TErrorReporter(const TErrorReporter&) = delete;
  TErrorReporter& operator=(const TErrorReporter&) = delete;

  // Empty when this reporter doesn't know the code. The texts may be null.
  virtual std::wstring GetErrorText(HRESULT code, const wchar_t* text1, const wchar_t* text2,
                                    const wchar_t* text3) const;
};

// System and component codes, through the module's code table or the system's messages.
class TStdErrorReporter final : public TErrorReporter {
 public:
  std::wstring GetErrorText(HRESULT code, const wchar_t* text1, const wchar_t* text2,
                            const wchar_t* text3) const override;
  // The string id of a code in the table, or 0.
  static UINT StringIdOf(HRESULT code) noexcept;
};

// Codes of the internet library, when that library is already in the process.
class TInternetErrorReporter final : public TErrorReporter {
 public:
  std::wstring GetErrorText(HRESULT code, const wchar_t* text1, const wchar_t* text2,
                            const wchar_t* text3) const override;
};

// Where the standard reporter's messages come from: FormatMessageW, unless a test puts
// a message table of its own in its place.
using MessageSourceFn = DWORD(WINAPI*)(DWORD flags, LPCVOID source, DWORD code, DWORD language,
                                       LPWSTR buffer, DWORD size, va_list* arguments);
extern MessageSourceFn StdReporterMessageSource;

// Where the texts of the code table and the fallback format come from: the module's string
// table, which lies a layer above this library and is handed down when the module starts.
// Until then every code has an empty template.
using ErrorTextSource = std::wstring (*)(UINT id);
void SetErrorTextSource(ErrorTextSource source) noexcept;

// Never empty unless memory ran out.
std::wstring BuildErrorText(HRESULT code, const wchar_t* text1 = nullptr,
                            const wchar_t* text2 = nullptr, const wchar_t* text3 = nullptr);

// The reporters in the order they are asked (for inspection).
size_t ErrorReporterCount() noexcept;
const TErrorReporter* ErrorReporterAt(size_t index) noexcept;

}  // namespace kld::ft
