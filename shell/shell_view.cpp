// The view's COM surface, its creation and its destruction.
#include "shell/shell_view.h"

#include <new>

#include "base/boundary.h"
#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "server/class_creators.h"
#include "shell/shell_folder_base.h"
#include "store/string_table.h"

LRESULT CALLBACK ViewWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);

CMarlixDLShellView::CMarlixDLShellView() {
  InitCommonControls();
  if (FAILED(SHGetMalloc(&Malloc))) Malloc = nullptr;
  PidlMgr.reset(new (std::nothrow) CPidlMgr);
  AddNewText = LoadTranslatedString(IDS_ADD_NEW_LEVEL);
}

CMarlixDLShellView::~CMarlixDLShellView() {
  // A host that never called DestroyViewWindow must not leave a window behind that
  // would call into a freed object.
  if (IsWindow(ViewWindow)) {
    SetWindowLongPtrW(ViewWindow, GWLP_USERDATA, 0);
    DestroyWindow(ViewWindow);
  }
  ReleaseEnumJob();
  if (PidlMgr) PidlMgr->Free(FolderIdList);
  ShellFolder.Reset();
  if (Malloc) Malloc->Release();
  DestroyNotifyWindow(NotifyWindow);
  ReleaseMergedMenu();
  if (DragImage) ImageList_Destroy(DragImage);
  CommDlgBrowser.Reset();
  ShellBrowser.Reset();
}

HRESULT CMarlixDLShellView::Init(IShellFolder* folder, LPCITEMIDLIST folderIdList) {
  if (!IsUsable()) return E_OUTOFMEMORY;
  ShellFolder = com::ComPtr<IShellFolder>(folder);
  FolderBase = dynamic_cast<CGravonShellFolderBase*>(folder);
  if (!PidlMgr->Assign(FolderIdList, folderIdList)) return E_OUTOFMEMORY;
  UIState = 0;
  ThreadLocale = GetThreadLocale();
  return S_OK;
}

tagPIDLTYPE CMarlixDLShellView::FolderType() {
  LPCITEMIDLIST last = PidlMgr ? PidlMgr->GetLast(FolderIdList) : nullptr;
  return last ? CPidlMgr::GetType(last) : tagPIDLTYPE{};
}

STDMETHODIMP CMarlixDLShellView::GetWindow(HWND* window) {
  if (!window) return E_INVALIDARG;
  *window = ViewWindow;
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::ContextSensitiveHelp(BOOL) { return E_NOTIMPL; }

// The browser is always told S_FALSE, so it may also see a key that matched. Hosts hand over
// every message of their loop: a key typed in the address bar or an Open dialog's file-name
// box is theirs, and a Delete there must not delete the selected level.
STDMETHODIMP CMarlixDLShellView::TranslateAccelerator(MSG* msg) {
  if (msg && Accelerators && IsWindow(ViewWindow) && (msg->hwnd == ViewWindow || IsChild(ViewWindow, msg->hwnd)))
    ::TranslateAcceleratorW(ViewWindow, Accelerators, msg);
  return S_FALSE;
}

STDMETHODIMP CMarlixDLShellView::EnableModeless(BOOL) { return E_NOTIMPL; }

STDMETHODIMP CMarlixDLShellView::UIActivate(UINT state) {
  return boundary::Call([&] {
    if (state == UIState) return S_OK;
    ActivateUI(state);
    if (state != SVUIA_DEACTIVATE) SetStatusText();
    return S_OK;
  });
}

STDMETHODIMP CMarlixDLShellView::Refresh() {
  if (IsWindow(ListWindow)) SendMessageW(ListWindow, LVM_DELETEALLITEMS, 0, 0);
  StartEnumeration();
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings,
                                                  IShellBrowser* browser, RECT* rect, HWND* out) {
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

STDMETHODIMP CMarlixDLShellView::DestroyViewWindow() {
  com::ComPtr<CMarlixDLShellView> keep(this);  // the window's going may drop the last other reference
  UIActivate(SVUIA_DEACTIVATE);
  ReleaseMergedMenu();
  if (IsWindow(ViewWindow)) DestroyWindow(ViewWindow);
  ShellBrowser.Reset();
  CommDlgBrowser.Reset();
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::GetCurrentInfo(LPFOLDERSETTINGS settings) {
  if (!settings) return E_INVALIDARG;
  *settings = FolderSettings;
  return S_OK;
}

STDMETHODIMP CMarlixDLShellView::AddPropertySheetPages(DWORD, LPFNSVADDPROPSHEETPAGE, LPARAM) { return E_NOTIMPL; }

// Only the mode is kept; column widths and the sort order are not part of it.
STDMETHODIMP CMarlixDLShellView::SaveViewState() {
  if (!ShellBrowser) return E_UNEXPECTED;
  com::ComPtr<IStream> stream;
  HRESULT hr = ShellBrowser->GetViewStateStream(STGM_WRITE, stream.Put());
  if (hr != S_OK) return FAILED(hr) ? hr : E_FAIL;
  if (!stream) return E_FAIL;
  UINT mode = FolderSettings.ViewMode;
  return stream->Write(&mode, sizeof(mode), nullptr);
}

STDMETHODIMP CMarlixDLShellView::SelectItem(PCUITEMID_CHILD, UINT) { return E_NOTIMPL; }

// The object of the first selected row, or of row 0 when nothing is selected.
STDMETHODIMP CMarlixDLShellView::GetItemObject(UINT item, REFIID riid, void** ppv) {
  if (!ppv) return E_INVALIDARG;
  *ppv = nullptr;
  if (item != SVGIO_SELECTION) return E_NOINTERFACE;
  if (!ShellFolder) return E_UNEXPECTED;
  int count = IsWindow(ListWindow) ? static_cast<int>(SendMessageW(ListWindow, LVM_GETITEMCOUNT, 0, 0)) : 0;
  int row = 0;
  for (int i = 0; i < count; ++i) {
    if (SendMessageW(ListWindow, LVM_GETITEMSTATE, i, LVIS_SELECTED) & LVIS_SELECTED) {
      row = i;
      break;
    }
  }
  LVITEMW lvi{};
  lvi.mask = LVIF_PARAM;
  lvi.iItem = row;
  if (!IsWindow(ListWindow) || !SendMessageW(ListWindow, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&lvi)))
    return E_INVALIDARG;
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

// Made from outside, a view has no folder until one calls Init: it shows an empty list.
HRESULT CreateMarlixDLShellView(REFIID riid, void** ppv) { return com::CreateInstance<CMarlixDLShellView>(riid, ppv); }
