#include "shell/shell_folder_base.h"

#include <cstring>
#include <cwchar>
#include <new>
#include <string>

#include "base/boundary.h"
#include "store/pidl_manager.h"

CGravonShellFolderBase::CGravonShellFolderBase(CGravonPidlManagerBase* pidlMgr) : m_pidlMgr(pidlMgr) {
  if (FAILED(SHGetMalloc(&m_malloc))) m_malloc = nullptr;
}

CGravonShellFolderBase::~CGravonShellFolderBase() {
  Clear();
  if (m_malloc) m_malloc->Release();
}

void CGravonShellFolderBase::Clear() {
  if (m_pidlMgr) m_pidlMgr->Free(m_list);
  m_list = nullptr;
  if (m_parent) static_cast<IShellFolder*>(m_parent)->Release();
  m_parent = nullptr;
  m_parsingName.reset();
  m_pathText.reset();
}

void* CGravonShellFolderBase::FindInterface(REFIID riid) noexcept {
  if (void* found = ComObject::FindInterface(riid)) return found;
  if (riid == IID_IPersist) return static_cast<IPersist*>(static_cast<IPersistFolder*>(this));
  return nullptr;
}

bool CGravonShellFolderBase::GetFolderPath(wchar_t* destination, UINT size, bool parsing) const {
  if (!destination) return false;
  if (size) destination[0] = 0;
  wchar_t parentText[MAX_PATH] = {};
  if (m_parent && !m_parent->GetFolderPath(parentText, MAX_PATH, parsing)) parentText[0] = 0;
  const size_t parentLength = wcslen(parentText);

  const bool useParsingName = parsing && m_parsingName;
  const wchar_t* own = useParsingName ? m_parsingName.get() : (m_pathText ? m_pathText.get() : L"");
  const size_t ownLength = wcslen(own);
  // The parsing form joins with a backslash only under a parent; the plain form always does.
  const bool separator = useParsingName ? parentLength != 0 : ownLength != 0;
  const size_t textLength = parentLength + (separator ? 1 : 0) + ownLength;
  // The address's own size rule, and besides it room for the terminator.
  if (parentLength + 1 + ownLength > size || textLength >= size) return false;

  std::memcpy(destination, parentText, parentLength * sizeof(wchar_t));
  size_t at = parentLength;
  if (separator) destination[at++] = L'\\';
  std::memcpy(destination + at, own, ownLength * sizeof(wchar_t));
  destination[textLength] = 0;
  return true;
}

HRESULT CGravonShellFolderBase::Init(CGravonShellFolderBase* parent, LPCITEMIDLIST list) {
  if (!IsUsable()) return E_OUTOFMEMORY;
  if (parent) static_cast<IShellFolder*>(parent)->AddRef();
  Clear();
  m_parent = parent;
  m_list = list ? m_pidlMgr->Copy(list) : m_pidlMgr->CreateRoot();
  if (!m_list) return E_OUTOFMEMORY;
  if (m_pidlMgr->IsRoot(m_list)) {
    UINT length = m_pidlMgr->GetRootParsingName(nullptr, 0);
    m_parsingName.reset(new (std::nothrow) wchar_t[length + 1]());
    if (!m_parsingName) return E_OUTOFMEMORY;
    m_pidlMgr->GetRootParsingName(m_parsingName.get(), length);
  }
  UINT length = m_pidlMgr->GetPath(m_list, nullptr, 0);
  m_pathText.reset(new (std::nothrow) wchar_t[length + 1]());
  if (!m_pathText) return E_OUTOFMEMORY;
  m_pidlMgr->GetPath(m_list, m_pathText.get(), length);
  return S_OK;
}

STDMETHODIMP CGravonShellFolderBase::Initialize(PCIDLIST_ABSOLUTE) {
  return boundary::Call([&] { return Init(nullptr, nullptr); });
}

