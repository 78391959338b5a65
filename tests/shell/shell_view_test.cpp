// The folder view in a browser of our own: only for what no real host shows (the status
// bar, the view state stream, item objects, menus), and for its lifetime.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>
#include <tlhelp32.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <thread>

#include "base/resource_ids.h"
#include "base/window_messages.h"
#include "config/sheet_driver.h"
#include "shell/item_services.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "shell/shell_view.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {
using Texts = std::vector<std::wstring>;

int ThreadCount() {
  HANDLE snapshot = CreateToolhelp32Snapshot(TH32CS_SNAPTHREAD, 0);
  THREADENTRY32 entry{sizeof(entry)};
  int count = 0;
  for (BOOL more = Thread32First(snapshot, &entry); more; more = Thread32Next(snapshot, &entry))
    count += entry.th32OwnerProcessID == GetCurrentProcessId();
  CloseHandle(snapshot);
  return count;
}

// The browser's window records the commands sent to it. Across processes it tells how
// often its view reloaded (kReloads), and ends a peer (kPeerDone).
std::vector<WPARAM> frameCommands;
constexpr UINT kReloads = WM_APP, kPeerDone = WM_APP + 1, kEndMenu = WM_APP + 2;
bool peerDone = false;
LRESULT CALLBACK FrameProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  // As Explorer's frame does, what its merged menu shows and chooses goes to the active view.
  auto* active = static_cast<HWND>(GetPropW(window, L"active"));
  if (active && (message == WM_INITMENUPOPUP || (message == WM_COMMAND && wParam >= kCmdNewLevel && wParam <= kCmdActivate)))
    return SendMessageW(active, message, wParam, lParam);
  if (message == WM_COMMAND) frameCommands.push_back(wParam);
  if (message == WM_COMMAND && wParam == kCmdBrowserRefresh)
    SetPropW(window, L"reloads", reinterpret_cast<HANDLE>(reinterpret_cast<INT_PTR>(GetPropW(window, L"reloads")) + 1));
  if (message == kReloads) return reinterpret_cast<LRESULT>(GetPropW(window, L"reloads"));
  if (message == kPeerDone) peerDone = true;
  if (message == kEndMenu) EndMenu();  // a menu left open by a failed choice
  return DefWindowProcW(window, message, wParam, lParam);
}

// A popup `id` of the menu bar, as a browser merges its own: "-" is a separator.
void AddPopup(HMENU bar, UINT id, const wchar_t* title, std::vector<std::pair<UINT, const wchar_t*>> entries) {
  HMENU popup = CreatePopupMenu();
  for (auto [entryId, text] : entries) {
    MENUITEMINFOW item{sizeof(item), MIIM_ID | MIIM_FTYPE | MIIM_STRING};
    item.fType = *text == L'-' ? MFT_SEPARATOR : MFT_STRING;
    item.wID = entryId;
    item.dwTypeData = const_cast<wchar_t*>(text);
    InsertMenuItemW(popup, GetMenuItemCount(popup), TRUE, &item);
  }
  MENUITEMINFOW item{sizeof(item), MIIM_ID | MIIM_SUBMENU | MIIM_STRING};
  item.wID = id;
  item.hSubMenu = popup;
  item.dwTypeData = const_cast<wchar_t*>(title);
  InsertMenuItemW(bar, GetMenuItemCount(bar), TRUE, &item);
}

// A browser that records what the view tells it. A file dialog when `dialog` is set.
class FakeBrowser : public com::ComObject<IShellBrowser, ICommDlgBrowser> {
 public:
  explicit FakeBrowser(bool dialog = false) : dialog_(dialog) {
    WNDCLASSW wc{0, FrameProc, 0, 0, GetModuleHandleW(nullptr), nullptr, nullptr, nullptr, nullptr, L"ViewTestFrame"};
    RegisterClassW(&wc);
    frame = CreateWindowExW(0, L"ViewTestFrame", nullptr, WS_OVERLAPPEDWINDOW, 0, 0, 600, 400, nullptr, nullptr,
                            GetModuleHandleW(nullptr), nullptr);
  }
  ~FakeBrowser() override { DestroyWindow(frame); }

  HWND frame;
  bool hasStream = true;
  Texts status;
  com::ComPtr<IStream> stream;  // the view state; none until written or seeded

  void SeedMode(UINT mode) {
    CreateStreamOnHGlobal(nullptr, TRUE, stream.Put());
    stream->Write(&mode, sizeof(mode), nullptr);
  }
  UINT StoredMode() {
    UINT mode = 0;
    LARGE_INTEGER zero{};
    if (!stream || FAILED(stream->Seek(zero, STREAM_SEEK_SET, nullptr))) return 0;
    stream->Read(&mode, sizeof(mode), nullptr);
    return mode;
  }

