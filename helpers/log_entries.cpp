// The log's wide-text entries and its error entry. Nothing in the module calls them (its own
// entries are narrow text), so they live apart from the core and out of the module.
#include <oaidl.h>
#include <oleauto.h>

#include <cstdarg>
#include <cstdio>

#include "base/boundary.h"
#include "base/com_base.h"
#include "base/win_handles.h"
#include "helpers/error_reporter.h"
#include "helpers/filelog.h"
#include "helpers/format_text.h"

namespace kld::ft {

namespace {

std::wstring SystemDescription(HRESULT code) {
  win::UniqueLocal buffer;
  DWORD length = FormatMessageW(FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_ALLOCATE_BUFFER |
                                    FORMAT_MESSAGE_IGNORE_INSERTS,
                                nullptr, static_cast<DWORD>(code), 0, reinterpret_cast<LPWSTR>(buffer.Put()), 0, nullptr);
  std::wstring text(buffer && length ? std::wstring(static_cast<const wchar_t*>(buffer.Get()), length) : std::wstring());
  text.resize(text.size() >= 2 ? text.size() - 2 : 0);
  return text;
}

std::wstring ErrorInfoDescription() {
  com::ComPtr<IErrorInfo> info;
  if (GetErrorInfo(0, info.Put()) != S_OK || !info) return {};
  win::UniqueBstr description;
  if (FAILED(info->GetDescription(description.Put())) || !description) return {};
  return std::wstring(description.Get(), SysStringLen(description.Get()));
}

}  // namespace

std::wstring FormatTextV(const wchar_t* format, va_list args) { return format_detail::FormatV(format, args); }

std::wstring FormatText(const wchar_t* format, ...) {
  va_list args;
  va_start(args, format);
  std::wstring text = FormatTextV(format, args);
  va_end(args);
  return text;
}

void WriteLogText(const std::string& text) { WriteLogEntry(LogEntryPrefix(), text); }

void WriteLogText(const std::wstring& text) { WriteLogEntry(LogEntryPrefix(), NarrowText(text)); }

void LogTextW(const wchar_t* format, ...) {
  va_list args;
  va_start(args, format);
  boundary::CallVoid([&] { WriteLogEntry(LogEntryPrefix(), NarrowText(FormatTextV(format, args))); });
  va_end(args);
}

void LogError(const char* file, int line, const wchar_t* text, HRESULT code, ...) {
  va_list args;
  va_start(args, code);
  const std::wstring message = boundary::CallOr(std::wstring(), [&] { return FormatTextV(text ? text : L"", args); });
  va_end(args);
  boundary::CallVoid([&] {
    std::string entry = NarrowText(message) + FormatText(" - 0x%08X (%s, %i)", static_cast<unsigned>(code),
                                                         file ? file : "", line);
    std::wstring internal;
    for (size_t i = 0; i < ErrorReporterCount() && internal.empty(); ++i) {
      internal = ErrorReporterAt(i)->GetErrorText(code, nullptr, nullptr, nullptr);
    }
    const std::pair<const char*, std::wstring> details[] = {
        {"\r\nInternal description: ", internal},
        {"\r\nSystem description: ", SystemDescription(code)},
        {"\r\nIErrorInfo description: ", ErrorInfoDescription()},
    };
    for (const auto& [label, description] : details) {
      if (!description.empty()) entry += label + NarrowText(description);
    }
    WriteLogEntry(LogEntryPrefix(), entry);
  });
}

}  // namespace kld::ft
