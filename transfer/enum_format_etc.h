// The list of formats a data object offers, walked by its receiver.
#pragma once
#include <windows.h>
#include <objidl.h>

// Plain reference count, not atomic: an enumerator belongs to one thread at a time.
// Born with one reference, owned by its maker; holds a module lock while it lives.
class CEnumFormatEtc : public IEnumFORMATETC {
 public:
  // Copies the entries (and any target devices they carry).
  CEnumFormatEtc(const FORMATETC* formats, ULONG count);
  CEnumFormatEtc(const CEnumFormatEtc&) = delete;
  CEnumFormatEtc& operator=(const CEnumFormatEtc&) = delete;

  // Null when memory runs out.
  static CEnumFormatEtc* Create(const FORMATETC* formats, ULONG count) noexcept;

  STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override;
  STDMETHODIMP_(ULONG) AddRef() override;
  STDMETHODIMP_(ULONG) Release() override;

  STDMETHODIMP Next(ULONG celt, FORMATETC* rgelt, ULONG* fetched) override;
  STDMETHODIMP Skip(ULONG celt) override;
  STDMETHODIMP Reset() override;
  STDMETHODIMP Clone(IEnumFORMATETC** clone) override;

 private:
  virtual ~CEnumFormatEtc();

  ULONG Position = 0;
  ULONG Count = 0;
  FORMATETC* Formats = nullptr;
  ULONG RefCount = 1;
};