  STDMETHODIMP GetWindow(HWND* window) override {
    *window = frame;
    return S_OK;
  }
  STDMETHODIMP ContextSensitiveHelp(BOOL) override { return E_NOTIMPL; }
  // As Explorer merges: File, Edit and View popups holding entries of the browser's own.
  STDMETHODIMP InsertMenusSB(HMENU menu, LPOLEMENUGROUPWIDTHS) override {
    ++lent;
    AddPopup(menu, FCIDM_MENU_FILE, L"&File", {{0x7001, L"Close"}});
    AddPopup(menu, FCIDM_MENU_EDIT, L"&Edit", {{0x7002, L"Undo"}});
    AddPopup(menu, FCIDM_MENU_VIEW, L"&View",
             {{0x7003, L"Status Bar"}, {FCIDM_MENU_VIEW_SEP_OPTIONS, L"-"}, {0x7004, L"Options"}});
    return S_OK;
  }
  STDMETHODIMP SetMenuSB(HMENU menu, HOLEMENU, HWND active) override {
    shown = menu;
    SetMenu(frame, menu);
    SetPropW(frame, L"active", active);
    return S_OK;
  }
  STDMETHODIMP RemoveMenusSB(HMENU menu) override {
    --lent;
    while (GetMenuItemCount(menu) > 0) DeleteMenu(menu, 0, MF_BYPOSITION);
    return S_OK;
  }
  HMENU shown = nullptr;  // the menu bar the view gave the browser
  int lent = 0;           // menus filled with this browser's popups and not given back
  STDMETHODIMP SetStatusTextSB(LPCWSTR) override { return S_OK; }
  STDMETHODIMP EnableModelessSB(BOOL) override { return S_OK; }
  STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) override { return S_FALSE; }
  STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE, UINT) override { return S_OK; }
  STDMETHODIMP GetViewStateStream(DWORD mode, IStream** result) override {
    *result = nullptr;
    if (!hasStream) return E_FAIL;
    if ((mode & STGM_WRITE) || !stream) CreateStreamOnHGlobal(nullptr, TRUE, stream.Put());
    LARGE_INTEGER zero{};
    stream->Seek(zero, STREAM_SEEK_SET, nullptr);
    return stream.CopyTo(result);
  }
  STDMETHODIMP GetControlWindow(UINT, HWND* window) override { *window = nullptr; return E_NOTIMPL; }
  STDMETHODIMP SendControlMsg(UINT id, UINT message, WPARAM wParam, LPARAM lParam, LRESULT* result) override {
    if (id == FCW_STATUS && message == SB_SETPARTS)
      status.push_back(L"parts " + std::to_wstring(wParam) + L" " + std::to_wstring(reinterpret_cast<int*>(lParam)[0]));
    if (id == FCW_STATUS && message == SB_SETTEXTW) status.push_back(reinterpret_cast<const wchar_t*>(lParam));
    if (result) *result = 0;
    return S_OK;
  }
  STDMETHODIMP QueryActiveShellView(IShellView** view) override { *view = nullptr; return E_NOTIMPL; }
  STDMETHODIMP OnViewWindowActive(IShellView*) override { return S_OK; }
  STDMETHODIMP SetToolbarItems(LPTBBUTTONSB, UINT, UINT) override { return S_OK; }
  STDMETHODIMP OnDefaultCommand(IShellView*) override { return S_OK; }
  STDMETHODIMP OnStateChange(IShellView*, ULONG) override { return S_OK; }
  STDMETHODIMP IncludeObject(IShellView*, PCUITEMID_CHILD) override { return S_OK; }

 protected:
  void* FindInterface(REFIID riid) noexcept override {
    if (riid == IID_ICommDlgBrowser && !dialog_) return nullptr;
    return ComObject::FindInterface(riid);
  }

 private:
  bool dialog_;
};

// A folder whose enumeration fails; everything else it leaves unimplemented.
class FailingFolder : public com::ComObject<IShellFolder> {
 public:
  STDMETHODIMP ParseDisplayName(HWND, IBindCtx*, LPWSTR, ULONG*, PIDLIST_RELATIVE*, ULONG*) override { return E_NOTIMPL; }
  STDMETHODIMP EnumObjects(HWND, SHCONTF, IEnumIDList** list) override { *list = nullptr; return E_OUTOFMEMORY; }
  STDMETHODIMP BindToObject(PCUIDLIST_RELATIVE, IBindCtx*, REFIID, void**) override { return E_NOTIMPL; }
  STDMETHODIMP BindToStorage(PCUIDLIST_RELATIVE, IBindCtx*, REFIID, void**) override { return E_NOTIMPL; }
  STDMETHODIMP CompareIDs(LPARAM, PCUIDLIST_RELATIVE, PCUIDLIST_RELATIVE) override { return 0; }
  STDMETHODIMP CreateViewObject(HWND, REFIID, void**) override { return E_NOTIMPL; }
  STDMETHODIMP GetAttributesOf(UINT, PCUITEMID_CHILD_ARRAY, SFGAOF*) override { return E_NOTIMPL; }
  STDMETHODIMP GetUIObjectOf(HWND, UINT, PCUITEMID_CHILD_ARRAY, REFIID, UINT*, void**) override { return E_NOTIMPL; }
  STDMETHODIMP GetDisplayNameOf(PCUITEMID_CHILD, SHGDNF, STRRET*) override { return E_NOTIMPL; }
  STDMETHODIMP SetNameOf(HWND, PCUITEMID_CHILD, LPCWSTR, SHGDNF, PITEMID_CHILD*) override { return E_NOTIMPL; }
};

HWND ListOf(HWND view) { return GetDlgItem(view, kListWindowId); }
HWND AnimationOf(HWND view) { return FindWindowExW(ListOf(view), nullptr, ANIMATE_CLASSW, nullptr); }

// The text, or with `images` the picture, of every row.
Texts Rows(HWND view, bool images = false) {
  Texts rows;
  HWND list = ListOf(view);
  int count = static_cast<int>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0));
  for (int i = 0; i < count; ++i) {
    wchar_t text[MAX_PATH] = {};
    LVITEMW item{LVIF_IMAGE, i, 0, 0, 0, text, MAX_PATH};
    SendMessageW(list, images ? LVM_GETITEMW : LVM_GETITEMTEXTW, i, reinterpret_cast<LPARAM>(&item));
    rows.push_back(images ? std::to_wstring(item.iImage) : text);
  }
  return rows;
}

// Adds `row` to the selection; -1 clears it.
void Select(HWND view, int row) {
  LVITEMW item{};
  item.stateMask = LVIS_SELECTED;
  item.state = row < 0 ? 0 : LVIS_SELECTED;
  SendMessageW(ListOf(view), LVM_SETITEMSTATE, row, reinterpret_cast<LPARAM>(&item));
}

// A root folder over a store of three levels; every view made is closed and every
// object let go by the end.
class View : public ::testing::Test {
 protected:
  void SetUp() override {
    SeedLevel(0, L"Charlie");
    SeedLevel(1, L"alpha");
    SeedLevel(2, L"Bravo");
    ASSERT_EQ(root_->Initialize(nullptr), S_OK);
  }
  void TearDown() override {
    for (auto& view : views_) view->DestroyViewWindow();
    views_.clear();
    EXPECT_EQ(browser_->lent, 0) << "every merged menu given back to the browser";
    browser_.Reset();
    root_.Reset();
    EXPECT_TRUE(PumpUntil([&] { return com::ModuleLockCount() == before_; })) << "every object let go";
  }

