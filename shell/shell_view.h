// The folder's view: a TSViewNSClass window in the browser with one list control,
// filled from a worker thread. Spread over files by concern, each calling only the ones
// listed before it, so that the files never call each other in a circle:
//   shell_view_list.cpp      the list control: modes, column, sorting, rows and the selection
//   shell_view.cpp           the view's own answers, refreshing and the enumeration thread
//   shell_view_menus.cpp     activation, the merged menus and the context menu
//   shell_view_items.cpp     operations on items: new, properties, delete, copy, paste, drag
//   shell_view_commands.cpp  the command dispatcher, the command target and opening items
//   shell_view_window.cpp    creation and destruction of the window, and its procedure
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <docobj.h>
#include <shlobj.h>

#include <algorithm>
#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include "base/class_ids.h"
#include "base/com_base.h"
#include "base/win_handles.h"
#include "shell/view_notify.h"
#include "store/pidl_manager.h"

class CGravonShellFolderBase;
class CMarlixDLDataObject;

constexpr wchar_t kViewWindowClass[] = L"TSViewNSClass";

// Child ids and command ids of the view.
enum : UINT {
  kListWindowId = 2000,
  kAnimateWindowId = 1300,
  kCmdRefresh = 22,
  kCmdNewLevel = 1280,
  kCmdCopy = 1281,
  kCmdPaste = 1282,
  kCmdLargeIcons = 1283,
  kCmdSmallIcons = 1284,
  kCmdList = 1285,
  kCmdDetails = 1286,
  kCmdProperties = 1287,
  kCmdDelete = 1288,
  kCmdActivate = 1289,
  kCmdBrowserRefresh = 0xA220,  // the browser's own refresh, sent to its window
};

// Process-wide sort state of all views: the last clicked column from 1, and +1 or -1.
extern int SortColumn;
extern int SortDirection;

// The window style of the list in a view mode (1 to 4); 0 for any other mode.
DWORD ListStyleOfMode(UINT mode) noexcept;

// The list control after subclassing. Asks for every key, and lets menu and
// accelerator commands die here instead of reaching the view twice.
class CShellViewListWindow {
 public:
  CShellViewListWindow() = default;
  CShellViewListWindow(const CShellViewListWindow&) = delete;
  CShellViewListWindow& operator=(const CShellViewListWindow&) = delete;
  ~CShellViewListWindow() { Detach(); }

  bool Subclass(HWND list);
  void Detach();
  HWND Window() const noexcept { return window_; }

 private:
  static LRESULT CALLBACK Procedure(HWND window, UINT message, WPARAM wParam, LPARAM lParam, UINT_PTR id,
                                    DWORD_PTR self) noexcept;
  static LRESULT Handle(HWND window, UINT message, WPARAM wParam, LPARAM lParam, DWORD_PTR self);
  HWND window_ = nullptr;
};

// What one enumeration thread owns: its own copies of what it touches, and the slot
// through which the finished enumerator passes to whichever side takes it first
// (the view's fill, or the view's window going away).
struct EnumJob {
  HWND ViewWindow = nullptr;
  com::ComPtr<IShellFolder> Folder;
  LCID Locale = 0;
  HMODULE Module = nullptr;  // a load reference the thread gives back as it ends
  std::atomic<IEnumIDList*> Result{nullptr};
  std::atomic<long> Refs{2};  // the thread's and the view's

  // Releases whatever the slot still holds.
  void DropResult() noexcept;
  void Release() noexcept;
};

