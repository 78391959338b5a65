#include "shell/query_info.h"

#include <cstring>
#include <new>

#include "base/boundary.h"
#include "server/class_creators.h"
#include "store/pidl_manager.h"

CGravonQueryInfoBase::CGravonQueryInfoBase(CGravonPidlManagerBase* pidlMgr) : m_pidlMgr(pidlMgr) {
  if (FAILED(SHGetMalloc(&m_malloc))) m_malloc = nullptr;
}

CGravonQueryInfoBase::~CGravonQueryInfoBase() {
  if (m_pidlMgr) m_pidlMgr->Free(m_list);
  if (m_malloc) m_malloc->Release();
}

bool CGravonQueryInfoBase::SetItem(LPCITEMIDLIST fullList) {
  return m_pidlMgr && m_pidlMgr->Assign(m_list, fullList);
}

STDMETHODIMP CGravonQueryInfoBase::GetInfoTip(DWORD, LPWSTR* text) {
  if (!text) return E_INVALIDARG;
  *text = nullptr;
  if (!IsUsable()) return E_OUTOFMEMORY;
  return boundary::Call([&] {
    wchar_t path[MAX_PATH] = {};
    UINT length = m_pidlMgr->GetPath(m_list, path, MAX_PATH);
    auto* tip = static_cast<wchar_t*>(m_malloc->Alloc((length + 1) * sizeof(wchar_t)));
    if (!tip) return E_OUTOFMEMORY;
    std::memcpy(tip, path, length * sizeof(wchar_t));
    tip[length] = 0;
    *text = tip;
    return S_OK;
  });
}

STDMETHODIMP CGravonQueryInfoBase::GetInfoFlags(DWORD*) { return E_NOTIMPL; }

CMarlixDLQueryInfo::CMarlixDLQueryInfo() : CGravonQueryInfoBase(new (std::nothrow) CPidlMgr) {}

HRESULT CreateMarlixDLQueryInfo(REFIID riid, void** ppv) { return com::CreateInstance<CMarlixDLQueryInfo>(riid, ppv); }