  // `view` in `browser`, created and, unless told not to, filled.
  HWND Show(IShellView* view, UINT mode = FVM_DETAILS, IShellView* previous = nullptr, FakeBrowser* browser = nullptr,
            bool wait = true) {
    FOLDERSETTINGS settings{mode, 0};
    RECT rect{0, 0, 400, 300};
    HWND window = nullptr;
    EXPECT_EQ(view->CreateViewWindow(previous, &settings, browser ? browser : browser_.Get(), &rect, &window), S_OK);
    views_.emplace_back(view);
    if (window && wait) {
      EXPECT_TRUE(PumpUntil([&] { return !AnimationOf(window); })) << "the list is filled";
    }
    return window;
  }
  HWND Open(IShellFolder* folder, UINT mode = FVM_DETAILS, IShellView* previous = nullptr,
            FakeBrowser* browser = nullptr, bool wait = true) {
    com::ComPtr<IShellView> view;
    EXPECT_EQ(folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()), S_OK);
    return Show(view.Get(), mode, previous, browser, wait);
  }
  com::ComPtr<IShellFolder> Alpha(const wchar_t* name = L"alpha") {
    UniqueList alpha = MakeId(PIDL_LEVEL, name);
    return Bind(root_.Get(), alpha.Get());
  }
  IShellView* Last() { return views_.back().Get(); }
  UINT Mode(IShellView* view) {
    FOLDERSETTINGS settings{};
    view->GetCurrentInfo(&settings);
    return settings.ViewMode;
  }
  void Command(HWND view, UINT id) { SendMessageW(view, WM_COMMAND, id, 0); }

  long before_ = com::ModuleLockCount();
  RegistrySandbox sandbox_;
  com::ComPtr<CMarlixDLShellFolder> root_ = com::Make<CMarlixDLShellFolder>();
  com::ComPtr<FakeBrowser> browser_ = com::Make<FakeBrowser>();
  std::vector<com::ComPtr<IShellView>> views_;
};

const Texts kRootRows = {L"Add New Digital Level", L"alpha", L"Bravo", L"Charlie"};

// Rows and the thread behind the clip are the clients' and the lifetime tests' to see;
// here the clip itself and the picture each row asks for.
TEST_F(View, TheClipIsOneTheControlReadsAndEachRowHasItsPicture) {
  HWND view = Open(root_.Get());
  // Wine's control can't say whether it plays: open the module's clip in one of our own.
  HWND probe = CreateWindowExW(0, ANIMATE_CLASSW, nullptr, WS_CHILD, 0, 0, 80, 50, view, nullptr, nullptr, nullptr);
  EXPECT_TRUE(SendMessageW(probe, ACM_OPENW, reinterpret_cast<WPARAM>(GetModuleHandleW(nullptr)),
                           reinterpret_cast<LPARAM>(MAKEINTRESOURCEW(103)))) << "resource 103 is a clip the control reads";
  DestroyWindow(probe);
  const std::wstring level = std::to_wstring(IMAGE_LEVEL);
  EXPECT_EQ(Rows(view, true), (Texts{std::to_wstring(IMAGE_ADD_LEVEL), level, level, level}));
  HWND file = Open(Alpha().Get());
  EXPECT_EQ(Rows(file, true), Texts{std::to_wstring(IMAGE_VIRTUAL_FILE)});
}

// Which style each mode gives is a table of the code; Wine's ExplorerBrowser shows two of them.
TEST_F(View, EachModeHasItsPicturesAndOnlyDetailsEnumeratesAgain) {
  for (UINT mode : {1, 2, 3, 4, 7}) {
    HWND view = Open(root_.Get(), mode);
    const bool large = mode == FVM_ICON || mode == 7;
    EXPECT_EQ(SendMessageW(ListOf(view), LVM_GETIMAGELIST, large ? LVSIL_NORMAL : LVSIL_SMALL, 0),
              reinterpret_cast<LRESULT>(large ? LargeImageList.Get() : SmallImageList.Get())) << mode;
    EXPECT_EQ(Rows(view), kRootRows) << mode;
  }
  EXPECT_EQ(Mode(Last()), 1u) << "the browser is told the mode the view really shows";
  HWND view = Open(root_.Get(), FVM_ICON);
  Command(view, kCmdSmallIcons);
  EXPECT_EQ(Mode(Last()), 2u);
  EXPECT_EQ(browser_->shown, nullptr) << "an inactive view has no menu to rebuild";
  EXPECT_FALSE(AnimationOf(view));
  Command(view, kCmdDetails);
  EXPECT_TRUE(AnimationOf(view)) << "Details enumerates again";
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), kRootRows);
  Command(view, kCmdLargeIcons);
  EXPECT_EQ(Rows(view), kRootRows);
}

TEST_F(View, DetailsColumnTakesTheSharedWidthAndKeepsADraggedOne) {
  ColumnWidths[0] = 123;
  HWND view = Open(root_.Get(), FVM_DETAILS);
  HWND list = ListOf(view);
  EXPECT_EQ(SendMessageW(list, LVM_GETCOLUMNWIDTH, 0, 0), 123);
  SendMessageW(list, LVM_SETCOLUMNWIDTH, 0, 77);
  NMHEADERW track{{list, 0, HDN_ENDTRACKW}};
  SendMessageW(view, WM_NOTIFY, 0, reinterpret_cast<LPARAM>(&track));
  EXPECT_EQ(ColumnWidths[0], 77) << "a dragged width is kept for the next view";
  ColumnWidths[0] = ColumnWidths[1] = 100;
}

// That a view after one of ours keeps its mode is the ExplorerBrowser client's test.
TEST_F(View, ANewViewTakesTheModeOfTheStreamOrOfTheBrowserAndSavesItsMode) {
  browser_->SeedMode(FVM_LIST);
  // A foreign view: Wine's own view of the desktop.
  com::ComPtr<IShellFolder> desktop;
  com::ComPtr<IShellView> other;
  ASSERT_EQ(SHGetDesktopFolder(desktop.Put()), S_OK);
  ASSERT_EQ(desktop->CreateViewObject(nullptr, IID_IShellView, other.PutVoid()), S_OK);
  Open(root_.Get(), FVM_DETAILS, other.Get());
  EXPECT_EQ(Mode(Last()), 3u) << "after a foreign view, from the stream";
  Open(root_.Get(), FVM_DETAILS);
  EXPECT_EQ(Mode(Last()), 4u) << "first view of the browser";
  Open(root_.Get(), FVM_LIST);
  EXPECT_EQ(Last()->SaveViewState(), S_OK);
  EXPECT_EQ(browser_->StoredMode(), 3u);
  browser_->hasStream = false;
  EXPECT_EQ(Last()->SaveViewState(), E_FAIL);
  Open(root_.Get(), FVM_DETAILS, other.Get());
  EXPECT_EQ(Mode(Last()), 4u) << "no stream";
}