class CMarlixDLShellView
    : public com::ComObject<IShellView, IOleCommandTarget, IMarlixDigitalLevelsShellView> {
 public:
  CMarlixDLShellView();
  ~CMarlixDLShellView() override;

  // False if the constructor could not get its allocator or list manager.
  bool IsUsable() const noexcept { return Malloc && PidlMgr; }
  // Called by the folder right after construction.
  HRESULT Init(IShellFolder* folder, LPCITEMIDLIST folderIdList);

  // IOleWindow
  STDMETHODIMP GetWindow(HWND* window) noexcept override;
  STDMETHODIMP ContextSensitiveHelp(BOOL enter) noexcept override;
  // IShellView
  STDMETHODIMP TranslateAccelerator(MSG* msg) noexcept override;
  STDMETHODIMP EnableModeless(BOOL enable) noexcept override;
  STDMETHODIMP UIActivate(UINT state) noexcept override;
  STDMETHODIMP Refresh() noexcept override;
  STDMETHODIMP CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings, IShellBrowser* browser,
                                RECT* rect, HWND* out) noexcept override;
  STDMETHODIMP DestroyViewWindow() noexcept override;
  STDMETHODIMP GetCurrentInfo(LPFOLDERSETTINGS settings) noexcept override;
  STDMETHODIMP AddPropertySheetPages(DWORD reserved, LPFNSVADDPROPSHEETPAGE add, LPARAM lParam) noexcept override;
  STDMETHODIMP SaveViewState() noexcept override;
  STDMETHODIMP SelectItem(PCUITEMID_CHILD item, UINT flags) noexcept override;
  STDMETHODIMP GetItemObject(UINT item, REFIID riid, void** ppv) noexcept override;
  // IOleCommandTarget
  STDMETHODIMP QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT* text) noexcept override;
  STDMETHODIMP Exec(const GUID* group, DWORD id, DWORD options, VARIANT* in, VARIANT* out) noexcept override;

  // The one dispatcher of the view's commands, whatever their source. Always 0.
  LRESULT OnCommand(UINT id);
  // Tells the views of every process that levels changed.
  void BroadcastChange();
  // Reloads this view, then asks the browser to reload what it shows.
  void RefreshAll();

 private:
  friend LRESULT CALLBACK ViewWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept;

  // The list (shell_view_list.cpp)
  // Whether the folder's list has a last id, and that id's type (0 without one).
  bool HasFolderId();
  tagPIDLTYPE FolderType();
  // Empties the list and gives it the column and pictures of the current mode.
  bool InitListColumns();
  // Gives the list the pictures of the current mode.
  void ShowModeImages();
  // Sorts the rows, by the folder's default order or by the process-wide sort state.
  void SortRows(bool bySortColumn);
  void StoreColumnWidths();
  // Rows of the selection, in order.
  std::vector<int> SelectedRows();
  // A row's item id (null for the add row or a row that is gone).
  LPCITEMIDLIST RowId(int row);
  // The view (shell_view.cpp)
  void StartEnumeration();
  void ReleaseEnumJob();
  void SetStatusText();
  // Menus (shell_view_menus.cpp). `merged` places entries in the browser's menus;
  // otherwise each goes at the end of a popup of our own.
  void ActivateUI(UINT state);
  void DeactivateUI();
  void ReleaseMergedMenu();
  void BuildMenus();
  void RefreshMenuStates(HMENU popup);
  UINT EntryState(UINT id);
  bool CursorOverLevel();
  void OnContextMenu(int x, int y);
  void FillFileMenu(HMENU menu, bool merged);
  void FillViewMenu(HMENU menu, bool merged);
  void FillEditMenu(HMENU menu, bool merged);
  // Items (shell_view_items.cpp)
  void OnNewLevel();
  void OnProperties();
  void OnDelete();
  void OnCopy();
  void OnPaste();
  void OnBeginDrag();
  // Adds the full list of every selected row to `data`; the last row handled, or -1.
  int AddSelection(CMarlixDLDataObject* data);
  // Commands (shell_view_commands.cpp)
  void SetViewMode(UINT mode);
  void SortByColumn(int column);
  void OnActivateItem();
  // The window (shell_view_window.cpp)
  LRESULT HandleMessage(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
  LRESULT OnNotify(NMHDR* header);
  void OnViewWindowActive();
  bool CreateListWindow();
  void ApplyShellSettings();
  void FillList();
  void OnGetDispInfo(NMLVDISPINFOW* info);

  UINT UIState = 0;
  UniqueIdList FolderIdList;
  FOLDERSETTINGS FolderSettings{FVM_DETAILS, 0};
  com::ComPtr<IShellBrowser> ShellBrowser;
  com::ComPtr<ICommDlgBrowser> CommDlgBrowser;
  HWND ParentWindow = nullptr;
  HWND ViewWindow = nullptr;
  HWND ListWindow = nullptr;
  HWND AnimateWindow = nullptr;
  win::UniqueMenu MergedMenu;
  com::ComPtr<IShellFolder> ShellFolder;
  CGravonShellFolderBase* FolderBase = nullptr;  // the same object, when it is ours
  com::ComPtr<IMalloc> Malloc;
  std::unique_ptr<CPidlMgr> PidlMgr;
  win::UniqueImageList DragImage;
  POINT DragImagePos{};
  INT_PTR EnumThreadMarker = -1;
  bool RefreshPending = false;  // a refresh came while an enumeration ran
  std::wstring AddNewText;
  NotifyWindowPair NotifyWindow;
  HACCEL Accelerators = nullptr;
  CShellViewListWindow ListControl;
  LCID ThreadLocale = 0;
  EnumJob* RunningJob = nullptr;  // the enumeration in flight, shared with its thread
};

// The class object's creator: a view with no folder, which opens on an empty list.
HRESULT CreateMarlixDLShellView(REFIID riid, void** ppv) noexcept;
