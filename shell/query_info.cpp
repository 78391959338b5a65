#include "shell/query_info.h"

#include <cstring>
#include <new>

#include "base/boundary.h"
#include "store/pidl_manager.h"

CGravonQueryInfoBase::CGravonQueryInfoBase(CGravonPidlManagerBase* pidlMgr) : pidlMgr_(pidlMgr) {
  if (FAILED(SHGetMalloc(malloc_.Put()))) malloc_.Reset();
}

bool CGravonQueryInfoBase::SetItem(LPCITEMIDLIST fullList) { return pidlMgr_ && pidlMgr_->Assign(list_, fullList); }

STDMETHODIMP CGravonQueryInfoBase::GetInfoTip(DWORD, LPWSTR* text) noexcept {
  if (!text) return E_INVALIDARG;
  *text = nullptr;
  if (!IsUsable()) return E_OUTOFMEMORY;
  return boundary::Call([&] {
    wchar_t path[MAX_PATH] = {};
    UINT length = pidlMgr_->GetPath(list_.Get(), path, MAX_PATH);
    auto* tip = static_cast<wchar_t*>(malloc_->Alloc((length + 1) * sizeof(wchar_t)));
    if (!tip) return E_OUTOFMEMORY;
    std::memcpy(tip, path, length * sizeof(wchar_t));
    tip[length] = 0;
    *text = tip;
    return S_OK;
  });
}

STDMETHODIMP CGravonQueryInfoBase::GetInfoFlags(DWORD*) noexcept { return E_NOTIMPL; }

CMarlixDLQueryInfo::CMarlixDLQueryInfo() : CGravonQueryInfoBase(new (std::nothrow) CPidlMgr) {}

HRESULT CreateMarlixDLQueryInfo(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLQueryInfo>(riid, ppv); }
