// The view window: its procedure, the list control, and the enumeration that fills it
// from a worker thread.
#include "shell/shell_view.h"

#include <ole2.h>
#include <windowsx.h>

#include "base/boundary.h"
#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "base/window_messages.h"
#include "shell/item_services.h"
#include "shell/shell_uuids.h"
#include "transfer/drop_target.h"

namespace {

constexpr DWORD kAnimateStyle = WS_CHILD | WS_VISIBLE | ACS_CENTER | ACS_TRANSPARENT | ACS_AUTOPLAY;
constexpr DWORD kEnumThreadStack = 0x100000;

// Off the window's thread: asks the folder for its items and posts them to the view.
// Touches nothing but its job, and keeps the module mapped until it has left it.
DWORD WINAPI EnumThreadProc(void* parameter) {
  auto* job = static_cast<EnumJob*>(parameter);
  SetThreadLocale(job->Locale);
  IEnumIDList* list = nullptr;
  if (FAILED(job->Folder->EnumObjects(job->ViewWindow, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &list))) list = nullptr;
  job->Result.store(list);
  if (!IsWindow(job->ViewWindow) ||
      !PostMessageW(job->ViewWindow, GetEnumIDListMessage, 0, reinterpret_cast<LPARAM>(list)))
    job->DropResult();
  job->Folder->Release();
  job->Folder = nullptr;
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
    if (Folder) Folder->Release();
    delete this;
  }
}

LRESULT CALLBACK ViewWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  if (message == WM_NCCREATE) {
    auto* create = reinterpret_cast<CREATESTRUCTW*>(lParam);
    auto* view = static_cast<CMarlixDLShellView*>(static_cast<IShellView*>(create->lpCreateParams));
    SetWindowLongPtrW(window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(view));
    if (view) view->ViewWindow = window;
    return DefWindowProcW(window, message, wParam, lParam);
  }
  auto* view = reinterpret_cast<CMarlixDLShellView*>(GetWindowLongPtrW(window, GWLP_USERDATA));
  if (!view) return DefWindowProcW(window, message, wParam, lParam);
  // A message may end in the browser letting go of the view (browsing away).
  com::ComPtr<CMarlixDLShellView> keep(view);
  return boundary::CallWindow(window, message, wParam, lParam,
                              [&] { return view->HandleMessage(window, message, wParam, lParam); });
}

LRESULT CMarlixDLShellView::HandleMessage(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  if (message == GetEnumIDListMessage) {
    FillList(reinterpret_cast<IEnumIDList*>(lParam));
    return 0;
  }
  if (message == GlobalNotifyMessage) {
    if (wParam == 1 && FolderType() != tagPIDLTYPE{} && static_cast<UINT>(lParam) == FolderType()) RefreshAll();
    return 0;
  }
  switch (message) {
    case WM_CREATE:
      // A failure leaves an empty window, not an error.
      if (CreateListWindow() && InitListColumns()) StartEnumeration();
      return 0;
    case WM_DESTROY:
      ListControl.Detach();
      if (IsWindow(ListWindow)) RevokeDragDrop(ListWindow);
      // No fill can come any more: whatever the thread hands over is released by it or here,
      // and a window made again for this view enumerates afresh.
      ReleaseEnumJob();
      EnumThreadMarker = -1;
      RefreshPending = false;
      break;
    case WM_NCDESTROY:
      SetWindowLongPtrW(window, GWLP_USERDATA, 0);
      ViewWindow = ListWindow = AnimateWindow = nullptr;
      break;
    case WM_SIZE:
      if (IsWindow(ListWindow)) MoveWindow(ListWindow, 0, 0, LOWORD(lParam), HIWORD(lParam), TRUE);
      if (IsWindow(AnimateWindow)) MoveWindow(AnimateWindow, 0, 0, LOWORD(lParam), HIWORD(lParam), TRUE);
      return 0;
    case WM_ACTIVATE:
      ActivateUI(SVUIA_ACTIVATE_FOCUS);
      return 0;
    case WM_SETFOCUS:
      OnViewWindowActive();
      return 0;
    case WM_KILLFOCUS:
      ActivateUI(SVUIA_ACTIVATE_NOFOCUS);
      return 0;
    case WM_SETTINGCHANGE:
      ApplyShellSettings();
      return 0;
    case WM_NOTIFY:
      return OnNotify(reinterpret_cast<NMHDR*>(lParam));
    case WM_CONTEXTMENU:
      OnContextMenu(GET_X_LPARAM(lParam), GET_Y_LPARAM(lParam));
      return 0;
    case WM_COMMAND:
      return OnCommand(LOWORD(wParam));
    case WM_INITMENUPOPUP:
      RefreshMenuStates(reinterpret_cast<HMENU>(wParam));
      return 0;
  }
  return DefWindowProcW(window, message, wParam, lParam);
}

void CMarlixDLShellView::OnViewWindowActive() {
  if (ShellBrowser) ShellBrowser->OnViewWindowActive(this);
  ActivateUI(SVUIA_ACTIVATE_FOCUS);
}