TEST_F(View, ActivationShowsTheRootNameAndTheFolderAddressInTheStatusBar) {
  Open(root_.Get());
  EXPECT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(Last()->UIActivate(SVUIA_DEACTIVATE), S_OK);
  const std::wstring longest(kMaxStationNameLength, L'n');
  SeedLevel(3, longest);
  Open(Alpha(longest.c_str()).Get());
  Last()->UIActivate(SVUIA_ACTIVATE_NOFOCUS);
  EXPECT_EQ(browser_->status, (Texts{L"parts 1 -1", L"Marlix Digital Levels: \\Marlix Digital Levels",
                                     L"parts 1 -1", L"Marlix Digital Levels: \\Marlix Digital Levels\\" + longest}));
}

TEST_F(View, ItemObjectIsOfTheFirstSelectedRowOrOfRowZero) {
  HWND view = Open(root_.Get());
  com::ComPtr<IDataObject> data;
  EXPECT_EQ(Last()->GetItemObject(SVGIO_SELECTION, IID_IDataObject, data.PutVoid()), E_INVALIDARG)
      << "row 0 of the root has no list";
  Select(view, 2);
  Select(view, 3);
  com::ComPtr<IQueryInfo> tip;
  ASSERT_EQ(Last()->GetItemObject(SVGIO_SELECTION, IID_IQueryInfo, tip.PutVoid()), S_OK);
  win::UniqueCoMem<wchar_t> text;
  ASSERT_EQ(tip->GetInfoTip(0, text.Put()), S_OK);
  EXPECT_STREQ(text.Get(), L"Marlix Digital Levels\\Bravo");
}

TEST_F(View, ColumnClicksSortBothWaysForEveryViewWithTheAddRowFirst) {
  HWND view = Open(root_.Get());
  SortColumn = 1, SortDirection = 1;
  NMLISTVIEW click{{ListOf(view), kListWindowId, LVN_COLUMNCLICK}, -1, 0};
  SendMessageW(view, WM_NOTIFY, kListWindowId, reinterpret_cast<LPARAM>(&click));
  EXPECT_EQ(SortDirection, -1);
  EXPECT_EQ(Rows(view), (Texts{L"Add New Digital Level", L"Charlie", L"Bravo", L"alpha"}));
  HWND second = Open(root_.Get());
  SendMessageW(second, WM_NOTIFY, kListWindowId, reinterpret_cast<LPARAM>(&click));
  EXPECT_EQ(Rows(second), kRootRows) << "the state is the process's, so the next click turns it back";
  Last()->Refresh();
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(second); }));
  EXPECT_EQ(Rows(second), kRootRows) << "a refill sorts by the folder's order";
}

// The thread has read the store and posted its result when a level comes and a refresh with it.
TEST_F(View, ARefreshWhileTheThreadRunsShowsWhatCameMeanwhile) {
  HWND view = Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, false);
  MSG posted;
  ASSERT_TRUE(ui::WaitFor([&] { return PeekMessageW(&posted, view, GetEnumIDListMessage, GetEnumIDListMessage, PM_NOREMOVE); }));
  SeedLevel(3, L"Delta");
  EXPECT_EQ(Last()->Refresh(), S_OK);
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), (Texts{L"Add New Digital Level", L"alpha", L"Bravo", L"Charlie", L"Delta"}));
}

// The thread's enumeration fails when memory runs out.
TEST_F(View, FailingEnumerationLeavesTheListEmptyWithoutTheAddRow) {
  auto view = com::Make<CMarlixDLShellView>();
  UniqueList rootList(CPidlMgr().CreateRoot());
  ASSERT_EQ(view->Init(com::Make<FailingFolder>().Get(), rootList.Get()), S_OK);
  HWND window = Show(view.Get());
  EXPECT_EQ(Rows(window), Texts{});
  EXPECT_EQ(view->DestroyViewWindow(), S_OK);
  views_.pop_back();
}

// Made by its class object, a view has no folder: its window opens on an empty list and
// takes no drop.
TEST_F(View, AViewWithoutAFolderOpensEmpty) {
  com::ComPtr<IShellView> view;
  ASSERT_EQ(CreateMarlixDLShellView(IID_IShellView, view.PutVoid()), S_OK);
  HWND window = Show(view.Get(), FVM_DETAILS, nullptr, nullptr, false);
  EXPECT_EQ(SendMessageW(ListOf(window), LVM_GETITEMCOUNT, 0, 0), 0);
  EXPECT_FALSE(AnimationOf(window)) << "nothing to enumerate";
  auto* target = static_cast<IDropTarget*>(GetPropW(ListOf(window), L"OleDropTargetInterface"));
  ASSERT_TRUE(target);
  DWORD effect = 0;
  EXPECT_EQ(target->DragOver(0, {10, 10}, &effect), E_INVALIDARG);
  EXPECT_EQ(view->Refresh(), S_OK);
}

// A window made again for the same view fills again.
TEST_F(View, AViewClosedWhileItsThreadRunsLeavesNothingBehind) {
  int threads = ThreadCount();
  com::ComPtr<IShellView> view;
  ASSERT_EQ(root_->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()), S_OK);
  for (int i = 0; i < 20; ++i) {
    ASSERT_TRUE(AnimationOf(Show(view.Get(), FVM_DETAILS, nullptr, nullptr, false)));
    view->DestroyViewWindow();
  }
  EXPECT_EQ(Rows(Show(view.Get())), kRootRows);
  view->DestroyViewWindow();
  views_.clear(), view.Reset();
  EXPECT_TRUE(PumpUntil([&] { return com::ModuleLockCount() == before_ + 2; })) << "only folder and browser";
  EXPECT_TRUE(PumpUntil([&] { return ThreadCount() == threads; }));
}

// Counts of what a view could leak. Wine answers 0 to GetGuiResources and
// GetProcessHandleCount, so these count what Wine does keep: kernel handles from the
// system's handle list, GDI objects from the shared handle table, windows of the thread.
struct Resources {
  long locks;
  int threads;
  long handles, gdi, windows;

