#include "helpers/error_reporter.h"

#include <cwchar>

#include <shlwapi.h>
#include <new>
#include <vector>

#include "base/boundary.h"
#include "base/win_handles.h"
#include "helpers/errors_source.h"

namespace kld::ft {

namespace {

// Plain data so that it is ready before any reporter's constructor runs.
struct ReporterList {
  TErrorReporter** items;
  size_t count;
  size_t capacity;
};
constinit ReporterList reporters = {nullptr, 0, 0};

constexpr size_t kMaxReporters = 0x0FFFFFFF;

void Register(TErrorReporter* reporter) noexcept {
  if (reporters.count == reporters.capacity) {
    size_t grown = reporters.capacity == 0 ? 1 : reporters.capacity * 2;
    if (grown > kMaxReporters) return;
    auto* items = new (std::nothrow) TErrorReporter*[grown];
    if (!items) return;
    for (size_t i = 0; i < reporters.count; ++i) items[i] = reporters.items[i];
    delete[] reporters.items;
    reporters.items = items;
    reporters.capacity = grown;
  }
  reporters.items[reporters.count++] = reporter;
}

void Unregister(TErrorReporter* reporter) noexcept {
  for (size_t i = 0; i < reporters.count; ++i) {
    if (reporters.items[i] != reporter) continue;
    for (size_t j = i + 1; j < reporters.count; ++j) reporters.items[j - 1] = reporters.items[j];
    --reporters.count;
    break;
  }
  if (reporters.count == 0) {
    delete[] reporters.items;
    reporters = {nullptr, 0, 0};
  }
}

struct CodeRow {
  DWORD code;
  UINT id;
};

constexpr CodeRow kCodeTable[] = {
    {0x80040001, 4001}, {0x80040002, 4002}, {0x80040003, 4003}, {0x80040004, 4004},
    {0x80040010, 4006}, {0x80040011, 4016}, {0x80040012, 4017}, {0x80040014, 4037},
    {0x80040015, 4051}, {0x80040016, 4063}, {0x80040021, 4036}, {0x80040040, 4031},
    {0x80040050, 4047}, {0x800400C0, 4044}, {0x800400C1, 4045}, {0x800400C2, 4046},
    {0x80040101, 4055}, {0x80040102, 4014}, {0x80040103, 4019}, {0x80040104, 4043},
    {0x80040105, 4048}, {0x80040106, 4052}, {0x80040107, 4056}, {0x80040108, 4057},
    {0x80040109, 4058}, {0x8004010A, 4061}, {0x8004010B, 4062}, {0x8004010D, 4064},
    {0x80040111, 4054}, {0x80040301, 4030}, {0x80040302, 4038}, {0x80040403, 4060},
    {0x80040404, 4059}, {0x80040408, 4007}, {0x8004040F, 4018}, {0x80040411, 4039},
    {0x80040510, 4010}, {0x80040511, 4011}, {0x80040512, 4011}, {0x80040513, 4011},
    {0x80040514, 4011}, {0x80040515, 4011}, {0x80040516, 4011}, {0x80040517, 4011},
    {0x80040518, 4011}, {0x80040519, 4011}, {0x8004051A, 4012}, {0x8004051B, 4013},
    {0x00000002, 4040}, {0x000400A3, 4042}, {0x000400A4, 4049}, {0x000400A5, 4050},
    {0x000400C3, 4053}, {0x00040104, 4043}, {0x00040301, 4030}, {0x00040302, 4038},
};

// The message FormatMessageW wrote into `buffer`; `cut` drops the line end of table messages.
std::wstring MessageText(const win::UniqueLocal& buffer, DWORD length, bool cut) {
  std::wstring text;
  if (buffer && length) text.assign(static_cast<const wchar_t*>(buffer.Get()), length);
  if (cut) text.resize(text.size() >= 2 ? text.size() - 2 : 0);
  return text;
}

}  // namespace

MessageSourceFn StdReporterMessageSource = &FormatMessageW;

TErrorReporter::TErrorReporter() noexcept { Register(this); }

TErrorReporter::~TErrorReporter() { Unregister(this); }

std::wstring TErrorReporter::GetErrorText(HRESULT, const wchar_t*, const wchar_t*,
                                          const wchar_t*) const {
  return {};
}

namespace {
ErrorTextSource textSource = nullptr;
std::wstring ErrorText(UINT id) { return textSource ? textSource(id) : std::wstring(); }
}  // namespace

void SetErrorTextSource(ErrorTextSource source) noexcept { textSource = source; }

UINT TStdErrorReporter::StringIdOf(HRESULT code) noexcept {
  for (const CodeRow& row : kCodeTable) {
    if (row.code == static_cast<DWORD>(code)) return row.id;
  }
  return 0;
}

std::wstring TStdErrorReporter::GetErrorText(HRESULT code, const wchar_t* text1,
                                             const wchar_t* text2, const wchar_t*) const {
  UINT id = StringIdOf(code);
  std::wstring pattern = id ? ErrorText(id) : std::wstring();
  // Facility 4 is formatted from its template even when that is empty, which fails on
  // purpose: such codes must never reach the system's message table.
  const bool fromTemplate = !pattern.empty() || (static_cast<DWORD>(code) & 0x1FFF0000) == 0x40000;

  // The second text goes in twice; existing message templates rely on that layout.
  const std::wstring first(text1 ? text1 : L""), second(text2 ? text2 : L""), third(second);
  DWORD_PTR arguments[3] = {reinterpret_cast<DWORD_PTR>(first.c_str()),
                            reinterpret_cast<DWORD_PTR>(second.c_str()),
                            reinterpret_cast<DWORD_PTR>(third.c_str())};
  win::UniqueLocal buffer;
  DWORD length = StdReporterMessageSource(fromTemplate ? 0x2500 : 0x3100, fromTemplate ? pattern.c_str() : nullptr,
                                          static_cast<DWORD>(code), 0, reinterpret_cast<LPWSTR>(buffer.Put()), 0,
                                          reinterpret_cast<va_list*>(arguments));
  if (length == 0) return {};
  return MessageText(buffer, length, !fromTemplate);
}

std::wstring TInternetErrorReporter::GetErrorText(HRESULT code, const wchar_t*, const wchar_t*,
                                                  const wchar_t*) const {
  // Only asked when someone else has loaded the library; it is never loaded for this.
  // The reference taken here keeps it in the process while its table is read.
  win::UniqueLibrary wininet;
  if (!GetModuleHandleExW(0, L"wininet.dll", wininet.Put()) || !wininet) return {};
  win::UniqueLocal buffer;
  DWORD length = FormatMessageW(0x0B00, wininet.Get(), static_cast<DWORD>(code) & 0x7FF8FFFF, 0,
                                reinterpret_cast<LPWSTR>(buffer.Put()), 0, nullptr);
  if (length == 0) return {};
  return MessageText(buffer, length, true);
}

size_t ErrorReporterCount() noexcept { return reporters.count; }

const TErrorReporter* ErrorReporterAt(size_t index) noexcept {
  return index < reporters.count ? reporters.items[index] : nullptr;
}

std::wstring BuildErrorText(HRESULT code, const wchar_t* text1, const wchar_t* text2,
                            const wchar_t* text3) {
  // Out of memory: no text, rather than an exception in the middle of reporting another fault.
  return boundary::CallOr(std::wstring(), [&] {
    std::wstring result;
    for (size_t i = 0; i < reporters.count; ++i) {
      result = reporters.items[i]->GetErrorText(code, text1, text2, text3);
      if (!result.empty()) return result;
    }
    std::wstring format = ErrorText(4041);
    if (format.empty()) format = L"# %lx";
    std::vector<wchar_t> buffer(format.size() + 64);
    for (;;) {
      int written = wnsprintfW(buffer.data(), static_cast<int>(buffer.size()), format.c_str(),
                                  static_cast<unsigned long>(code));
      if (written >= 0) {
        result.assign(buffer.data(), static_cast<size_t>(written));
        break;
      }
      if (buffer.size() > 0x10000) break;  // a format that never fits
      buffer.resize(buffer.size() * 4);
    }
    return result;
  });
}

// Brings the named error sources' map into every module that reports errors.
[[maybe_unused]] auto* const errorSourcesAtLoad = &CErrorsSourceBase::Find;

// The module's two reporters, asked in this order.
TStdErrorReporter theStdErrorReporter;
TInternetErrorReporter theInternetErrorReporter;

}  // namespace kld::ft
