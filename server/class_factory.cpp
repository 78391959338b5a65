#include "server/class_factory.h"

#include "base/boundary.h"

STDMETHODIMP CClassFactory::CreateInstance(IUnknown* outer, REFIID riid, void** ppv) noexcept {
  if (!ppv) return E_POINTER;
  *ppv = nullptr;
  if (outer) return CLASS_E_NOAGGREGATION;
  return boundary::Call([&] { return create_(riid, ppv); });
}

STDMETHODIMP CClassFactory::LockServer(BOOL lock) noexcept {
  if (lock)
    com::LockServer();
  else
    com::UnlockServer();
  return S_OK;
}
