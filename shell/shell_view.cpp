// The view's own answers to the browser, its refreshing, and the enumeration that fills
// its list from a worker thread.
#include "shell/shell_view.h"

#include <new>

#include "base/boundary.h"
#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "base/window_messages.h"
#include "shell/shell_folder_base.h"
#include "store/string_table.h"

namespace {

constexpr DWORD kAnimateStyle = WS_CHILD | WS_VISIBLE | ACS_CENTER | ACS_TRANSPARENT | ACS_AUTOPLAY;
constexpr DWORD kEnumThreadStack = 0x100000;

// Off the window's thread: asks the folder for its items and posts them to the view.
// Touches nothing but its job, and keeps the module mapped until it has left it.
DWORD WINAPI EnumThreadProc(void* parameter) noexcept {
  auto* job = static_cast<EnumJob*>(parameter);
  SetThreadLocale(job->Locale);
  IEnumIDList* list = nullptr;
  if (FAILED(job->Folder->EnumObjects(job->ViewWindow, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &list))) list = nullptr;
  job->Result.store(list);
  if (!IsWindow(job->ViewWindow) ||
      !PostMessageW(job->ViewWindow, GetEnumIDListMessage, 0, reinterpret_cast<LPARAM>(list)))
    job->DropResult();
  job->Folder.Reset();
  HMODULE module = job->Module;
  job->Release();
  if (module) FreeLibraryAndExitThread(module, 0);
  return 0;
}

}  // namespace

void EnumJob::DropResult() noexcept {
  if (IEnumIDList* list = Result.exchange(nullptr)) list->Release();
}

void EnumJob::Release() noexcept {
  if (--Refs == 0) {
    DropResult();
    delete this;
  }
}

CMarlixDLShellView::CMarlixDLShellView() {
  InitCommonControls();
  if (FAILED(SHGetMalloc(Malloc.Put()))) Malloc.Reset();
  PidlMgr.reset(new (std::nothrow) CPidlMgr);
  AddNewText = LoadTranslatedString(IDS_ADD_NEW_LEVEL);
}

