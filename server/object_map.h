// The classes the module serves to the outside, in registration order.
#pragma once
#include <windows.h>
#include <span>

using ClassCreator = HRESULT (*)(REFIID riid, void** ppv) noexcept;

struct ObjectMapEntry {
  const CLSID* clsid;
  UINT script;  // resource of type "REGISTRY"
  ClassCreator create;
};

std::span<const ObjectMapEntry> ModuleObjectMap() noexcept;

// Null when the CLSID is not in the map.
const ObjectMapEntry* FindObjectMapEntry(std::span<const ObjectMapEntry> map, REFCLSID clsid) noexcept;
