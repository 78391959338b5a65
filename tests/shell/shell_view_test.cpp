// The folder view in a browser of our own: only for what no real host shows (the status
// bar, the view state stream, item objects, failing browsers), and for its lifetime.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>
#include <tlhelp32.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>

#include "base/window_messages.h"
#include "server/class_creators.h"
#include "shell/item_services.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "server/class_creators.h"
#include "shell/shell_view.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {
using Texts = std::vector<std::wstring>;

// Dispatches messages until `done` holds or `seconds` pass.
bool PumpUntil(const std::function<bool()>& done, double seconds = 10) {
  auto end = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
  while (!done()) {
    if (std::chrono::steady_clock::now() > end) return false;
    MsgWaitForMultipleObjects(0, nullptr, FALSE, 10, QS_ALLINPUT);
    MSG msg;
    while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&msg);
  }
  return true;
}

int ThreadCount() {
  HANDLE snapshot = CreateToolhelp32Snapshot(TH32CS_SNAPTHREAD, 0);
  THREADENTRY32 entry{sizeof(entry)};
  int count = 0;
  for (BOOL more = Thread32First(snapshot, &entry); more; more = Thread32Next(snapshot, &entry))
    count += entry.th32OwnerProcessID == GetCurrentProcessId();
  CloseHandle(snapshot);
  return count;
}

// The browser's window records the commands sent to it.
std::vector<WPARAM> frameCommands;
LRESULT CALLBACK FrameProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  if (message == WM_COMMAND) frameCommands.push_back(wParam);
  return DefWindowProcW(window, message, wParam, lParam);
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
  bool windowFails = false, hasStream = true;
  HRESULT browseResult = S_OK;
  Texts status;
  std::vector<std::pair<IdList, UINT>> browsed;
  int defaultCommands = 0, selectionChanges = 0;
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
    *window = windowFails ? nullptr : frame;
    return windowFails ? E_FAIL : S_OK;
  }
  STDMETHODIMP ContextSensitiveHelp(BOOL) override { return E_NOTIMPL; }
  STDMETHODIMP InsertMenusSB(HMENU, LPOLEMENUGROUPWIDTHS) override { return S_OK; }
  STDMETHODIMP SetMenuSB(HMENU, HOLEMENU, HWND) override { return S_OK; }
  STDMETHODIMP RemoveMenusSB(HMENU) override { return S_OK; }
  STDMETHODIMP SetStatusTextSB(LPCWSTR) override { return S_OK; }
  STDMETHODIMP EnableModelessSB(BOOL) override { return S_OK; }
  STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) override { return S_FALSE; }
  STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE list, UINT flags) override {
    browsed.emplace_back(Ids(list), flags);
    return browseResult;
  }
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
  STDMETHODIMP OnDefaultCommand(IShellView*) override { ++defaultCommands; return S_OK; }
  STDMETHODIMP OnStateChange(IShellView*, ULONG change) override { selectionChanges += change == CDBOSC_SELCHANGE; return S_OK; }
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

Texts Rows(HWND view) {
  Texts rows;
  HWND list = ListOf(view);
  int count = static_cast<int>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0));
  for (int i = 0; i < count; ++i) {
    wchar_t text[MAX_PATH] = {};
    LVITEMW item{};
    item.pszText = text;
    item.cchTextMax = MAX_PATH;
    SendMessageW(list, LVM_GETITEMTEXTW, i, reinterpret_cast<LPARAM>(&item));
    rows.push_back(text);
  }
  return rows;
}

std::vector<int> Images(HWND view) {
  std::vector<int> images;
  HWND list = ListOf(view);
  int count = static_cast<int>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0));
  for (int i = 0; i < count; ++i) {
    LVITEMW item{};
    item.mask = LVIF_IMAGE;
    item.iItem = i;
    SendMessageW(list, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&item));
    images.push_back(item.iImage);
  }
  return images;
}

// Adds `row` to the selection; -1 clears it.
void Select(HWND view, int row) {
  LVITEMW item{};
  item.stateMask = LVIS_SELECTED;
  item.state = row < 0 ? 0 : LVIS_SELECTED;
  SendMessageW(ListOf(view), LVM_SETITEMSTATE, row, reinterpret_cast<LPARAM>(&item));
}

