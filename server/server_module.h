// The COM side of the module: its object map, class objects and registration.
#pragma once
#include <windows.h>
#include <span>

#include "server/object_map.h"

class CServerModule {
 public:
  void SetTypeLibId(const GUID& libid) noexcept { libid_ = libid; }
  const GUID& TypeLibId() const noexcept { return libid_; }

  // Until Init the module serves and registers nothing.
  void Init(std::span<const ObjectMapEntry> map, HMODULE module) noexcept;
  void Term() noexcept;

  HRESULT GetClassObject(REFCLSID clsid, REFIID riid, void** ppv) const;
  HRESULT CanUnloadNow() const noexcept;
  // Registration answers the first failure; unregistration S_OK in all cases.
  HRESULT RegisterServer() const noexcept;
  HRESULT UnregisterServer() const noexcept;

 private:
  HRESULT Register() const;
  void Unregister() const;

  GUID libid_{};
  std::span<const ObjectMapEntry> map_;
  HMODULE module_ = nullptr;
};