// The name is a path below this folder; the store is not asked, so any level name parses.
STDMETHODIMP CGravonShellFolderBase::ParseDisplayName(HWND, IBindCtx*, LPWSTR name, ULONG*,
                                                      PIDLIST_RELATIVE* result, ULONG*) {
  if (!result) return E_INVALIDARG;
  *result = nullptr;
  if (!name || !IsUsable()) return E_INVALIDARG;
  return boundary::Call([&] {
    wchar_t folder[MAX_PATH];
    GetFolderPath(folder, MAX_PATH, false);
    std::wstring full = std::wstring(folder) + L'\\' + name;
    const UINT m = static_cast<UINT>(PathComponents(name).size());
    LPITEMIDLIST list = m_pidlMgr->CreateListFromPath(full.c_str());
    if (!list) return E_INVALIDARG;
    const UINT n = m_pidlMgr->GetCount(list);
    HRESULT hr = S_OK;
    if (m < n) {
      *result = m_pidlMgr->CopyFrom(list, n - m);
      if (!*result && m > 0) hr = E_OUTOFMEMORY;
    } else {
      hr = E_INVALIDARG;
    }
    m_pidlMgr->Free(list);
    return hr;
  });
}

STDMETHODIMP CGravonShellFolderBase::BindToStorage(PCUIDLIST_RELATIVE, IBindCtx*, REFIID, void** result) {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}

// The raw comparison is the answer, not a code with the order in its low word.
STDMETHODIMP CGravonShellFolderBase::CompareIDs(LPARAM parameter, PCUIDLIST_RELATIVE first,
                                                PCUIDLIST_RELATIVE second) {
  if (!m_pidlMgr) return 0;
  return boundary::Call([&] { return static_cast<HRESULT>(m_pidlMgr->Compare(parameter, first, second)); });
}

// The caller's mask plays no part, and only the first item is ever validated.
STDMETHODIMP CGravonShellFolderBase::GetAttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items,
                                                     SFGAOF* attributes) {
  if (!attributes) return E_INVALIDARG;
  *attributes = 0xFFFFFFFF;
  if (count == 0) return S_OK;
  if (!items || !m_pidlMgr) return E_INVALIDARG;
  return boundary::Call([&] { return AttributesOf(count, items, *attributes); });
}

HRESULT CGravonShellFolderBase::AttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items, SFGAOF& attributes) {
  for (UINT i = 0; i < count; ++i) {
    LPCITEMIDLIST item = items[i];
    if ((attributes & SFGAO_VALIDATE) && !m_pidlMgr->IsValid(item)) return E_FAIL;
    SFGAOF own = 0;
    LPCITEMIDLIST last = m_pidlMgr->GetLast(item);
    if (last) {
      switch (CPidlMgr::GetType(last)) {
        case PIDL_LEVEL: own = SFGAO_FOLDER | SFGAO_DROPTARGET; break;
        case PIDL_FILE: own = SFGAO_CANCOPY; break;
        default: break;
      }
    }
    attributes &= own;
  }
  return S_OK;
}

STDMETHODIMP CGravonShellFolderBase::GetDisplayNameOf(PCUITEMID_CHILD item, SHGDNF flags, STRRET* name) {
  if (!name) return E_INVALIDARG;
  if (!IsUsable()) return E_OUTOFMEMORY;
  return boundary::Call([&] { return DisplayNameOf(item, flags, *name); });
}

HRESULT CGravonShellFolderBase::DisplayNameOf(PCUITEMID_CHILD item, SHGDNF flags, STRRET& name) {
  wchar_t text[MAX_PATH] = {};
  const DWORD high = flags >> 8;
  const DWORD low = flags & 0xFF;
  if (high == 0 || high == 0x40) {
    if (low > 1) return E_INVALIDARG;
    m_pidlMgr->GetPath(item, text, MAX_PATH);
  } else if (high == 0x80) {
    if (low == 0) {
      GetFolderPath(text, MAX_PATH, true);
      size_t length = wcslen(text);
      if (length + 1 < MAX_PATH) {
        text[length] = L'\\';
        m_pidlMgr->GetPath(item, text + length + 1, static_cast<UINT>(MAX_PATH - length - 1));
      }
    } else if (low == 1) {
      m_pidlMgr->GetPath(item, text, MAX_PATH);
    }
  } else {
    return E_INVALIDARG;
  }
  const size_t bytes = (wcslen(text) + 1) * sizeof(wchar_t);
  auto* copy = static_cast<wchar_t*>(m_malloc->Alloc(bytes));
  if (!copy) return E_OUTOFMEMORY;
  std::memcpy(copy, text, bytes);
  name.uType = STRRET_WSTR;
  name.pOleStr = copy;
  return S_OK;
}

STDMETHODIMP CGravonShellFolderBase::SetNameOf(HWND, PCUITEMID_CHILD, LPCWSTR, SHGDNF, PITEMID_CHILD* result) {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}