LRESULT CMarlixDLShellView::OnNotify(NMHDR* header) {
  if (!header) return 0;
  switch (header->code) {
    case LVN_GETDISPINFOW:
      OnGetDispInfo(reinterpret_cast<NMLVDISPINFOW*>(header));
      break;
    case LVN_COLUMNCLICK:
      SortByColumn(reinterpret_cast<NMLISTVIEW*>(header)->iSubItem);
      break;
    case LVN_DELETEITEM:
      if (PidlMgr) PidlMgr->Free(reinterpret_cast<LPCITEMIDLIST>(reinterpret_cast<NMLISTVIEW*>(header)->lParam));
      break;
    case LVN_ITEMCHANGED:
      if (CommDlgBrowser) CommDlgBrowser->OnStateChange(this, CDBOSC_SELCHANGE);
      break;
    case LVN_ITEMACTIVATE:
      OnActivateItem();
      break;
    case LVN_BEGINDRAG:
      OnBeginDrag(reinterpret_cast<NMLISTVIEW*>(header));
      break;
    case HDN_ENDTRACKW:
      StoreColumnWidths();
      break;
    case NM_SETFOCUS:
      OnViewWindowActive();
      break;
    case NM_KILLFOCUS:
      DeactivateUI();
      break;
  }
  return 0;
}

// Text and picture of a row, asked for by the list as the row comes into sight.
void CMarlixDLShellView::OnGetDispInfo(NMLVDISPINFOW* info) {
  LVITEMW& item = info->item;
  auto id = reinterpret_cast<LPCITEMIDLIST>(item.lParam);
  if (item.iSubItem != 0) {
    if ((item.mask & LVIF_TEXT) && item.pszText && item.cchTextMax > 0) item.pszText[0] = 0;
    return;
  }
  if (!ShellFolder || !id) return;
  if ((item.mask & LVIF_TEXT) && item.pszText && item.cchTextMax > 0) {
    STRRET name{};
    if (SUCCEEDED(ShellFolder->GetDisplayNameOf(id, SHGDN_INFOLDER, &name)) && name.uType == STRRET_WSTR &&
        name.pOleStr) {
      lstrcpynW(item.pszText, name.pOleStr, item.cchTextMax);
      Malloc->Free(name.pOleStr);
    }
  }
  if (item.mask & LVIF_IMAGE) {
    com::ComPtr<IExtractIconW> extract;
    if (SUCCEEDED(ShellFolder->GetUIObjectOf(ViewWindow, 1, &id, IID_IExtractIconW, nullptr, extract.PutVoid())) &&
        extract) {
      UINT flags = 0;
      extract->GetIconLocation(GIL_FORSHELL, nullptr, 0, &item.iImage, &flags);
    }
  }
}

bool CMarlixDLShellView::CreateListWindow() {
  DWORD style = ListStyleOfMode(FolderSettings.ViewMode);
  if (!style) {
    FolderSettings.ViewMode = FVM_ICON;
    style = ListStyleOfMode(FVM_ICON);
  }
  ListWindow = CreateWindowExW(WS_EX_CLIENTEDGE, WC_LISTVIEWW, nullptr, style, 0, 0, 0, 0, ViewWindow,
                               reinterpret_cast<HMENU>(static_cast<INT_PTR>(kListWindowId)), ModuleInstance(), nullptr);
  if (!ListWindow) return false;
  ApplyShellSettings();
  ListControl.Subclass(ListWindow);
  // The target holds the view until RevokeDragDrop lets it go in WM_DESTROY.
  if (auto target = com::Make<CMarlixDLDropTargetOnListView>()) {
    target->SetTarget(ListWindow, this, FolderIdList);
    RegisterDragDrop(ListWindow, target.Get());
  }
  return true;
}

// The user's single-click setting, read again at each settings change; no other
// extended style is ever set.
void CMarlixDLShellView::ApplyShellSettings() {
  if (!IsWindow(ListWindow)) return;
  union {
    SHELLFLAGSTATE state;
    DWORD word;
  } flags{};
  flags.word = 0x80;  // classic until the shell says otherwise
  if (HMODULE shell = LoadLibraryW(L"shell32.dll")) {
    using GetSettings = void(WINAPI*)(SHELLFLAGSTATE*, DWORD);
    if (auto get = reinterpret_cast<GetSettings>(reinterpret_cast<void*>(GetProcAddress(shell, "SHGetSettings"))))
      get(&flags.state, SSF_DOUBLECLICKINWEBVIEW | SSF_WIN95CLASSIC);
    FreeLibrary(shell);
  }
  DWORD extended = (!flags.state.fWin95Classic && !flags.state.fDoubleClickInWebView)
                       ? LVS_EX_TRACKSELECT | LVS_EX_ONECLICKACTIVATE | LVS_EX_UNDERLINEHOT
                       : 0;
  SendMessageW(ListWindow, LVM_SETEXTENDEDLISTVIEWSTYLE, 0, extended);
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
  job->Folder = ShellFolder.Get();
  job->Folder->AddRef();
  job->Locale = ThreadLocale;
  // The thread keeps the module loaded until it has returned out of it.
  if (!GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS, reinterpret_cast<LPCWSTR>(&EnumThreadProc),
                          &job->Module))
    job->Module = nullptr;
  HANDLE thread = CreateThread(nullptr, kEnumThreadStack, EnumThreadProc, job, 0, nullptr);
  if (!thread) {
    if (job->Module) FreeLibrary(job->Module);
    job->Refs = 1;
    job->Release();
    if (IsWindow(AnimateWindow)) DestroyWindow(AnimateWindow);
    AnimateWindow = nullptr;
    return;
  }
  RunningJob = job;
  EnumThreadMarker = reinterpret_cast<INT_PTR>(thread);
  CloseHandle(thread);
}