DWORD Style(HWND view) { return static_cast<DWORD>(GetWindowLongW(ListOf(view), GWL_STYLE)); }

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
    browser_.Reset();
    root_.Reset();
    EXPECT_TRUE(PumpUntil([&] { return com::ModuleLockCount() == before_; })) << "every object let go";
  }

  // A view of `folder` in `browser`, created and, unless told not to, filled.
  HWND Open(IShellFolder* folder, UINT mode = FVM_DETAILS, IShellView* previous = nullptr,
            FakeBrowser* browser = nullptr, bool wait = true, HRESULT expected = S_OK) {
    browser = browser ? browser : browser_.Get();
    com::ComPtr<IShellView> view;
    EXPECT_EQ(folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()), S_OK);
    FOLDERSETTINGS settings{mode, 0};
    RECT rect{0, 0, 400, 300};
    HWND window = nullptr;
    EXPECT_EQ(view->CreateViewWindow(previous, &settings, browser, &rect, &window), expected);
    views_.push_back(view);
    if (window && wait) {
      EXPECT_TRUE(PumpUntil([&] { return !AnimationOf(window); })) << "the list is filled";
    }
    return window;
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

TEST_F(View, RootShowsTheAddRowFirstThenTheLevelsInOrderFromAThreadBehindTheClip) {
  HWND view = Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, false);
  ASSERT_TRUE(view);
  HWND clip = AnimationOf(view);
  ASSERT_TRUE(clip) << "the clip plays while the thread runs";
  EXPECT_EQ(GetDlgCtrlID(clip), 1300);
  EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(clip, GWL_STYLE)) & ~WS_DISABLED, 0x50000007u);
  // Wine's control can't say whether it plays: open the module's clip in one of our own.
  HWND probe = CreateWindowExW(0, ANIMATE_CLASSW, nullptr, WS_CHILD, 0, 0, 80, 50, view, nullptr, nullptr, nullptr);
  EXPECT_TRUE(SendMessageW(probe, ACM_OPENW, reinterpret_cast<WPARAM>(GetModuleHandleW(nullptr)),
                           reinterpret_cast<LPARAM>(MAKEINTRESOURCEW(103)))) << "resource 103 is a clip the control reads";
  DestroyWindow(probe);
  EXPECT_EQ(Rows(view), Texts{}) << "CreateViewWindow returns before the store is read";
  EXPECT_TRUE(GetPropW(ListOf(view), L"OleDropTargetInterface")) << "the list takes drops";
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), kRootRows);
  EXPECT_EQ(Images(view), (std::vector<int>{IMAGE_ADD_LEVEL, IMAGE_LEVEL, IMAGE_LEVEL, IMAGE_LEVEL}));
}

TEST_F(View, LevelShowsItsVirtualFileAndNoAddRow) {
  UniqueList alpha = MakeId(PIDL_LEVEL, L"alpha");
  auto level = Bind(root_.Get(), alpha.Get());
  HWND view = Open(level.Get());
  EXPECT_EQ(Rows(view), Texts{L"file1.tkf"});
  EXPECT_EQ(Images(view), std::vector<int>{IMAGE_VIRTUAL_FILE});
}

TEST_F(View, EachModeHasItsStyleAndPicturesAndAnUnknownModeIsLargeIcons) {
  const std::pair<UINT, DWORD> modes[] = {{1, 0x50010148}, {2, 0x5001014A}, {3, 0x5001014B}, {4, 0x50010149}, {7, 0x50010148}};
  for (auto [mode, style] : modes) {
    HWND view = Open(root_.Get(), mode);
    EXPECT_EQ(Style(view), style) << mode;
    bool large = style == 0x50010148;
    EXPECT_EQ(SendMessageW(ListOf(view), LVM_GETIMAGELIST, large ? LVSIL_NORMAL : LVSIL_SMALL, 0),
              reinterpret_cast<LRESULT>(large ? LargeImageList : SmallImageList)) << mode;
    EXPECT_EQ(Rows(view), kRootRows) << mode;
  }
  EXPECT_EQ(Mode(Last()), 1u) << "the browser is told the mode the view really shows";
}

