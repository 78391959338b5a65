#include "shell/enum_id_list.h"

#include <new>
#include <string>

#include "base/boundary.h"
#include "store/station_record.h"

CEnumIDListImpl::CEnumIDListImpl(CGravonPidlManagerBase* pidlMgr) : pidlMgr_(pidlMgr) {
  if (FAILED(SHGetMalloc(malloc_.Put()))) malloc_.Reset();
}

// Nodes come from the task allocator, whose owner frees them as IMalloc::Free does.
CEnumIDListImpl::~CEnumIDListImpl() {
  for (Node* node = first_; node;) {
    win::UniqueCoMem<Node> owned(node);
    UniqueIdList item(node->item);
    node = node->next;
  }
}

bool CEnumIDListImpl::AddToEnumList(UniqueIdList& item) {
  if (!malloc_) return false;
  auto* node = static_cast<Node*>(malloc_->Alloc(sizeof(Node)));
  if (!node) return false;
  node->next = nullptr;
  node->item = item.Release();
  if (last_) last_->next = node;
  else first_ = current_ = node;
  last_ = node;
  if (!current_) current_ = node;
  return true;
}

STDMETHODIMP CEnumIDListImpl::Next(ULONG count, LPITEMIDLIST* items, ULONG* fetched) noexcept {
  if (count >= 2 && !fetched) return E_INVALIDARG;
  if (count > 0 && !items) return E_INVALIDARG;
  ULONG done = 0;
  while (done < count && current_ && pidlMgr_) {
    LPITEMIDLIST copy = pidlMgr_->Copy(current_->item);
    if (!copy) break;
    items[done++] = copy;
    current_ = current_->next;
  }
  if (fetched) *fetched = done;
  return done == count ? S_OK : S_FALSE;
}

STDMETHODIMP CEnumIDListImpl::Skip(ULONG count) noexcept {
  if (count == 0) return S_OK;
  ULONG done = 0;
  while (done < count && current_) {
    current_ = current_->next;
    ++done;
  }
  return done == count ? S_OK : S_FALSE;
}

STDMETHODIMP CEnumIDListImpl::Reset() noexcept {
  current_ = first_;
  return S_OK;
}

STDMETHODIMP CEnumIDListImpl::Clone(IEnumIDList** result) noexcept {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}

CMarlixDLEnumIDList::CMarlixDLEnumIDList() : CEnumIDListImpl(new (std::nothrow) CPidlMgr) {
  marlixPidlMgr_ = static_cast<CPidlMgr*>(pidlMgr_.get());
}

void CMarlixDLEnumIDList::Create(const wchar_t* path, DWORD flags, HRESULT* result) noexcept {
  HRESULT hr = boundary::Call([&] { return Build(path, flags); });
  if (result) *result = hr;
  if (FAILED(hr)) Release();
}

HRESULT CMarlixDLEnumIDList::Build(const wchar_t* path, DWORD flags) {
  if (!marlixPidlMgr_ || !malloc_) return E_OUTOFMEMORY;
  std::wstring folder = path && *path ? path : kRootText;
  std::vector<std::wstring> parts = PathComponents(folder.c_str());
  if (parts.empty()) return E_OUTOFMEMORY;
  const bool atRoot = parts.size() < 2;
  if ((flags & SHCONTF_FOLDERS) && atRoot && FAILED(AddLevels(folder))) return E_OUTOFMEMORY;
  if ((flags & SHCONTF_NONFOLDERS) && !atRoot) {
    UniqueIdList file(marlixPidlMgr_->CreateItem(PIDL_FILE, kFileText, sizeof(kFileText)));
    if (file && !AddToEnumList(file)) return E_OUTOFMEMORY;
  }
  return S_OK;
}

// An unreadable store is no failure: the root then shows nothing.
HRESULT CMarlixDLEnumIDList::AddLevels(const std::wstring& path) {
  for (const std::wstring& name : ListStationNames()) {
    UniqueIdList item(marlixPidlMgr_->CreateItemFromPath((path + L'\\' + name).c_str()));
    if (item && !AddToEnumList(item)) return E_OUTOFMEMORY;
  }
  return S_OK;
}

HRESULT CreateMarlixDLEnumIDList(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLEnumIDList>(riid, ppv); }