  static long GdiObjects() {
    struct Entry { UINT64 object; USHORT pid, count, unique; BYTE type, flags; UINT64 user; };
    static_assert(sizeof(Entry) == 24);
    // PEB at TEB+0x60, its GdiSharedHandleTable at +0xF8 (64-bit layouts).
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Warray-bounds"  // the header reads gs:0x30 as if it were memory at 0x30
    BYTE* peb = *reinterpret_cast<BYTE**>(reinterpret_cast<BYTE*>(NtCurrentTeb()) + 0x60);
#pragma GCC diagnostic pop
    auto* table = *reinterpret_cast<Entry**>(peb + 0xF8);
    if (!table) return GetGuiResources(GetCurrentProcess(), GR_GDIOBJECTS);
    long used = 0;
    // Wine's table is the process's own and leaves the owner empty.
    for (int i = 0; i < 0x10000; ++i) used += table[i].type != 0;
    return used;
  }
  static long Windows() {
    long count = 0;
    EnumThreadWindows(GetCurrentThreadId(), [](HWND window, LPARAM n) {
      ++*reinterpret_cast<long*>(n);
      EnumChildWindows(window, [](HWND, LPARAM m) { return ++*reinterpret_cast<long*>(m), TRUE; }, n);
      return TRUE;
    }, reinterpret_cast<LPARAM>(&count));
    return count;
  }
  static Resources Now() { return {com::ModuleLockCount(), ThreadCount(), KernelHandleCount(), GdiObjects(), Windows()}; }
};

TEST_F(View, AThousandOpenFillCloseCyclesLeakNothing) {
  const int cycles = 1000;
  Open(root_.Get());  // first-use costs (classes, image lists, clip) before counting
  views_.back()->DestroyViewWindow();
  views_.clear();
  PumpUntil([&] { return com::ModuleLockCount() == before_ + 2; });
  Resources start = Resources::Now();
  for (int i = 0; i < cycles; ++i) {
    HWND window = Open(root_.Get());
    ASSERT_EQ(SendMessageW(ListOf(window), LVM_GETITEMCOUNT, 0, 0), 4);
    views_.back()->DestroyViewWindow();
    views_.clear();
  }
  ASSERT_TRUE(PumpUntil([&] { return com::ModuleLockCount() == start.locks && ThreadCount() == start.threads; }));
  Resources end = Resources::Now();
  EXPECT_EQ(end.locks, start.locks);
  EXPECT_EQ(end.threads, start.threads);
  EXPECT_LE(end.handles, start.handles + 5) << "kernel handles";
  EXPECT_LE(end.gdi, start.gdi + 5) << "GDI objects";
  EXPECT_EQ(end.windows, start.windows) << "windows";
  printf("%d cycles: kernel handles %ld->%ld, GDI objects %ld->%ld, windows %ld->%ld\n", cycles, start.handles,
         end.handles, start.gdi, end.gdi, start.windows, end.windows);
}


// ---- Commands ----

// Runs `action` here while a second thread answers each property sheet it opens, as a
// person would: reads the name on the General page and presses the next of `buttons`
// (Cancel once they run out). Gives the names the sheets showed, in order.
Texts AnswerSheets(const std::function<void()>& action, std::vector<int> buttons) {
  std::atomic<bool> done{false};
  Texts names;
  std::thread person([&] {
    size_t next = 0;
    while (!done) {
      HWND window = sheet::OwnedDialog(nullptr);
      if (!window) {
        Sleep(20);
        continue;
      }
      names.push_back(sheet::Text(sheet::Page(window, 0), IDC_STATION_NAME));
      sheet::Press(window, next < buttons.size() ? buttons[next++] : IDCANCEL);
      sheet::WaitFor([&] { return !IsWindow(window); });
    }
  });
  action();
  done = true;
  person.join();
  return names;
}

// Names of the stored levels, sorted.
Texts Stored() {
  Texts names;
  for (const std::wstring& line : sheet::StoredLevels()) names.push_back(line.substr(0, line.find(L'|')));
  std::sort(names.begin(), names.end());
  return names;
}

// A key as the browser passes it on: pressed with `modifiers` (VK_CONTROL, VK_SHIFT) held.
HRESULT Key(IShellView* view, HWND list, UINT key, std::vector<BYTE> modifiers = {}) {
  BYTE keys[256] = {};
  GetKeyboardState(keys);
  for (BYTE m : modifiers) keys[m] = 0x80;
  SetKeyboardState(keys);
  MSG msg{list, WM_KEYDOWN, key, 1};
  HRESULT hr = view->TranslateAccelerator(&msg);
  for (BYTE m : modifiers) keys[m] = 0;
  SetKeyboardState(keys);
  return hr;
}

// Text and state of every entry, as a user reads them.
Texts Entries(HMENU menu) {
  Texts entries;
  for (int i = 0; i < GetMenuItemCount(menu); ++i) {
    wchar_t text[64] = {};
    MENUITEMINFOW item{sizeof(item), MIIM_STATE | MIIM_FTYPE | MIIM_STRING};
    item.dwTypeData = text;
    item.cch = 64;
    GetMenuItemInfoW(menu, i, TRUE, &item);
    std::wstring entry = (item.fType & MFT_SEPARATOR) ? L"-" : text;
    if (item.fState & MFS_DEFAULT) entry += L" default";
    if (item.fState & MFS_GRAYED) entry += L" grey";
    if (item.fState & MFS_CHECKED) entry += L" checked";
    entries.push_back(entry);
  }
  return entries;
}

// The entries of the browser's popup `id` as it opens.
Texts Popup(FakeBrowser* browser, UINT id) {
  MENUITEMINFOW item{sizeof(item), MIIM_SUBMENU};
  if (!browser->shown || !GetMenuItemInfoW(browser->shown, id, FALSE, &item)) return {L"<no popup>"};
  SendMessageW(browser->frame, WM_INITMENUPOPUP, reinterpret_cast<WPARAM>(item.hSubMenu), 0);
  return Entries(item.hSubMenu);
}

void Refilled(HWND view) { EXPECT_TRUE(PumpUntil([&] { return !AnimationOf(view) && !Rows(view).empty(); })); }

void ParkCursorAwayFrom(HWND view) {
  RECT r{};
  GetWindowRect(view, &r);
  SetCursorPos(r.right + 50, r.bottom + 50);
}

TEST_F(View, CreateOpensTheNewLevelSheetFromTheAddRowAndOnlyItsOkStoresAndReloads) {
  HWND view = Open(root_.Get());
  SeedLevel(9, L"New digital level");
  Select(view, 0);
  frameCommands.clear();
  EXPECT_EQ(AnswerSheets([&] { Command(view, kCmdActivate); }, {IDCANCEL}), Texts{L"New digital level (2)"});
  EXPECT_TRUE(frameCommands.empty()) << "a cancelled sheet reloads nothing";
  EXPECT_EQ(AnswerSheets([&] { Command(view, kCmdNewLevel); }, {IDOK}), Texts{L"New digital level (2)"});
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"New digital level", L"New digital level (2)", L"alpha"}));
  EXPECT_EQ(frameCommands, std::vector<WPARAM>{kCmdBrowserRefresh});
  ASSERT_TRUE(PumpUntil([&] { return Rows(view).size() == 6; })) << "the list shows the new level";
}