TEST_F(View, DetailsHasOneNameColumnAtTheSharedWidth) {
  ColumnWidths[0] = 123;
  HWND view = Open(root_.Get(), FVM_DETAILS);
  HWND list = ListOf(view);
  wchar_t text[32] = {};
  LVCOLUMNW column{LVCF_TEXT | LVCF_WIDTH};
  column.pszText = text;
  column.cchTextMax = 32;
  ASSERT_TRUE(SendMessageW(list, LVM_GETCOLUMNW, 0, reinterpret_cast<LPARAM>(&column)));
  EXPECT_STREQ(text, L"Name");
  EXPECT_EQ(column.cx, 123);
  EXPECT_FALSE(SendMessageW(list, LVM_GETCOLUMNW, 1, reinterpret_cast<LPARAM>(&column)));
  SendMessageW(list, LVM_SETCOLUMNWIDTH, 0, 77);
  NMHEADERW track{{list, 0, HDN_ENDTRACKW}};
  SendMessageW(view, WM_NOTIFY, 0, reinterpret_cast<LPARAM>(&track));
  EXPECT_EQ(ColumnWidths[0], 77) << "a dragged width is kept for the next view";
  ColumnWidths[0] = ColumnWidths[1] = 100;
}

TEST_F(View, ModeCommandsRestyleTheListAndOnlyDetailsEnumeratesAgain) {
  HWND view = Open(root_.Get(), FVM_ICON);
  Command(view, kCmdSmallIcons);
  EXPECT_EQ(Style(view), 0x5001014Au);
  EXPECT_EQ(Mode(Last()), 2u);
  EXPECT_FALSE(AnimationOf(view));
  Command(view, kCmdList);
  EXPECT_EQ(Style(view), 0x5001014Bu);
  Command(view, kCmdDetails);
  EXPECT_EQ(Style(view), 0x50010149u);
  EXPECT_TRUE(AnimationOf(view)) << "Details enumerates again";
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), kRootRows);
  Command(view, kCmdLargeIcons);
  EXPECT_EQ(Style(view), 0x50010148u);
  EXPECT_EQ(Rows(view), kRootRows);
}

TEST_F(View, ANewViewTakesTheModeOfOursOrOfTheStreamOrOfTheBrowser) {
  Open(root_.Get(), FVM_SMALLICON);
  IShellView* ours = Last();
  browser_->SeedMode(FVM_LIST);
  Open(root_.Get(), FVM_DETAILS, ours);
  EXPECT_EQ(Mode(Last()), 2u) << "after one of ours";
  // A foreign view: Wine's own view of the desktop.
  com::ComPtr<IShellFolder> desktop;
  com::ComPtr<IShellView> other;
  ASSERT_EQ(SHGetDesktopFolder(desktop.Put()), S_OK);
  ASSERT_EQ(desktop->CreateViewObject(nullptr, IID_IShellView, other.PutVoid()), S_OK);
  Open(root_.Get(), FVM_DETAILS, other.Get());
  EXPECT_EQ(Mode(Last()), 3u) << "after a foreign view, from the stream";
  Open(root_.Get(), FVM_DETAILS);
  EXPECT_EQ(Mode(Last()), 4u) << "first view of the browser";
  browser_->hasStream = false;
  Open(root_.Get(), FVM_DETAILS, other.Get());
  EXPECT_EQ(Mode(Last()), 4u) << "no stream";
}

TEST_F(View, SaveViewStateWritesTheModeOnly) {
  Open(root_.Get(), FVM_LIST);
  EXPECT_EQ(Last()->SaveViewState(), S_OK);
  EXPECT_EQ(browser_->StoredMode(), 3u);
  browser_->hasStream = false;
  EXPECT_EQ(Last()->SaveViewState(), E_FAIL);
}

TEST_F(View, ActivationShowsTheRootNameAndTheFolderAddressInTheStatusBar) {
  Open(root_.Get());
  EXPECT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(Last()->UIActivate(SVUIA_DEACTIVATE), S_OK);
  UniqueList alpha = MakeId(PIDL_LEVEL, L"alpha");
  auto level = Bind(root_.Get(), alpha.Get());
  Open(level.Get());
  Last()->UIActivate(SVUIA_ACTIVATE_NOFOCUS);
  EXPECT_EQ(browser_->status, (Texts{L"parts 1 -1", L"Marlix Digital Levels: \\Marlix Digital Levels",
                                     L"parts 1 -1", L"Marlix Digital Levels: \\Marlix Digital Levels\\alpha"}));
}

