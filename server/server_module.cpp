#include "server/server_module.h"

#include <string>

#include "base/boundary.h"
#include "base/class_ids.h"
#include "base/win_handles.h"
#include "helpers/filelog.h"
#include "server/class_factory.h"
#include "server/registrar.h"
#include "server/type_library.h"

namespace {
// The folder as the shell sees it from outside: SFGAO_FOLDER | SFGAO_HASSUBFOLDER.
const BYTE kFolderAttributes[4] = {0x00, 0x00, 0x00, 0xA0};

std::wstring ShellFolderKeyText() {
  wchar_t clsid[40] = {};
  StringFromGUID2(CLSID_MarlixDLShellFolder, clsid, 40);
  return L"CLSID\\" + std::wstring(clsid) + L"\\ShellFolder";
}
}  // namespace

void CServerModule::Init(std::span<const ObjectMapEntry> map, HMODULE module) noexcept {
  map_ = map;
  module_ = module;
}

void CServerModule::Term() noexcept {
  map_ = {};
  module_ = nullptr;
}

HRESULT CServerModule::GetClassObject(REFCLSID clsid, REFIID riid, void** ppv) const {
  if (!ppv) return E_POINTER;
  *ppv = nullptr;
  const ObjectMapEntry* entry = FindObjectMapEntry(map_, clsid);
  if (!entry) return CLASS_E_CLASSNOTAVAILABLE;
  auto factory = com::Make<CClassFactory>(entry->create);
  if (!factory) return E_OUTOFMEMORY;
  return factory->QueryInterface(riid, ppv);
}

HRESULT CServerModule::CanUnloadNow() const noexcept { return com::ModuleLockCount() == 0 ? S_OK : S_FALSE; }

HRESULT CServerModule::RegisterServer() const noexcept {
  return boundary::Call([this] { return Register(); });
}

// S_OK in all cases: an uninstaller must be able to go on, memory short or not.
HRESULT CServerModule::UnregisterServer() const noexcept {
  boundary::CallVoid([this] { Unregister(); });
  return S_OK;
}

HRESULT CServerModule::Register() const {
  if (!module_) return E_UNEXPECTED;
  // The classes register no component categories, so each entry is its script alone.
  for (const auto& entry : map_) {
    const HRESULT hr = RunRegistryResource(module_, entry.script, true);
    kld::ft::LogTextA("Registration: script %u answered 0x%08lX", entry.script, hr);
    if (FAILED(hr)) return hr;
  }
  HRESULT hr = RegisterModuleTypeLib(module_);
  kld::ft::LogTextA("Registration: the type library answered 0x%08lX", hr);
  if (FAILED(hr)) return hr;

  win::UniqueHKey key;
  LSTATUS status = RegCreateKeyExW(HKEY_CLASSES_ROOT, ShellFolderKeyText().c_str(), 0, nullptr, 0, KEY_WRITE, nullptr,
                                   key.Put(), nullptr);
  if (status == ERROR_SUCCESS)
    status = RegSetValueExW(key.Get(), L"Attributes", 0, REG_BINARY, kFolderAttributes, sizeof(kFolderAttributes));
  kld::ft::LogTextA("Registration: the folder's attributes answered %ld", status);
  return hr;
}

void CServerModule::Unregister() const {
  if (module_) {
    bool failed = false;
    for (const auto& entry : map_) {
      const HRESULT hr = RunRegistryResource(module_, entry.script, false);
      kld::ft::LogTextA("Unregistration: script %u answered 0x%08lX", entry.script, hr);
      if (FAILED(hr)) {
        failed = true;
        break;
      }
    }
    if (!failed) kld::ft::LogTextA("Unregistration: the type library answered 0x%08lX", UnregisterModuleTypeLib(module_));
  }
  std::wstring keyText = ShellFolderKeyText();
  // A value name with a path in it names nothing; this first removal never finds
  // anything and stays for compatibility with what earlier versions did.
  RegDeleteValueW(HKEY_CLASSES_ROOT, (keyText + L"\\Attributes").c_str());
  win::UniqueHKey key;
  if (RegOpenKeyExW(HKEY_CLASSES_ROOT, keyText.c_str(), 0, KEY_WRITE, key.Put()) == ERROR_SUCCESS)
    RegDeleteValueW(key.Get(), L"Attributes");
}