TEST_F(View, PropertiesOpensOneSheetAfterAnotherWhileTheyAreCancelled) {
  HWND view = Open(root_.Get());
  for (int row : {0, 1, 2, 3}) Select(view, row);
  EXPECT_EQ(AnswerSheets([&] { Command(view, kCmdProperties); }, {IDCANCEL, IDOK}), (Texts{L"alpha", L"Bravo"}))
      << "the add row gets no sheet, and an OK ends the walk";
  Refilled(view);
  Select(view, 1);
  DeleteStation([] { CStationRecord r; r.Name = L"alpha"; return r; }());
  EXPECT_EQ(AnswerSheets([&] { Command(view, kCmdProperties); }, {IDCANCEL}), Texts{L"alpha"})
      << "a level gone meanwhile opens with its name";
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie"}));
  Select(view, -1);
  EXPECT_EQ(AnswerSheets([&] { Command(view, kCmdProperties); }, {}), Texts{}) << "nothing selected";
}

// That a paste keeps every field is the peer process's test, which keys the table holds is
// the code's: here that keys reach the commands.
TEST_F(View, KeysCopyPasteAndDeleteAndTheBrowserSeesThemToo) {
  HWND view = Open(root_.Get());
  HWND list = ListOf(view);
  IShellView* shell = Last();
  Select(view, 3);  // Charlie
  EXPECT_EQ(Key(shell, list, 'C', {VK_CONTROL}), S_FALSE);
  EXPECT_EQ(Key(shell, list, 'V', {VK_CONTROL}), S_FALSE);
  Refilled(view);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"Copy of Charlie", L"alpha"}));
  Select(view, 0);
  Select(view, 1);  // the add row and alpha
  EXPECT_EQ(Key(shell, browser_->frame, VK_DELETE), S_FALSE);
  EXPECT_EQ(Stored().size(), 4u) << "a key typed in another window of the browser is that window's";
  EXPECT_EQ(Key(shell, list, VK_DELETE), S_FALSE);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"Copy of Charlie"})) << "alpha deleted without a question";
  OleSetClipboard(nullptr);
}

TEST_F(View, CopyingTheAddRowPutsTheFolderItselfOnTheClipboard) {
  HWND view = Open(root_.Get());
  Select(view, 0);
  Command(view, kCmdCopy);
  com::ComPtr<IDataObject> clip;
  ASSERT_EQ(OleGetClipboard(clip.Put()), S_OK);
  FORMATETC format{static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_FILEDESCRIPTORW)), nullptr,
                   DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
  STGMEDIUM medium{};
  ASSERT_EQ(clip->GetData(&format, &medium), S_OK) << "one item, though no level";
  EXPECT_EQ(static_cast<FILEGROUPDESCRIPTORW*>(GlobalLock(medium.hGlobal))->cItems, 1u);
  GlobalUnlock(medium.hGlobal);
  ReleaseStgMedium(&medium);
  clip.Reset();
  Command(view, kCmdPaste);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"alpha"})) << "the folder is no level";
  OleSetClipboard(nullptr);
}

// Puts a "Marlix Total Stations" block on the clipboard as another process would.
// What a paste makes of a damaged block is the store's rule, tested there.
void ClipStations(const std::vector<CStationRecord>& records) {
  ASSERT_TRUE(OpenClipboard(nullptr));
  EmptyClipboard();
  SetClipboardData(RegisterClipboardFormatW(L"Marlix Total Stations"), PackStations(records));
  CloseClipboard();
}
CStationRecord Record(const std::wstring& name, const std::wstring& note = L"") {
  CStationRecord record;
  record.Name = name, record.Manufacturer = note;
  return record;
}

// Whatever another process packs, every level pasted can be listed and found again: the keys
// under Levels and the rows are one set.
TEST_F(View, APasteStoresOnlyWhatEveryRoadCanCarry) {
  const std::wstring longest(kMaxStationNameLength, L'x');
  ClipStations({Record(longest), Record(longest + L"x"), Record(L"Note", std::wstring(260, L'n')), Record(L"a\\b")});
  HWND view = Open(root_.Get());
  Command(view, kCmdPaste);
  Command(view, kCmdPaste);
  Refilled(view);
  const Texts stored = Stored();
  EXPECT_EQ(stored, (Texts{L"Bravo", L"Charlie", L"Copy of " + longest.substr(8), L"alpha", longest}));
  Texts rows = Rows(view);
  rows.erase(rows.begin());
  std::sort(rows.begin(), rows.end());
  EXPECT_EQ(rows, stored);
  OleSetClipboard(nullptr);
}

TEST_F(View, DeleteAndPasteInALevelsViewChangeNothingYetEveryViewOfALevelReloads) {
  HWND root = Open(root_.Get());
  auto level = Alpha();
  HWND first = Open(level.Get());
  auto secondBrowser = com::Make<FakeBrowser>();
  HWND second = Open(level.Get(), FVM_DETAILS, nullptr, secondBrowser.Get());
  frameCommands.clear();
  Command(first, kCmdDelete);
  EXPECT_TRUE(frameCommands.empty()) << "nothing selected: nothing at all";
  Select(first, 0);
  Command(first, kCmdDelete);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"alpha"}));
  ClipStations({Record(L"One"), Record(L"Two")});
  Command(first, kCmdPaste);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"alpha"})) << "levels are pasted in the root only";
  OleSetClipboard(nullptr);
  EXPECT_TRUE(PumpUntil([&] { return frameCommands.size() >= 5; })) << "delete: itself, and both by its broadcast; paste: both by its broadcast";
  Refilled(second);
  EXPECT_EQ(Rows(root), kRootRows) << "the root view hears only changes of the root";
}

// Which commands it announces and for which groups is a table of the code.
TEST_F(View, CommandTargetRunsACommandOfAnyGroup) {
  HWND view = Open(root_.Get());
  com::ComPtr<IOleCommandTarget> target;
  ASSERT_EQ(Last()->QueryInterface(IID_IOleCommandTarget, target.PutVoid()), S_OK);
  const GUID unknown{0x12345678, 1, 2, {3, 4, 5, 6, 7, 8, 9, 10}};
  Select(view, 3);
  EXPECT_EQ(target->Exec(&unknown, kCmdDelete, 0, nullptr, nullptr), S_OK);
  EXPECT_EQ(target->Exec(&unknown, 4711, 0, nullptr, nullptr), S_OK) << "an unknown command is ignored";
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"alpha"}));
}

