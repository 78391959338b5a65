#include "shell/enum_id_list.h"

#include <new>
#include <string>

#include "helpers/win_handles.h"
#include "server/class_creators.h"
#include "store/station_record.h"

CEnumIDListImpl::CEnumIDListImpl(CGravonPidlManagerBase* pidlMgr) : m_pidlMgr(pidlMgr) {
  if (FAILED(SHGetMalloc(&m_malloc))) m_malloc = nullptr;
}

CEnumIDListImpl::~CEnumIDListImpl() {
  for (Node* node = m_first; node;) {
    Node* next = node->next;
    if (m_pidlMgr) m_pidlMgr->Free(node->item);
    m_malloc->Free(node);
    node = next;
  }
  if (m_malloc) m_malloc->Release();
  delete m_pidlMgr;
}

bool CEnumIDListImpl::AddToEnumList(LPITEMIDLIST item) {
  if (!m_malloc) return false;
  auto* node = static_cast<Node*>(m_malloc->Alloc(sizeof(Node)));
  if (!node) return false;
  node->next = nullptr;
  node->item = item;
  if (m_last) m_last->next = node;
  else m_first = m_current = node;
  m_last = node;
  if (!m_current) m_current = node;
  return true;
}

STDMETHODIMP CEnumIDListImpl::Next(ULONG count, LPITEMIDLIST* items, ULONG* fetched) {
  if (count >= 2 && !fetched) return E_INVALIDARG;
  if (count > 0 && !items) return E_INVALIDARG;
  ULONG done = 0;
  while (done < count && m_current && m_pidlMgr) {
    LPITEMIDLIST copy = m_pidlMgr->Copy(m_current->item);
    if (!copy) break;
    items[done++] = copy;
    m_current = m_current->next;
  }
  if (fetched) *fetched = done;
  return done == count ? S_OK : S_FALSE;
}

STDMETHODIMP CEnumIDListImpl::Skip(ULONG count) {
  if (count == 0) return S_OK;
  ULONG done = 0;
  while (done < count && m_current) {
    m_current = m_current->next;
    ++done;
  }
  return done == count ? S_OK : S_FALSE;
}

STDMETHODIMP CEnumIDListImpl::Reset() {
  m_current = m_first;
  return S_OK;
}

STDMETHODIMP CEnumIDListImpl::Clone(IEnumIDList** result) {
  if (result) *result = nullptr;
  return E_NOTIMPL;
}

namespace {
const wchar_t kRootText[] = L"Marlix Digital Levels";
const wchar_t kFileText[] = L"file1.tkf";
constexpr DWORD kFolders = 0x20;     // SHCONTF_FOLDERS
constexpr DWORD kNonFolders = 0x40;  // SHCONTF_NONFOLDERS
}  // namespace

CMarlixDLEnumIDList::CMarlixDLEnumIDList() : CEnumIDListImpl(new (std::nothrow) CPidlMgr) {
  m_marlixPidlMgr = static_cast<CPidlMgr*>(m_pidlMgr);
}

void CMarlixDLEnumIDList::Create(const wchar_t* path, DWORD flags, HRESULT* result) {
  HRESULT hr;
  try {
    hr = Build(path, flags);
  } catch (const std::bad_alloc&) {
    hr = E_OUTOFMEMORY;
  }
  if (result) *result = hr;
  if (FAILED(hr)) Release();
}

HRESULT CMarlixDLEnumIDList::Build(const wchar_t* path, DWORD flags) {
  if (!m_marlixPidlMgr || !m_malloc) return E_OUTOFMEMORY;
  std::wstring folder = path && *path ? path : kRootText;
  std::vector<std::wstring> parts = PathComponents(folder.c_str());
  if (parts.empty()) return E_OUTOFMEMORY;
  const bool atRoot = parts.size() < 2;

  if ((flags & kFolders) && atRoot) {
    if (FAILED(AddLevels(folder))) return E_OUTOFMEMORY;
  }
  if ((flags & kNonFolders) && !atRoot) {
    LPITEMIDLIST file = m_marlixPidlMgr->CreateItem(PIDL_FILE, kFileText, sizeof(kFileText));
    if (file && !AddToEnumList(file)) {
      m_pidlMgr->Free(file);
      return E_OUTOFMEMORY;
    }
  }
  return S_OK;
}

// An unreadable store is no failure: the root then shows nothing.
HRESULT CMarlixDLEnumIDList::AddLevels(const std::wstring& path) {
  win::UniqueHKey levels;
  if (RegCreateKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr,
                      levels.Put(), nullptr) != ERROR_SUCCESS)
    return S_OK;
  for (DWORD index = 0;; ++index) {
    wchar_t keyName[MAX_PATH];
    DWORD keyLength = MAX_PATH;
    if (RegEnumKeyExW(levels.Get(), index, keyName, &keyLength, nullptr, nullptr, nullptr, nullptr) !=
        ERROR_SUCCESS)
      break;
    win::UniqueHKey level;
    if (RegOpenKeyExW(levels.Get(), keyName, 0, KEY_READ, level.Put()) != ERROR_SUCCESS) continue;
    // Read as the store reads it, so that every listed level can be found again by name.
    std::wstring name;
    if (ReadStationString(level.Get(), L"Name", name) != ERROR_SUCCESS) continue;
    std::wstring itemPath = path + L'\\' + name;
    LPITEMIDLIST item = m_marlixPidlMgr->CreateItemFromPath(itemPath.c_str());
    if (!item) continue;
    if (!AddToEnumList(item)) {
      m_pidlMgr->Free(item);
      return E_OUTOFMEMORY;
    }
  }
  return S_OK;
}

HRESULT CreateMarlixDLEnumIDList(REFIID riid, void** ppv) { return com::CreateInstance<CMarlixDLEnumIDList>(riid, ppv); }
