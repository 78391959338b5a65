// The least a folder DLL can be: one class, its class object and IPersistFolder. bench_load
// measures the module against it, so the ratio shows what the module adds on top of COM.
#include <windows.h>
#include <shlobj.h>

#include <atomic>

namespace {

// {3F0E4B1C-8D7A-4C2E-9B61-5A4D2C7E8F10}
const CLSID kMinimalFolder = {0x3f0e4b1c, 0x8d7a, 0x4c2e, {0x9b, 0x61, 0x5a, 0x4d, 0x2c, 0x7e, 0x8f, 0x10}};
std::atomic<long> locks{0};

class Folder final : public IPersistFolder {
 public:
  Folder() { ++locks; }
  ~Folder() {
    CoTaskMemFree(where_);
    --locks;
  }
  STDMETHODIMP QueryInterface(REFIID riid, void** out) override {
    if (riid == IID_IUnknown || riid == IID_IPersist || riid == IID_IPersistFolder) {
      *out = static_cast<IPersistFolder*>(this);
      AddRef();
      return S_OK;
    }
    *out = nullptr;
    return E_NOINTERFACE;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return ++refs_; }
  STDMETHODIMP_(ULONG) Release() override {
    ULONG left = --refs_;
    if (left == 0) delete this;
    return left;
  }
  STDMETHODIMP GetClassID(CLSID* clsid) override {
    *clsid = kMinimalFolder;
    return S_OK;
  }
  STDMETHODIMP Initialize(LPCITEMIDLIST where) override {
    CoTaskMemFree(where_);
    where_ = ILClone(where);
    return where_ ? S_OK : E_OUTOFMEMORY;
  }

 private:
  std::atomic<ULONG> refs_{1};
  LPITEMIDLIST where_ = nullptr;
};

class Factory final : public IClassFactory {
 public:
  STDMETHODIMP QueryInterface(REFIID riid, void** out) override {
    if (riid == IID_IUnknown || riid == IID_IClassFactory) {
      *out = static_cast<IClassFactory*>(this);
      AddRef();
      return S_OK;
    }
    *out = nullptr;
    return E_NOINTERFACE;
  }
  STDMETHODIMP_(ULONG) AddRef() override {
    ++locks;
    return 2;
  }
  STDMETHODIMP_(ULONG) Release() override {
    --locks;
    return 1;
  }
  STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** out) override {
    *out = nullptr;
    if (outer) return CLASS_E_NOAGGREGATION;
    Folder* folder = new (std::nothrow) Folder;
    if (!folder) return E_OUTOFMEMORY;
    HRESULT hr = folder->QueryInterface(riid, out);
    folder->Release();
    return hr;
  }
  STDMETHODIMP LockServer(BOOL lock) override {
    lock ? ++locks : --locks;
    return S_OK;
  }
};

Factory factory;

}  // namespace

extern "C" __declspec(dllexport) HRESULT STDAPICALLTYPE DllGetClassObject(REFCLSID clsid, REFIID riid, void** out) {
  *out = nullptr;
  if (clsid != kMinimalFolder) return CLASS_E_CLASSNOTAVAILABLE;
  return factory.QueryInterface(riid, out);
}

extern "C" __declspec(dllexport) HRESULT STDAPICALLTYPE DllCanUnloadNow() { return locks == 0 ? S_OK : S_FALSE; }
