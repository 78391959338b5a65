// The folder's view: a TSViewNSClass window in the browser with one list control,
// filled from a worker thread. Spread over files by concern:
//   shell_view.cpp           COM surface, creation and destruction
//   shell_view_window.cpp    window procedure, list, fill and the enumeration thread
//   shell_view_modes.cpp     view modes, columns and sorting
//   shell_view_commands.cpp  the command dispatcher, command target and activation
//   shell_view_menus.cpp     merged menus and the context menu
//   shell_view_items.cpp     operations on items: new, properties, delete, copy, paste, drag
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <docobj.h>
#include <shlobj.h>

#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include "server/class_ids.h"
#include "server/com_base.h"
#include "shell/view_notify.h"
#include "store/pidl_manager.h"

class CGravonShellFolderBase;

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
                                    DWORD_PTR self);
  static LRESULT Handle(HWND window, UINT message, WPARAM wParam, LPARAM lParam, DWORD_PTR self);
  HWND window_ = nullptr;
};

// What one enumeration thread owns: its own copies of what it touches, and the slot
// through which the finished enumerator passes to whichever side takes it first
// (the view's fill, or the view's window going away).
struct EnumJob {
  HWND ViewWindow = nullptr;
  IShellFolder* Folder = nullptr;  // counted
  LCID Locale = 0;
  HMODULE Module = nullptr;        // a load reference the thread gives back as it ends
  std::atomic<IEnumIDList*> Result{nullptr};
  std::atomic<long> Refs{2};       // the thread's and the view's

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
  bool IsUsable() const noexcept { return Malloc != nullptr && PidlMgr != nullptr; }
  // Called by the folder right after construction.
  HRESULT Init(IShellFolder* folder, LPCITEMIDLIST folderIdList);

  // IOleWindow
  STDMETHODIMP GetWindow(HWND* window) override;
  STDMETHODIMP ContextSensitiveHelp(BOOL enter) override;
  // IShellView
  STDMETHODIMP TranslateAccelerator(MSG* msg) override;
  STDMETHODIMP EnableModeless(BOOL enable) override;
  STDMETHODIMP UIActivate(UINT state) override;
  STDMETHODIMP Refresh() override;
  STDMETHODIMP CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings, IShellBrowser* browser,
                                RECT* rect, HWND* out) override;
  STDMETHODIMP DestroyViewWindow() override;
  STDMETHODIMP GetCurrentInfo(LPFOLDERSETTINGS settings) override;
  STDMETHODIMP AddPropertySheetPages(DWORD reserved, LPFNSVADDPROPSHEETPAGE add, LPARAM lParam) override;
  STDMETHODIMP SaveViewState() override;
  STDMETHODIMP SelectItem(PCUITEMID_CHILD item, UINT flags) override;
  STDMETHODIMP GetItemObject(UINT item, REFIID riid, void** ppv) override;
  // IOleCommandTarget
  STDMETHODIMP QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT* text) override;
  STDMETHODIMP Exec(const GUID* group, DWORD id, DWORD options, VARIANT* in, VARIANT* out) override;

  // The one dispatcher of the view's commands, whatever their source. Always 0.
  LRESULT OnCommand(UINT id);
  // Tells the views of every process that levels changed.
  void BroadcastChange();
  // Reloads this view, then asks the browser to reload what it shows.
  void RefreshAll();

 private:
  friend LRESULT CALLBACK ViewWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);

  // Window (shell_view_window.cpp)
  LRESULT HandleMessage(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
  LRESULT OnNotify(NMHDR* header);
  void OnViewWindowActive();
  bool CreateListWindow();
  void ApplyShellSettings();
  void StartEnumeration();
  void FillList(IEnumIDList* list);
  void OnGetDispInfo(NMLVDISPINFOW* info);
  void ReleaseEnumJob();
  void SetStatusText();
  // Modes (shell_view_modes.cpp)
  bool InitListColumns();
  void SetViewMode(UINT mode);
  void SortByColumn(int column);
  // Sorts the rows, by the folder's default order or by the process-wide sort state.
  void SortRows(bool bySortColumn);
  void StoreColumnWidths();
  // Commands (shell_view_commands.cpp)
  void ActivateUI(UINT state);
  void DeactivateUI();
  void OnActivateItem();
  void ReleaseMergedMenu();
  // Menus (shell_view_menus.cpp). `merged` places entries in the browser's menus;
  // otherwise each goes at the end of a popup of our own.
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
  void OnBeginDrag(NMLISTVIEW* info);
  // Rows of the selection, in order.
  std::vector<int> SelectedRows();
  // A row's item id (null for the add row or a row that is gone).
  LPCITEMIDLIST RowId(int row);
  // Adds the full list of every selected row to `data`; the last row handled, or -1.
  int AddSelection(class CMarlixDLDataObject* data);

  tagPIDLTYPE FolderType();

  UINT UIState = 0;
  LPITEMIDLIST FolderIdList = nullptr;
  FOLDERSETTINGS FolderSettings{FVM_DETAILS, 0};
  com::ComPtr<IShellBrowser> ShellBrowser;
  com::ComPtr<ICommDlgBrowser> CommDlgBrowser;
  HWND ParentWindow = nullptr;
  HWND ViewWindow = nullptr;
  HWND ListWindow = nullptr;
  HWND AnimateWindow = nullptr;
  HMENU MergedMenu = nullptr;
  com::ComPtr<IShellFolder> ShellFolder;
  CGravonShellFolderBase* FolderBase = nullptr;  // the same object, when it is ours
  IMalloc* Malloc = nullptr;
  std::unique_ptr<CPidlMgr> PidlMgr;
  HIMAGELIST DragImage = nullptr;
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