TEST_F(View, ItemObjectIsOfTheFirstSelectedRowOrOfRowZero) {
  HWND view = Open(root_.Get());
  com::ComPtr<IDataObject> data;
  EXPECT_EQ(Last()->GetItemObject(SVGIO_BACKGROUND, IID_IDataObject, data.PutVoid()), E_NOINTERFACE);
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

TEST_F(View, ABroadcastOfItsFolderTypeReloadsItAndTheBrowser) {
  HWND view = Open(root_.Get());
  UniqueList alpha = MakeId(PIDL_LEVEL, L"alpha");
  auto level = Bind(root_.Get(), alpha.Get());
  HWND levelView = Open(level.Get());
  SeedLevel(3, L"Delta");
  frameCommands.clear();
  SendMessageW(view, GlobalNotifyMessage, 0, PIDL_ROOT);
  SendMessageW(view, GlobalNotifyMessage, 1, PIDL_LEVEL);
  EXPECT_EQ(Rows(view), kRootRows) << "another wParam or folder type changes nothing";
  BroadcastChange(PIDL_ROOT);
  ASSERT_TRUE(PumpUntil([&] { return Rows(view).size() == 5; })) << "heard through the hidden window";
  EXPECT_EQ(Rows(view).back(), L"Delta");
  EXPECT_EQ(frameCommands, std::vector<WPARAM>{kCmdBrowserRefresh});
  EXPECT_EQ(Rows(levelView), Texts{L"file1.tkf"});
}

TEST_F(View, RefreshWhileTheThreadRunsStartsNoSecondThread) {
  HWND view = Open(root_.Get());
  for (int i = 0; i < 3; ++i) EXPECT_EQ(Last()->Refresh(), S_OK);
  EXPECT_EQ(Rows(view), Texts{});
  ASSERT_TRUE(PumpUntil([&] { return !AnimationOf(view); }));
  PumpUntil([] { return false; }, 0.2);
  EXPECT_EQ(Rows(view), kRootRows);
}

TEST_F(View, ActivatingALevelBrowsesIntoItAndTheFileIsTheDialogsDefaultCommand) {
  HWND view = Open(root_.Get());
  Command(view, kCmdActivate);
  Select(view, 0);
  Command(view, kCmdActivate);
  EXPECT_TRUE(browser_->browsed.empty()) << "nothing, or the add row, selected";
  Select(view, -1);
  Select(view, 1);
  Select(view, 3);
  Command(view, kCmdActivate);
  ASSERT_EQ(browser_->browsed.size(), 1u);
  EXPECT_EQ(browser_->browsed[0].first, (IdList{{PIDL_LEVEL, L"alpha"}})) << "the first selected row";
  EXPECT_EQ(browser_->browsed[0].second, static_cast<UINT>(SBSP_RELATIVE));

  auto dialog = com::Make<FakeBrowser>(true);
  dialog->browseResult = E_FAIL;
  UniqueList alpha = MakeId(PIDL_LEVEL, L"alpha");
  auto level = Bind(root_.Get(), alpha.Get());
  HWND file = Open(level.Get(), FVM_DETAILS, nullptr, dialog.Get());
  Select(file, 0);
  EXPECT_GE(dialog->selectionChanges, 1);
  Command(file, kCmdActivate);
  EXPECT_EQ(dialog->defaultCommands, 1);
  browser_->browseResult = E_FAIL;
  Command(view, kCmdActivate);
  EXPECT_EQ(dialog->defaultCommands, 1) << "only a file dialog has a default command";
}

TEST_F(View, FailingEnumerationLeavesTheListEmptyWithoutTheAddRow) {
  auto folder = com::Make<FailingFolder>();
  auto view = com::Make<CMarlixDLShellView>();
  UniqueList rootList(CPidlMgr().CreateRoot());
  ASSERT_EQ(view->Init(folder.Get(), rootList.Get()), S_OK);
  FOLDERSETTINGS settings{FVM_DETAILS, 0};
  RECT rect{0, 0, 400, 300};
  HWND window = nullptr;
  ASSERT_EQ(view->CreateViewWindow(nullptr, &settings, browser_.Get(), &rect, &window), S_OK);
  EXPECT_TRUE(PumpUntil([&] { return !AnimationOf(window); }));
  EXPECT_EQ(Rows(window), Texts{});
  view->UIActivate(SVUIA_ACTIVATE_FOCUS);
  EXPECT_EQ(browser_->status.back(), L"Marlix Digital Levels: ") << "a folder not of ours has no address";
  EXPECT_EQ(view->DestroyViewWindow(), S_OK);
}

TEST_F(View, ABrowserWithoutAWindowGetsNoView) {
  browser_->windowFails = true;
  EXPECT_FALSE(Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, true, E_FAIL));
}