TEST_F(View, MergedMenusHoldTheEntriesInTheirOrderAndStatesFreshAtEachOpening) {
  HWND view = Open(root_.Get());
  ParkCursorAwayFrom(view);
  ASSERT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_FILE), (Texts{L"-", L"Delete grey", L"Properties grey", L"Open default grey",
                                                L"Create Digital Level", L"Close"}));
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_EDIT), (Texts{L"-", L"&Copy grey", L"&Paste grey"}));
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_VIEW), (Texts{L"Status Bar", L"-", L"Large Icons", L"Small Icons", L"List",
                                                L"Details checked", L"-", L"Options"}));
  Select(view, 2);
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_FILE)[1], L"Delete");
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_FILE)[3], L"Open default");
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_EDIT), (Texts{L"-", L"&Copy grey", L"&Paste"})) << "mouse not over a level";
  RECT row{LVIR_BOUNDS};
  SendMessageW(ListOf(view), LVM_GETITEMRECT, 1, reinterpret_cast<LPARAM>(&row));
  POINT over{row.left + 5, (row.top + row.bottom) / 2};
  ClientToScreen(ListOf(view), &over);
  SetCursorPos(over.x, over.y);
  Command(view, kCmdList);
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_EDIT)[1], L"&Copy") << "a mode change rebuilds too";
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_VIEW)[4], L"List checked");
  Select(view, 0);
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_FILE)[1], L"Delete grey") << "the add row selected";
  ParkCursorAwayFrom(view);
  Last()->UIActivate(SVUIA_ACTIVATE_NOFOCUS);
  EXPECT_EQ(Popup(browser_.Get(), FCIDM_MENU_EDIT), Texts{L"Undo"}) << "without focus the Edit menu is the browser's";
  Last()->UIActivate(SVUIA_DEACTIVATE);
  EXPECT_EQ(browser_->shown, nullptr);

  auto dialog = com::Make<FakeBrowser>(true);
  auto level = Alpha();
  HWND file = Open(level.Get(), FVM_DETAILS, nullptr, dialog.Get());
  Select(file, 0);
  Last()->UIActivate(SVUIA_ACTIVATE_FOCUS);
  EXPECT_EQ(Popup(dialog.Get(), FCIDM_MENU_FILE), (Texts{L"Select default", L"Close"}));
  EXPECT_EQ(Popup(dialog.Get(), FCIDM_MENU_EDIT), (Texts{L"-", L"&Copy", L"&Paste grey"}))
      << "row 0 of a level is its file";
}

