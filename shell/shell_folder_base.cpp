#include "shell/shell_folder_base.h"

#include <cstring>
#include <cwchar>
#include <new>
#include <string>

#include "base/boundary.h"
#include "store/pidl_manager.h"

CGravonShellFolderBase::CGravonShellFolderBase(CGravonPidlManagerBase* pidlMgr) : pidlMgr_(pidlMgr) {
  if (FAILED(SHGetMalloc(malloc_.Put()))) malloc_.Reset();
}

namespace {
// Answered only by our own folders, never registered: it names the object, not a contract.
constexpr GUID kOwnFolder = {0xecef8d10, 0x223f, 0x428e, {0x85, 0x2b, 0x06, 0xec, 0xa6, 0xf2, 0xde, 0x9d}};
}  // namespace

CGravonShellFolderBase* CGravonShellFolderBase::FromFolder(IShellFolder* folder) noexcept {
  void* own = nullptr;
  if (!folder || FAILED(folder->QueryInterface(kOwnFolder, &own)) || !own) return nullptr;
  auto* base = static_cast<CGravonShellFolderBase*>(own);
  base->Release();  // the caller holds the folder already
  return base;
}

void* CGravonShellFolderBase::FindInterface(REFIID riid) noexcept {
  if (void* found = ComObject::FindInterface(riid)) return found;
  if (riid == kOwnFolder) return this;
  if (riid == IID_IPersist) return static_cast<IPersist*>(static_cast<IPersistFolder*>(this));
  return nullptr;
}

bool CGravonShellFolderBase::GetFolderPath(wchar_t* destination, UINT size, bool parsing) const {
  if (!destination) return false;
  if (size) destination[0] = 0;
  wchar_t parentText[MAX_PATH] = {};
  if (parent_ && !parent_->GetFolderPath(parentText, MAX_PATH, parsing)) parentText[0] = 0;
  const size_t parentLength = wcslen(parentText);

  const bool useParsingName = parsing && parsingName_;
  const wchar_t* own = useParsingName ? parsingName_.get() : (pathText_ ? pathText_.get() : L"");
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
  parent_ = com::ComPtr<CGravonShellFolderBase>(parent);
  parsingName_.reset();
  pathText_.reset();
  list_.Reset(list ? pidlMgr_->Copy(list) : pidlMgr_->CreateRoot());
  if (!list_) return E_OUTOFMEMORY;
  if (pidlMgr_->IsRoot(list_.Get())) {
    UINT length = pidlMgr_->GetRootParsingName(nullptr, 0);
    parsingName_.reset(new (std::nothrow) wchar_t[length + 1]());
    if (!parsingName_) return E_OUTOFMEMORY;
    pidlMgr_->GetRootParsingName(parsingName_.get(), length);
  }
  UINT length = pidlMgr_->GetPath(list_.Get(), nullptr, 0);
  pathText_.reset(new (std::nothrow) wchar_t[length + 1]());
  if (!pathText_) return E_OUTOFMEMORY;
  pidlMgr_->GetPath(list_.Get(), pathText_.get(), length);
  return S_OK;
}

STDMETHODIMP CGravonShellFolderBase::Initialize(PCIDLIST_ABSOLUTE) noexcept {
  return boundary::Call([&] { return Init(nullptr, nullptr); });
}

// The name is a path below this folder; the store is not asked, so any level name parses.
STDMETHODIMP CGravonShellFolderBase::ParseDisplayName(HWND, IBindCtx*, LPWSTR name, ULONG*,
                                                      PIDLIST_RELATIVE* result, ULONG*) noexcept {
  if (!result) return E_INVALIDARG;
  *result = nullptr;
  if (!name || !IsUsable()) return E_INVALIDARG;
  return boundary::Call([&] {
    wchar_t folder[MAX_PATH];
    GetFolderPath(folder, MAX_PATH, false);
    std::wstring full = std::wstring(folder) + L'\\' + name;
    const UINT m = static_cast<UINT>(PathComponents(name).size());
    UniqueIdList list(pidlMgr_->CreateListFromPath(full.c_str()));
    if (!list) return E_INVALIDARG;
    const UINT n = pidlMgr_->GetCount(list.Get());
    if (m >= n) return E_INVALIDARG;
    *result = pidlMgr_->CopyFrom(list.Get(), n - m);
    return !*result && m > 0 ? E_OUTOFMEMORY : S_OK;
  });
}

STDMETHODIMP CGravonShellFolderBase::BindToStorage(PCUIDLIST_RELATIVE, IBindCtx*, REFIID, void** result) noexcept {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}

// The raw comparison is the answer, not a code with the order in its low word.
STDMETHODIMP CGravonShellFolderBase::CompareIDs(LPARAM parameter, PCUIDLIST_RELATIVE first,
                                                PCUIDLIST_RELATIVE second) noexcept {
  if (!pidlMgr_) return 0;
  return boundary::Call([&] { return static_cast<HRESULT>(pidlMgr_->Compare(parameter, first, second)); });
}

// The caller's mask plays no part, and only the first item is ever validated.
STDMETHODIMP CGravonShellFolderBase::GetAttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items,
                                                     SFGAOF* attributes) noexcept {
  if (!attributes) return E_INVALIDARG;
  *attributes = 0xFFFFFFFF;
  if (count == 0) return S_OK;
  if (!items || !pidlMgr_) return E_INVALIDARG;
  return boundary::Call([&] { return AttributesOf(count, items, *attributes); });
}

HRESULT CGravonShellFolderBase::AttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items, SFGAOF& attributes) {
  for (UINT i = 0; i < count; ++i) {
    LPCITEMIDLIST item = items[i];
    if ((attributes & SFGAO_VALIDATE) && !pidlMgr_->IsValid(item)) return E_FAIL;
    SFGAOF own = 0;
    LPCITEMIDLIST last = pidlMgr_->GetLast(item);
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

STDMETHODIMP CGravonShellFolderBase::GetDisplayNameOf(PCUITEMID_CHILD item, SHGDNF flags, STRRET* name) noexcept {
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
    pidlMgr_->GetPath(item, text, MAX_PATH);
  } else if (high == 0x80) {
    if (low == 0) {
      GetFolderPath(text, MAX_PATH, true);
      size_t length = wcslen(text);
      if (length + 1 < MAX_PATH) {
        text[length] = L'\\';
        pidlMgr_->GetPath(item, text + length + 1, static_cast<UINT>(MAX_PATH - length - 1));
      }
    } else if (low == 1) {
      pidlMgr_->GetPath(item, text, MAX_PATH);
    }
  } else {
    return E_INVALIDARG;
  }
  const size_t bytes = (wcslen(text) + 1) * sizeof(wchar_t);
  auto* copy = static_cast<wchar_t*>(malloc_->Alloc(bytes));
  if (!copy) return E_OUTOFMEMORY;
  std::memcpy(copy, text, bytes);
  name.uType = STRRET_WSTR;
  name.pOleStr = copy;
  return S_OK;
}

STDMETHODIMP CGravonShellFolderBase::SetNameOf(HWND, PCUITEMID_CHILD, LPCWSTR, SHGDNF, PITEMID_CHILD* result) noexcept {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}
