#include "transfer/enum_format_etc.h"

#include <cstring>

#include "base/boundary.h"

namespace {

// A receiver frees the target device of each entry it gets, so every copy owns its own.
bool CopyFormat(FORMATETC& to, const FORMATETC& from) noexcept {
  to = from;
  if (!from.ptd) return true;
  to.ptd = static_cast<DVTARGETDEVICE*>(CoTaskMemAlloc(from.ptd->tdSize));
  if (!to.ptd) return false;
  std::memcpy(to.ptd, from.ptd, from.ptd->tdSize);
  return true;
}

}  // namespace

CEnumFormatEtc::CEnumFormatEtc(const FORMATETC* formats, ULONG count) {
  if (!formats) return;
  Formats.reserve(count);
  for (ULONG i = 0; i < count; ++i) {
    Entry entry{formats[i], {}};
    if (!CopyFormat(entry.format, formats[i])) entry.format.ptd = nullptr;
    entry.device.Reset(entry.format.ptd);
    Formats.push_back(std::move(entry));
  }
}

STDMETHODIMP CEnumFormatEtc::Next(ULONG celt, FORMATETC* rgelt, ULONG* fetched) noexcept {
  if (Formats.empty()) return S_FALSE;
  if (!fetched && celt != 1) return E_POINTER;
  if (fetched) *fetched = 0;
  if (!rgelt) return S_FALSE;
  if (Position >= Formats.size()) return S_FALSE;
  ULONG given = 0;
  while (given < celt && Position < Formats.size()) {
    if (!CopyFormat(rgelt[given], Formats[Position].format)) break;
    ++given;
    ++Position;
  }
  if (fetched) *fetched = given;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Skip(ULONG celt) noexcept {
  if (Formats.empty() || static_cast<ULONGLONG>(Position) + celt >= Formats.size()) return S_FALSE;
  Position += celt;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Reset() noexcept {
  Position = 0;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Clone(IEnumFORMATETC** clone) noexcept {
  if (!clone) return E_POINTER;
  *clone = nullptr;
  return boundary::Call([&] {
    std::vector<FORMATETC> formats;
    for (const Entry& entry : Formats) formats.push_back(entry.format);
    auto copy = com::Make<CEnumFormatEtc>(formats.data(), static_cast<ULONG>(formats.size()));
    if (!copy) return E_OUTOFMEMORY;
    copy->Position = Position;
    *clone = copy.Detach();
    return S_OK;
  });
}