// A person opens File, Edit and View on the browser's menu bar with the mouse and chooses an
// entry of each: the popups that open hold the view's entries, and what is chosen is done.
TEST_F(View, EachMenuOpensWithTheViewsEntriesAndRunsWhatIsChosen) {
  HWND view = Open(root_.Get());
  SetWindowPos(browser_->frame, HWND_TOPMOST, 0, 0, 600, 400, SWP_SHOWWINDOW);
  ASSERT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  const auto choose = [&](int popup, UINT id) {
    std::atomic<bool> done{false};
    std::thread person([&] {
      RECT box{};
      GetMenuItemRect(browser_->frame, GetMenu(browser_->frame), popup, &box);
      Mouse(MOUSEEVENTF_LEFTDOWN, {(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      Mouse(MOUSEEVENTF_LEFTUP, {(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      HWND opened = nullptr;
      int at = -1;
      ui::WaitFor([&] {
        HMENU menu = (opened = FindWindowW(L"#32768", nullptr)) && IsWindowVisible(opened)
                         ? reinterpret_cast<HMENU>(SendMessageW(opened, MN_GETHMENU, 0, 0)) : nullptr;
        for (int i = 0; menu && i < GetMenuItemCount(menu); ++i)
          if (GetMenuItemID(menu, i) == id && GetMenuItemRect(nullptr, menu, i, &box)) at = i;
        return at >= 0;
      });
      if (at >= 0) Mouse(MOUSEEVENTF_LEFTDOWN, {(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      if (at >= 0) Mouse(MOUSEEVENTF_LEFTUP, {(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      else SendMessageTimeoutW(browser_->frame, kEndMenu, 0, 0, SMTO_BLOCK, 5000, nullptr);
      done = true;
    });
    PumpUntil([&] { return done.load(); }, 15000);
    person.join();
  };
  Select(view, 1);
  Command(view, kCmdCopy);
  choose(1, kCmdPaste);
  EXPECT_TRUE(PumpUntil([] { return Stored() == Texts{L"Bravo", L"Charlie", L"Copy of alpha", L"alpha"}; }))
      << "Edit, Paste";
  Refilled(view);
  choose(2, kCmdLargeIcons);
  EXPECT_TRUE(PumpUntil([&] { return Mode(Last()) == 1u; })) << "View, Large Icons";
  Select(view, 3);
  choose(0, kCmdDelete);
  EXPECT_TRUE(PumpUntil([] { return Stored() == Texts{L"Bravo", L"Copy of alpha", L"alpha"}; })) << "File, Delete";
  SetWindowPos(browser_->frame, HWND_NOTOPMOST, 0, 0, 0, 0, SWP_NOMOVE | SWP_NOSIZE | SWP_HIDEWINDOW);
  OleSetClipboard(nullptr);
}

// Reads the context menu while it is open, from a second thread, and closes it.
Texts ContextMenu(HWND view, POINT at) {
  Texts entries;
  std::thread person([&] {
    HWND popup = nullptr;
    if (!sheet::WaitFor([&] { return (popup = FindWindowW(L"#32768", nullptr)) && IsWindowVisible(popup); })) return;
    entries = Entries(reinterpret_cast<HMENU>(SendMessageW(popup, MN_GETHMENU, 0, 0)));
    PostMessageW(view, WM_CANCELMODE, 0, 0);
  });
  SendMessageW(view, WM_CONTEXTMENU, reinterpret_cast<WPARAM>(view), MAKELPARAM(at.x, at.y));
  person.join();
  return entries;
}

TEST_F(View, ContextMenuOnEmptySpaceOffersTheFolderCommandsAndModesGreyedAsNeeded) {
  HWND view = Open(root_.Get());
  ParkCursorAwayFrom(view);
  EXPECT_EQ(ContextMenu(view, {300, 250}),
            (Texts{L"Open default grey", L"-", L"Create Digital Level", L"Delete grey", L"Properties grey", L"-",
                   L"Large Icons", L"Small Icons", L"List", L"Details checked", L"-", L"&Copy grey", L"&Paste grey"}));
  Select(view, 1);
  EXPECT_EQ(ContextMenu(view, {-1, -1}), (Texts{L"Open default", L"-", L"Create Digital Level", L"Delete",
                                                L"Properties", L"-", L"&Copy grey", L"&Paste"}))
      << "no modes with a selection";
}


// ---- Across processes ----

// Waits for `process` while this thread goes on dispatching input, messages and the
// calls that come in as messages; ends the process if it takes longer.
DWORD WaitServing(HANDLE process, double seconds) {
  DWORD code = 99;
  if (!PumpUntil([&] { return WaitForSingleObject(process, 0) == WAIT_OBJECT_0; }, static_cast<DWORD>(seconds * 1000)))
    TerminateProcess(process, 99);
  WaitForSingleObject(process, 5000);
  GetExitCodeProcess(process, &code);
  return code;
}

HANDLE Start(std::wstring commandLine) {
  STARTUPINFOW startup{sizeof(startup)};
  PROCESS_INFORMATION info{};
  if (!CreateProcessW(nullptr, commandLine.data(), nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &info))
    return nullptr;
  CloseHandle(info.hThread);
  return info.hProcess;
}

// This test program again, as the peer below: a view of the root and one of a level,
// each in a browser of its own, over the store of this process.
struct Peer {
  explicit Peer(const std::wstring& store) {
    wchar_t exe[MAX_PATH] = {};
    GetModuleFileNameW(nullptr, exe, MAX_PATH);
    SetEnvironmentVariableW(L"MARLIX_VIEW_PEER_STORE", store.c_str());
    process = Start(L"\"" + std::wstring(exe) + L"\" --gtest_also_run_disabled_tests --gtest_filter=View.DISABLED_Peer");
    SetEnvironmentVariableW(L"MARLIX_VIEW_PEER_STORE", nullptr);
    PumpUntil([&] {
      root = FindWindowW(L"ViewTestFrame", L"peer root");
      level = FindWindowW(L"ViewTestFrame", L"peer level");
      return root && level && RootRows() == 4;
    }, 30000);
  }
  ~Peer() {
    if (!process) return;
    PostMessageW(root, kPeerDone, 0, 0);
    EXPECT_EQ(WaitServing(process, 20), 0u) << "the peer's own checks";
    CloseHandle(process);
  }
  HWND RootView() const { return FindWindowExW(root, nullptr, kViewWindowClass, nullptr); }
  int RootRows() const { return static_cast<int>(SendMessageW(ListOf(RootView()), LVM_GETITEMCOUNT, 0, 0)); }
  LRESULT LevelReloads() const { return SendMessageW(level, kReloads, 0, 0); }

  HANDLE process = nullptr;
  HWND root = nullptr, level = nullptr;
};

TEST_F(View, DISABLED_Peer) {
  wchar_t store[MAX_PATH] = {};
  if (!GetEnvironmentVariableW(L"MARLIX_VIEW_PEER_STORE", store, MAX_PATH)) GTEST_SKIP() << "only as a peer";
  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  HKEY shared = nullptr;
  ASSERT_EQ(RegOpenKeyExW(HKEY_CURRENT_USER, store, 0, KEY_ALL_ACCESS, &shared), ERROR_SUCCESS);
  RegOverridePredefKey(HKEY_CURRENT_USER, shared);
  Open(root_.Get());
  auto level = Alpha();
  auto levelBrowser = com::Make<FakeBrowser>();
  Open(level.Get(), FVM_DETAILS, nullptr, levelBrowser.Get());
  SetWindowTextW(levelBrowser->frame, L"peer level");
  SetWindowTextW(browser_->frame, L"peer root");
  EXPECT_TRUE(PumpUntil([] { return peerDone; }, 60000));
  for (auto& view : views_) view->DestroyViewWindow();
  views_.clear();
  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  RegCloseKey(shared);
}

TEST_F(View, AnotherProcessSeesChangesByTheBroadcastAloneAndPastesWhatWasCopiedHere) {
  CStationRecord full;
  full.Name = L"alpha";
  FindStation(full);
  full.Port = 5, full.BaudRate = 4800, full.Parity = 2, full.Manufacturer = L"north line", full.Model = L"HRB1X";
  ASSERT_EQ(UpdateStation(L"alpha", full), S_OK);
  HWND view = Open(root_.Get());
  Peer peer(sandbox_.ScratchPath(HKEY_CURRENT_USER));
  ASSERT_EQ(peer.RootRows(), 4);
  const LRESULT levelReloads = peer.LevelReloads();
  Select(view, 3);
  Command(view, kCmdDelete);
  EXPECT_TRUE(PumpUntil([&] { return peer.RootRows() == 3; })) << "deleted here, gone there";
  AnswerSheets([&] { Command(view, kCmdNewLevel); }, {IDOK});
  EXPECT_TRUE(PumpUntil([&] { return peer.RootRows() == 4; })) << "created here, shown there";
  Refilled(view);
  Select(view, 1);
  Command(view, kCmdCopy);
  PostMessageW(peer.RootView(), WM_COMMAND, kCmdPaste, 0);
  EXPECT_TRUE(PumpUntil([&] { return peer.RootRows() == 5 && Rows(view).size() == 5; })) << "pasted there, shown here";
  PostMessageW(peer.RootView(), WM_COMMAND, kCmdPaste, 0);
  EXPECT_TRUE(PumpUntil([&] { return Rows(view).size() == 6; }));
  auto levels = sheet::StoredLevels();
  for (const wchar_t* copy : {L"Copy of alpha|5|4800|1|2|8|0|1|north line|HRB1X",
                              L"Copy of Copy of alpha|5|4800|1|2|8|0|1|north line|HRB1X"})
    EXPECT_NE(std::find(levels.begin(), levels.end(), copy), levels.end()) << testing::PrintToString(copy);
  EXPECT_EQ(peer.LevelReloads(), levelReloads) << "a view of a level doesn't reload for the root";
  OleSetClipboard(nullptr);
}


}  // namespace