HRESULT CMarlixDLShellView::Init(IShellFolder* folder, LPCITEMIDLIST folderIdList) {
  if (!IsUsable()) return E_OUTOFMEMORY;
  ShellFolder = com::ComPtr<IShellFolder>(folder);
  FolderBase = CGravonShellFolderBase::FromFolder(folder);
  if (!PidlMgr->Assign(FolderIdList, folderIdList)) return E_OUTOFMEMORY;
  UIState = 0;
  ThreadLocale = GetThreadLocale();
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::GetWindow(HWND* window) noexcept {
  if (!window) return E_INVALIDARG;
  *window = ViewWindow;
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::ContextSensitiveHelp(BOOL) noexcept { return E_NOTIMPL; }

// The browser is always told S_FALSE, so it may also see a key that matched. Hosts hand over
// every message of their loop: a key typed in the address bar or an Open dialog's file-name
// box is theirs, and a Delete there must not delete the selected level.
STDMETHODIMP CMarlixDLShellView::TranslateAccelerator(MSG* msg) noexcept {
  if (msg && Accelerators && IsWindow(ViewWindow) && (msg->hwnd == ViewWindow || IsChild(ViewWindow, msg->hwnd)))
    ::TranslateAcceleratorW(ViewWindow, Accelerators, msg);
  return S_FALSE;
}

STDMETHODIMP CMarlixDLShellView::EnableModeless(BOOL) noexcept { return E_NOTIMPL; }

STDMETHODIMP CMarlixDLShellView::Refresh() noexcept {
  if (IsWindow(ListWindow)) SendMessageW(ListWindow, LVM_DELETEALLITEMS, 0, 0);
  StartEnumeration();
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::GetCurrentInfo(LPFOLDERSETTINGS settings) noexcept {
  if (!settings) return E_INVALIDARG;
  *settings = FolderSettings;
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::AddPropertySheetPages(DWORD, LPFNSVADDPROPSHEETPAGE, LPARAM) noexcept {
  return E_NOTIMPL;
}

// Only the mode is kept; column widths and the sort order are not part of it.
STDMETHODIMP CMarlixDLShellView::SaveViewState() noexcept {
  if (!ShellBrowser) return E_UNEXPECTED;
  com::ComPtr<IStream> stream;
  HRESULT hr = ShellBrowser->GetViewStateStream(STGM_WRITE, stream.Put());
  if (hr != S_OK) return FAILED(hr) ? hr : E_FAIL;
  if (!stream) return E_FAIL;
  UINT mode = FolderSettings.ViewMode;
  return stream->Write(&mode, sizeof(mode), nullptr);
}

STDMETHODIMP CMarlixDLShellView::SelectItem(PCUITEMID_CHILD, UINT) noexcept { return E_NOTIMPL; }

// The object of the first selected row, or of row 0 when nothing is selected.
STDMETHODIMP CMarlixDLShellView::GetItemObject(UINT item, REFIID riid, void** ppv) noexcept {
  if (!ppv) return E_INVALIDARG;
  *ppv = nullptr;
  if (item != SVGIO_SELECTION) return E_NOINTERFACE;
  if (!ShellFolder) return E_UNEXPECTED;
  if (!IsWindow(ListWindow)) return E_INVALIDARG;
  LVITEMW lvi{};
  lvi.mask = LVIF_PARAM;
  lvi.iItem = std::max(0, static_cast<int>(SendMessageW(ListWindow, LVM_GETNEXTITEM, static_cast<WPARAM>(-1),
                                                        LVNI_SELECTED)));
  if (!SendMessageW(ListWindow, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&lvi))) return E_INVALIDARG;
  LPCITEMIDLIST id = reinterpret_cast<LPCITEMIDLIST>(lvi.lParam);
  return ShellFolder->GetUIObjectOf(ViewWindow, 1, &id, riid, nullptr, ppv);
}

// "Marlix Digital Levels: " and the folder's plain address, in the browser's status bar.
void CMarlixDLShellView::SetStatusText() {
  if (!ShellBrowser) return;
  std::wstring text = LoadTranslatedString(IDS_ROOT_NAME) + L": ";
  wchar_t path[MAX_PATH] = {};
  if (text.size() < MAX_PATH && FolderBase) FolderBase->GetFolderPath(path, static_cast<UINT>(MAX_PATH - text.size()), false);
  text += path;
  if (text.size() >= MAX_PATH) text.resize(MAX_PATH - 1);
  int widths[1] = {-1};
  LRESULT result = 0;
  ShellBrowser->SendControlMsg(FCW_STATUS, SB_SETPARTS, 1, reinterpret_cast<LPARAM>(widths), &result);
  ShellBrowser->SendControlMsg(FCW_STATUS, SB_SETTEXTW, 0, reinterpret_cast<LPARAM>(text.c_str()), &result);
}

void CMarlixDLShellView::BroadcastChange() {
  tagPIDLTYPE type = FolderType();
  if (type != tagPIDLTYPE{}) ::BroadcastChange(type);
}

void CMarlixDLShellView::RefreshAll() {
  Refresh();
  if (!ShellBrowser) return;
  HWND browserWindow = nullptr;
  if (SUCCEEDED(ShellBrowser->GetWindow(&browserWindow)) && browserWindow)
    SendMessageW(browserWindow, WM_COMMAND, kCmdBrowserRefresh, 0);
}

// One thread at a time. A refresh while one runs is remembered, and run once it has ended:
// its result may already miss a level added or renamed meanwhile.
void CMarlixDLShellView::StartEnumeration() {
  if (EnumThreadMarker != -1) {
    RefreshPending = true;
    return;
  }
  if (!ShellFolder || !IsWindow(ViewWindow)) return;
  ReleaseEnumJob();
  // Made before the clip: with no job there is no thread to stop the clip again.
  auto* job = new (std::nothrow) EnumJob;
  if (!job) return;
  if (IsWindow(AnimateWindow)) DestroyWindow(AnimateWindow);
  AnimateWindow = CreateWindowExW(0, ANIMATE_CLASSW, nullptr, kAnimateStyle, 0, 0, 0, 0, ListWindow,
                                  reinterpret_cast<HMENU>(static_cast<INT_PTR>(kAnimateWindowId)), ModuleInstance(),
                                  nullptr);
  if (AnimateWindow)
    SendMessageW(AnimateWindow, ACM_OPENW, reinterpret_cast<WPARAM>(ModuleInstance()),
                 reinterpret_cast<LPARAM>(MAKEINTRESOURCEW(IDR_ENUM_CLIP)));
  job->ViewWindow = ViewWindow;
  job->Folder = ShellFolder;
  job->Locale = ThreadLocale;
  // The thread keeps the module loaded until it has returned out of it.
  win::UniqueLibrary module;
  GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS, reinterpret_cast<LPCWSTR>(&EnumThreadProc), module.Put());
  job->Module = module.Get();
  win::UniqueHandle thread(CreateThread(nullptr, kEnumThreadStack, EnumThreadProc, job, 0, nullptr));
  if (!thread) {
    job->Refs = 1;
    job->Release();
    if (IsWindow(AnimateWindow)) DestroyWindow(AnimateWindow);
    AnimateWindow = nullptr;
    return;
  }
  module.Release();  // the thread's to give back
  RunningJob = job;
  EnumThreadMarker = reinterpret_cast<INT_PTR>(thread.Get());
}

void CMarlixDLShellView::ReleaseEnumJob() {
  if (RunningJob) {
    RunningJob->DropResult();
    RunningJob->Release();
    RunningJob = nullptr;
  }
}
