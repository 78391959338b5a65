// The class object behind each entry of the object map.
#pragma once
#include "base/com_base.h"
#include "server/object_map.h"

class CClassFactory : public com::ComObject<IClassFactory> {
 public:
  explicit CClassFactory(ClassCreator create) noexcept : create_(create) {}

  STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) noexcept override;
  STDMETHODIMP LockServer(BOOL lock) noexcept override;

 private:
  ClassCreator create_;
};
