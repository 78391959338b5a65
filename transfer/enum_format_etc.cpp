#include "transfer/enum_format_etc.h"

#include <cstring>
#include <new>

#include "server/com_base.h"

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
  com::LockModule();
  if (!formats || count == 0) return;
  Formats = new (std::nothrow) FORMATETC[count];
  if (!Formats) return;
  for (ULONG i = 0; i < count; ++i) {
    if (!CopyFormat(Formats[i], formats[i])) Formats[i].ptd = nullptr;
  }
  Count = count;
}

CEnumFormatEtc::~CEnumFormatEtc() {
  for (ULONG i = 0; i < Count; ++i) CoTaskMemFree(Formats[i].ptd);
  delete[] Formats;
  com::UnlockModule();
}

CEnumFormatEtc* CEnumFormatEtc::Create(const FORMATETC* formats, ULONG count) noexcept {
  auto* made = new (std::nothrow) CEnumFormatEtc(formats, count);
  if (made && count != 0 && formats && !made->Formats) {
    made->Release();
    return nullptr;
  }
  return made;
}

STDMETHODIMP CEnumFormatEtc::QueryInterface(REFIID riid, void** ppv) {
  if (!ppv) return E_POINTER;
  if (riid == IID_IUnknown || riid == IID_IEnumFORMATETC) {
    *ppv = static_cast<IEnumFORMATETC*>(this);
    AddRef();
    return S_OK;
  }
  *ppv = nullptr;
  return E_NOINTERFACE;
}

STDMETHODIMP_(ULONG) CEnumFormatEtc::AddRef() { return ++RefCount; }

STDMETHODIMP_(ULONG) CEnumFormatEtc::Release() {
  ULONG left = --RefCount;
  if (left == 0) delete this;
  return left;
}

STDMETHODIMP CEnumFormatEtc::Next(ULONG celt, FORMATETC* rgelt, ULONG* fetched) {
  if (!Formats) return S_FALSE;
  if (!fetched && celt != 1) return E_POINTER;
  if (fetched) *fetched = 0;
  if (!rgelt) return S_FALSE;
  if (Position >= Count) return S_FALSE;
  ULONG given = 0;
  while (given < celt && Position < Count) {
    if (!CopyFormat(rgelt[given], Formats[Position])) break;
    ++given;
    ++Position;
  }
  if (fetched) *fetched = given;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Skip(ULONG celt) {
  if (!Formats || static_cast<ULONGLONG>(Position) + celt >= Count) return S_FALSE;
  Position += celt;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Reset() {
  Position = 0;
  return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Clone(IEnumFORMATETC** clone) {
  if (!clone) return E_POINTER;
  *clone = nullptr;
  CEnumFormatEtc* copy = Create(Formats, Count);
  if (!copy) return E_OUTOFMEMORY;
  copy->Position = Position;
  *clone = copy;
  return S_OK;
}
