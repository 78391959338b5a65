// The list of formats a data object offers, walked by its receiver.
#pragma once
#include <windows.h>
#include <objidl.h>
#include <vector>

#include "base/com_base.h"
#include "base/win_handles.h"

class CEnumFormatEtc : public com::ComObject<IEnumFORMATETC> {
 public:
  // Copies the entries and the target devices they carry; throws when memory runs out.
  CEnumFormatEtc(const FORMATETC* formats, ULONG count);

  STDMETHODIMP Next(ULONG celt, FORMATETC* rgelt, ULONG* fetched) noexcept override;
  STDMETHODIMP Skip(ULONG celt) noexcept override;
  STDMETHODIMP Reset() noexcept override;
  STDMETHODIMP Clone(IEnumFORMATETC** clone) noexcept override;

 private:
  struct Entry {
    FORMATETC format;
    win::UniqueCoMem<DVTARGETDEVICE> device;  // what format.ptd points at
  };

  ULONG Position = 0;
  std::vector<Entry> Formats;
};