// Made by its class object, a view has no folder: its window opens on an empty list and
// takes no drop.
TEST_F(View, AViewWithoutAFolderOpensEmpty) {
  com::ComPtr<IShellView> view;
  ASSERT_EQ(CreateMarlixDLShellView(IID_IShellView, view.PutVoid()), S_OK);
  FOLDERSETTINGS settings{FVM_DETAILS, 0};
  RECT rect{0, 0, 400, 300};
  HWND window = nullptr;
  ASSERT_EQ(view->CreateViewWindow(nullptr, &settings, browser_.Get(), &rect, &window), S_OK);
  views_.push_back(view);
  EXPECT_EQ(SendMessageW(ListOf(window), LVM_GETITEMCOUNT, 0, 0), 0);
  EXPECT_FALSE(AnimationOf(window)) << "nothing to enumerate";
  auto* target = static_cast<IDropTarget*>(GetPropW(ListOf(window), L"OleDropTargetInterface"));
  ASSERT_TRUE(target);
  DWORD effect = 0;
  EXPECT_EQ(target->DragOver(0, {10, 10}, &effect), E_INVALIDARG);
  EXPECT_EQ(view->Refresh(), S_OK);
}

TEST_F(View, LevelsWithOddNamesListAsTheFolderEnumeratesThem) {
  RegWriteDword(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station 3", L"Port", 2);  // no "Name"
  SeedLevel(4, std::wstring(259, L'x'));
  SeedLevel(5, std::wstring(260, L'y'));
  SeedLevel(6, L"North\\South");
  HWND view = Open(root_.Get());
  Texts rows = Rows(view);
  EXPECT_EQ(rows.size(), Enum(root_.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS).size() + 1);
  EXPECT_EQ(rows[0], L"Add New Digital Level");
}

TEST_F(View, AViewClosedWhileItsThreadRunsLeavesNothingBehind) {
  int threads = ThreadCount();
  for (int i = 0; i < 20; ++i) {
    HWND window = Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, false);
    ASSERT_TRUE(AnimationOf(window));
    views_.back()->DestroyViewWindow();
    views_.pop_back();
  }
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

  static long KernelHandles() {
    using Query = LONG(WINAPI*)(ULONG, void*, ULONG, ULONG*);
    auto query = reinterpret_cast<Query>(
        reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQuerySystemInformation")));
    struct Entry { ULONG pid; BYTE type, flags; USHORT value; void* object; ULONG access; };
    std::vector<BYTE> buffer(1 << 20);
    ULONG size = 0;
    while (query(16 /* SystemHandleInformation */, buffer.data(), static_cast<ULONG>(buffer.size()), &size) ==
           static_cast<LONG>(0xC0000004))
      buffer.resize(buffer.size() * 2);
    ULONG count = *reinterpret_cast<ULONG*>(buffer.data());
    auto* entries = reinterpret_cast<Entry*>(buffer.data() + sizeof(void*));
    long mine = 0;
    for (ULONG i = 0; i < count && sizeof(void*) + (i + 1) * sizeof(Entry) <= buffer.size(); ++i)
      mine += entries[i].pid == GetCurrentProcessId();
    return mine;
  }
  static long GdiObjects() {
    struct Entry { UINT64 object; USHORT pid, count, unique; BYTE type, flags; UINT64 user; };
    static_assert(sizeof(Entry) == 24);
    // PEB at TEB+0x60, its GdiSharedHandleTable at +0xF8 (64-bit layouts).
    BYTE* peb = *reinterpret_cast<BYTE**>(reinterpret_cast<BYTE*>(NtCurrentTeb()) + 0x60);
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
  static Resources Now() { return {com::ModuleLockCount(), ThreadCount(), KernelHandles(), GdiObjects(), Windows()}; }
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

}  // namespace
