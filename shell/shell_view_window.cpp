// The view window: its making and unmaking, its procedure and the list control in it.
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

LRESULT CALLBACK ViewWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept {
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

CMarlixDLShellView::~CMarlixDLShellView() {
  // A host that never called DestroyViewWindow must not leave a window behind that
  // would call into a freed object.
  if (IsWindow(ViewWindow)) {
    SetWindowLongPtrW(ViewWindow, GWLP_USERDATA, 0);
    DestroyWindow(ViewWindow);
  }
  ReleaseEnumJob();
  DestroyNotifyWindow(NotifyWindow);
  ReleaseMergedMenu();
}

STDMETHODIMP CMarlixDLShellView::CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings,
                                                  IShellBrowser* browser, RECT* rect, HWND* out) noexcept {
  if (!out) return E_INVALIDARG;
  *out = nullptr;
  if (!browser || !settings || !rect || !IsUsable()) return E_INVALIDARG;
  if (IsWindow(ViewWindow)) return E_UNEXPECTED;  // one window per view object
  HINSTANCE module = ModuleInstance();
  if (!RegisterModuleClass(kViewWindowClass, ViewWindowProc)) return E_FAIL;

  ShellBrowser = com::ComPtr<IShellBrowser>(browser);
  CommDlgBrowser.Reset();
  if (FAILED(browser->QueryInterface(IID_ICommDlgBrowser, CommDlgBrowser.PutVoid()))) CommDlgBrowser.Reset();
  FolderSettings = *settings;

  // A view that follows one of ours keeps its mode; one that follows a foreign view
  // takes the mode the browser stored for the folder.
  if (previous) {
    com::ComPtr<IUnknown> ours;
    if (SUCCEEDED(previous->QueryInterface(IID_IMarlixDigitalLevelsShellView, ours.PutVoid()))) {
      previous->GetCurrentInfo(&FolderSettings);
    } else {
      com::ComPtr<IStream> stream;
      if (browser->GetViewStateStream(STGM_READ, stream.Put()) == S_OK && stream) {
        UINT mode = FolderSettings.ViewMode;
        ULONG read = 0;
        if (SUCCEEDED(stream->Read(&mode, sizeof(mode), &read)) && read == sizeof(mode)) FolderSettings.ViewMode = mode;
      }
    }
  }

  browser->SetToolbarItems(nullptr, 0, FCT_MERGE);
  ParentWindow = nullptr;
  if (FAILED(browser->GetWindow(&ParentWindow))) ParentWindow = nullptr;

  HWND window = CreateWindowExW(0, kViewWindowClass, nullptr, WS_CHILD | WS_VISIBLE | WS_CLIPSIBLINGS, rect->left,
                                rect->top, rect->right - rect->left, rect->bottom - rect->top, ParentWindow, nullptr,
                                module, static_cast<IShellView*>(this));
  if (!window) {
    ViewWindow = nullptr;
    return E_FAIL;
  }
  *out = window;
  Accelerators = LoadAcceleratorsW(module, MAKEINTRESOURCEW(IDR_VIEW_ACCELERATORS));
  NotifyWindow.ViewWindow = ViewWindow;
  if (!IsWindow(NotifyWindow.Hidden)) CreateNotifyWindow(NotifyWindow, ViewWindow);
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::DestroyViewWindow() noexcept {
  com::ComPtr<CMarlixDLShellView> keep(this);  // the window's going may drop the last other reference
  UIActivate(SVUIA_DEACTIVATE);
  ReleaseMergedMenu();
  if (IsWindow(ViewWindow)) DestroyWindow(ViewWindow);
  ShellBrowser.Reset();
  CommDlgBrowser.Reset();
  return S_OK;
}

LRESULT CMarlixDLShellView::HandleMessage(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  if (message == GetEnumIDListMessage) {
    FillList();
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
      OnBeginDrag();
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
    if (SUCCEEDED(ShellFolder->GetDisplayNameOf(id, SHGDN_INFOLDER, &name)) && name.uType == STRRET_WSTR) {
      win::UniqueCoMem<wchar_t> text(name.pOleStr);
      if (text) lstrcpynW(item.pszText, text.Get(), item.cchTextMax);
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
    target->SetTarget(ListWindow, this, FolderIdList.Get());
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
  if (win::UniqueLibrary shell(LoadLibraryW(L"shell32.dll")); shell) {
    using GetSettings = void(WINAPI*)(SHELLFLAGSTATE*, DWORD);
    if (auto get = reinterpret_cast<GetSettings>(reinterpret_cast<void*>(GetProcAddress(shell.Get(), "SHGetSettings"))))
      get(&flags.state, SSF_DOUBLECLICKINWEBVIEW | SSF_WIN95CLASSIC);
  }
  DWORD extended = (!flags.state.fWin95Classic && !flags.state.fDoubleClickInWebView)
                       ? LVS_EX_TRACKSELECT | LVS_EX_ONECLICKACTIVATE | LVS_EX_UNDERLINEHOT
                       : 0;
  SendMessageW(ListWindow, LVM_SETEXTENDEDLISTVIEWSTYLE, 0, extended);
}

// The thread's result arrives: rows for every item, below the add row in the root.
void CMarlixDLShellView::FillList() {
  EnumThreadMarker = -1;
  if (IsWindow(AnimateWindow)) DestroyWindow(AnimateWindow);
  AnimateWindow = nullptr;
  // The job's slot, not the message, says what is ours to take: whoever takes it releases it.
  auto list = com::ComPtr<IEnumIDList>::Attach(RunningJob ? RunningJob->Result.exchange(nullptr) : nullptr);
  ReleaseEnumJob();
  if (RefreshPending) {
    // The list is empty since the refresh; a result older than it is not shown.
    RefreshPending = false;
    list.Reset();
    Refresh();
    return;
  }
  if (!list || !IsWindow(ListWindow) || !PidlMgr) return;
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
  UniqueIdList id;
  ULONG fetched = 0;
  while (list->Next(1, id.Put(), &fetched) == S_OK && fetched) {
    // A row owns its copy until LVN_DELETEITEM.
    UniqueIdList row(PidlMgr->Copy(id.Get()));
    item.iItem = static_cast<int>(SendMessageW(ListWindow, LVM_GETITEMCOUNT, 0, 0));
    item.pszText = LPSTR_TEXTCALLBACKW;
    item.iImage = I_IMAGECALLBACK;
    item.lParam = reinterpret_cast<LPARAM>(row.Get());
    if (row && SendMessageW(ListWindow, LVM_INSERTITEMW, 0, reinterpret_cast<LPARAM>(&item)) != -1) row.Release();
  }
  SortRows(false);

  SendMessageW(ListWindow, WM_SETREDRAW, TRUE, 0);
  InvalidateRect(ListWindow, nullptr, TRUE);
  UpdateWindow(ListWindow);
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
                                                 DWORD_PTR self) noexcept {
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

// Made from outside, a view has no folder until one calls Init: it shows an empty list.
HRESULT CreateMarlixDLShellView(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLShellView>(riid, ppv); }
