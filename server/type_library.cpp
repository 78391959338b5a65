#include "server/type_library.h"

#include <oleauto.h>

#include <string>

#include "base/com_base.h"
#include "server/registrar.h"

namespace {
HRESULT LoadModuleTypeLib(HMODULE module, com::ComPtr<ITypeLib>* lib, std::wstring* path) {
  *path = ModuleFilePath(module);
  if (path->empty()) return HRESULT_FROM_WIN32(GetLastError());
  return LoadTypeLibEx(path->c_str(), REGKIND_NONE, lib->Put());
}
}  // namespace

HRESULT RegisterModuleTypeLib(HMODULE module) {
  com::ComPtr<ITypeLib> lib;
  std::wstring path;
  HRESULT hr = LoadModuleTypeLib(module, &lib, &path);
  if (FAILED(hr)) return hr;
  return RegisterTypeLib(lib.Get(), path.data(), nullptr);
}

HRESULT UnregisterModuleTypeLib(HMODULE module) {
  com::ComPtr<ITypeLib> lib;
  std::wstring path;
  HRESULT hr = LoadModuleTypeLib(module, &lib, &path);
  if (FAILED(hr)) return hr;
  TLIBATTR* attr = nullptr;
  hr = lib->GetLibAttr(&attr);
  if (FAILED(hr)) return hr;
  hr = UnRegisterTypeLib(attr->guid, attr->wMajorVerNum, attr->wMinorVerNum, attr->lcid, attr->syskind);
  lib->ReleaseTLibAttr(attr);
  return hr;
}