void CMarlixDLShellView::ReleaseEnumJob() {
  if (RunningJob) {
    RunningJob->DropResult();
    RunningJob->Release();
    RunningJob = nullptr;
  }
}

// The thread's result arrives: rows for every item, below the add row in the root.
void CMarlixDLShellView::FillList(IEnumIDList*) {
  EnumThreadMarker = -1;
  if (IsWindow(AnimateWindow)) DestroyWindow(AnimateWindow);
  AnimateWindow = nullptr;
  // The job's slot, not the message, says what is ours to take: whoever takes it releases it.
  IEnumIDList* list = RunningJob ? RunningJob->Result.exchange(nullptr) : nullptr;
  ReleaseEnumJob();
  if (RefreshPending) {
    // The list is empty since the refresh; a result older than it is not shown.
    RefreshPending = false;
    if (list) list->Release();
    Refresh();
    return;
  }
  if (!list) return;
  if (!IsWindow(ListWindow) || !PidlMgr) {
    list->Release();
    return;
  }
  HCURSOR oldCursor = SetCursor(LoadCursorW(nullptr, IDC_WAIT));
  SendMessageW(ListWindow, WM_SETREDRAW, FALSE, 0);

  LVITEMW item{};
  item.mask = LVIF_TEXT | LVIF_IMAGE | LVIF_PARAM;
  if (FolderType() == PIDL_ROOT) {
    item.iItem = 0;
    item.pszText = AddNewText.data();
    item.iImage = IMAGE_ADD_LEVEL;
    item.lParam = 0;
    SendMessageW(ListWindow, LVM_INSERTITEMW, 0, reinterpret_cast<LPARAM>(&item));
  }
  LPITEMIDLIST id = nullptr;
  ULONG fetched = 0;
  while (list->Next(1, &id, &fetched) == S_OK && fetched) {
    item.iItem = static_cast<int>(SendMessageW(ListWindow, LVM_GETITEMCOUNT, 0, 0));
    item.pszText = LPSTR_TEXTCALLBACKW;
    item.iImage = I_IMAGECALLBACK;
    item.lParam = reinterpret_cast<LPARAM>(PidlMgr->Copy(id));
    if (item.lParam && SendMessageW(ListWindow, LVM_INSERTITEMW, 0, reinterpret_cast<LPARAM>(&item)) == -1)
      PidlMgr->Free(reinterpret_cast<LPCITEMIDLIST>(item.lParam));
    PidlMgr->Free(id);
    id = nullptr;
  }
  SortRows(false);

  SendMessageW(ListWindow, WM_SETREDRAW, TRUE, 0);
  InvalidateRect(ListWindow, nullptr, TRUE);
  UpdateWindow(ListWindow);
  list->Release();
  SetCursor(oldCursor);
}

bool CShellViewListWindow::Subclass(HWND list) {
  Detach();
  if (!SetWindowSubclass(list, Procedure, 0, reinterpret_cast<DWORD_PTR>(this))) return false;
  window_ = list;
  return true;
}

void CShellViewListWindow::Detach() {
  if (window_ && IsWindow(window_)) RemoveWindowSubclass(window_, Procedure, 0);
  window_ = nullptr;
}

LRESULT CALLBACK CShellViewListWindow::Procedure(HWND window, UINT message, WPARAM wParam, LPARAM lParam, UINT_PTR,
                                                 DWORD_PTR self) {
  return boundary::CallWindow(window, message, wParam, lParam, [&] { return Handle(window, message, wParam, lParam, self); });
}

LRESULT CShellViewListWindow::Handle(HWND window, UINT message, WPARAM wParam, LPARAM lParam, DWORD_PTR self) {
  switch (message) {
    case WM_GETDLGCODE:
      return DefSubclassProc(window, message, wParam, lParam) | DLGC_WANTALLKEYS;
    case WM_COMMAND:
      // Commands from menus and accelerators (no control window) end here.
      if (!lParam || !IsWindow(reinterpret_cast<HWND>(lParam))) return 0;
      break;
    case WM_NCDESTROY:
      RemoveWindowSubclass(window, Procedure, 0);
      reinterpret_cast<CShellViewListWindow*>(self)->window_ = nullptr;
      break;
  }
  return DefSubclassProc(window, message, wParam, lParam);
}
