// The class object behind each entry of the object map.
#pragma once
#include "server/com_base.h"
#include "server/object_map.h"

class CClassFactory : public com::ComObject<IClassFactory> {
 public:
  explicit CClassFactory(ClassCreator create) noexcept : create_(create) {}

  STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) override;
  STDMETHODIMP LockServer(BOOL lock) override;

 private:
  ClassCreator create_;
};
