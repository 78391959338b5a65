// The folder view where no real host shows it: menus, status bar, view state, commands, lifetime, other processes.
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
#include "support/browser_double.h"
#include "support/child_process.h"
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

HWND ListOf(HWND view) { return GetDlgItem(view, kListWindowId); }
HWND AnimationOf(HWND view) { return FindWindowExW(ListOf(view), nullptr, ANIMATE_CLASSW, nullptr); }

Texts Rows(HWND view, bool images = false) { return ListRows(ListOf(view), images); }
void Select(HWND view, int row) { ListView_SetItemState(ListOf(view), row, LVIS_SELECTED, LVIS_SELECTED); }

void Refilled(HWND view) { EXPECT_TRUE(ui::PumpFor([&] { return !AnimationOf(view) && !Rows(view).empty(); })); }

// A root folder over a store of three levels; every view made is closed, every merged menu
// given back and every object let go by the end.
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
    EXPECT_TRUE(ui::PumpFor([&] { return com::ModuleLockCount() == before_; })) << "every object let go";
  }

  // `view` in `browser`, created and, unless told not to, filled.
  HWND Show(IShellView* view, UINT mode = FVM_DETAILS, IShellView* previous = nullptr,
            BrowserDouble* browser = nullptr, bool wait = true) {
    FOLDERSETTINGS settings{mode, 0};
    RECT rect{0, 0, 400, 300};
    HWND window = nullptr;
    EXPECT_EQ(view->CreateViewWindow(previous, &settings, browser ? browser : browser_.Get(), &rect, &window), S_OK);
    views_.emplace_back(view);
    if (window && wait) {
      EXPECT_TRUE(ui::PumpFor([&] { return !AnimationOf(window); })) << "the list is filled";
    }
    return window;
  }
  HWND Open(IShellFolder* folder, UINT mode = FVM_DETAILS, IShellView* previous = nullptr,
            BrowserDouble* browser = nullptr, bool wait = true) {
    com::ComPtr<IShellView> view;
    EXPECT_EQ(folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()), S_OK);
    return Show(view.Get(), mode, previous, browser, wait);
  }
  com::ComPtr<IShellFolder> Alpha(const wchar_t* name = L"alpha") {
    UniqueList alpha = MakeId(PIDL_LEVEL, name);
    return Bind(root_.Get(), alpha.Get());
  }
  IShellView* Last() { return views_.back().Get(); }
  UINT Mode() {
    FOLDERSETTINGS settings{};
    Last()->GetCurrentInfo(&settings);
    return settings.ViewMode;
  }
  void Command(HWND view, UINT id) { SendMessageW(view, WM_COMMAND, id, 0); }

  long before_ = com::ModuleLockCount();
  RegistrySandbox sandbox_;
  com::ComPtr<CMarlixDLShellFolder> root_ = com::Make<CMarlixDLShellFolder>();
  com::ComPtr<BrowserDouble> browser_ = com::Make<BrowserDouble>();
  std::vector<com::ComPtr<IShellView>> views_;
};

const Texts kRootRows = {L"Add New Digital Level", L"alpha", L"Bravo", L"Charlie"};

TEST_F(View, ModesChangeTheListAndOnlyDetailsEnumeratesAgain) {
  HWND view = Open(root_.Get(), 7);
  EXPECT_EQ(Mode(), 1u) << "a mode the view hasn't is shown as Large Icons";
  EXPECT_EQ(SendMessageW(ListOf(view), LVM_GETIMAGELIST, LVSIL_NORMAL, 0),
            reinterpret_cast<LRESULT>(LargeImageList.Get()));
  Command(view, kCmdSmallIcons);
  EXPECT_EQ(Mode(), 2u);
  EXPECT_EQ(browser_->shown, nullptr) << "an inactive view has no menu to rebuild";
  EXPECT_FALSE(AnimationOf(view));
  Command(view, kCmdDetails);
  EXPECT_TRUE(AnimationOf(view)) << "Details enumerates again";
  ASSERT_TRUE(ui::PumpFor([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), kRootRows);
  const std::wstring level = std::to_wstring(IMAGE_LEVEL);
  EXPECT_EQ(Rows(view, true), (Texts{std::to_wstring(IMAGE_ADD_LEVEL), level, level, level}));
  EXPECT_EQ(Rows(Open(Alpha().Get()), true), Texts{std::to_wstring(IMAGE_VIRTUAL_FILE)});
}

// That a view after one of ours keeps its mode is the ExplorerBrowser client's test.
TEST_F(View, ANewViewTakesTheModeOfTheStreamOrOfTheBrowserAndSavesItsMode) {
  browser_->SeedMode(FVM_LIST);
  com::ComPtr<IShellFolder> desktop;
  com::ComPtr<IShellView> foreign;  // Wine's own view of the desktop
  ASSERT_EQ(SHGetDesktopFolder(desktop.Put()), S_OK);
  ASSERT_EQ(desktop->CreateViewObject(nullptr, IID_IShellView, foreign.PutVoid()), S_OK);
  Open(root_.Get(), FVM_DETAILS, foreign.Get());
  EXPECT_EQ(Mode(), 3u) << "after a foreign view, from the stream";
  Open(root_.Get(), FVM_DETAILS);
  EXPECT_EQ(Mode(), 4u) << "first view of the browser";
  Open(root_.Get(), FVM_LIST);
  EXPECT_EQ(Last()->SaveViewState(), S_OK);
  EXPECT_EQ(browser_->StoredMode(), 3u);
}

TEST_F(View, ActivationShowsTheRootNameAndTheFolderAddressInTheStatusBar) {
  const std::wstring longest(kMaxStationNameLength, L'n');
  SeedLevel(3, longest);
  Open(Alpha(longest.c_str()).Get());
  Last()->UIActivate(SVUIA_ACTIVATE_NOFOCUS);
  EXPECT_EQ(browser_->status, (Texts{L"parts 1 -1", L"Marlix Digital Levels: \\Marlix Digital Levels\\" + longest}));
}

TEST_F(View, ColumnClicksSortBothWaysForEveryViewWithTheAddRowFirst) {
  HWND view = Open(root_.Get());
  SortColumn = 1, SortDirection = 1;
  NMLISTVIEW click{{ListOf(view), kListWindowId, LVN_COLUMNCLICK}, -1, 0};
  SendMessageW(view, WM_NOTIFY, kListWindowId, reinterpret_cast<LPARAM>(&click));
  EXPECT_EQ(Rows(view), (Texts{L"Add New Digital Level", L"Charlie", L"Bravo", L"alpha"}));
  Last()->Refresh();
  Refilled(view);
  EXPECT_EQ(Rows(view), kRootRows) << "a refill sorts by the folder's order";
  HWND second = Open(root_.Get());
  SendMessageW(second, WM_NOTIFY, kListWindowId, reinterpret_cast<LPARAM>(&click));
  EXPECT_EQ(Rows(second), kRootRows) << "the state is the process's, so the next click turns it back";
}

// The thread has read the store and posted its result when a level comes and a refresh with it.
TEST_F(View, ARefreshWhileTheThreadRunsShowsWhatCameMeanwhile) {
  HWND view = Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, false);
  MSG posted;
  ASSERT_TRUE(ui::WaitFor([&] { return PeekMessageW(&posted, view, GetEnumIDListMessage, GetEnumIDListMessage, PM_NOREMOVE); }));
  SeedLevel(3, L"Delta");
  EXPECT_EQ(Last()->Refresh(), S_OK);
  ASSERT_TRUE(ui::PumpFor([&] { return !AnimationOf(view); }));
  EXPECT_EQ(Rows(view), (Texts{L"Add New Digital Level", L"alpha", L"Bravo", L"Charlie", L"Delta"}));
}

// What a view could leak, as Wine counts it (it answers 0 to GetGuiResources and
// GetProcessHandleCount): module locks, threads, kernel handles, windows of this thread.
struct Resources {
  long locks = com::ModuleLockCount(), threads = ThreadCount(), handles = KernelHandleCount(), windows = 0;
  Resources() {
    EnumThreadWindows(GetCurrentThreadId(), [](HWND window, LPARAM n) {
      ++*reinterpret_cast<long*>(n);
      EnumChildWindows(window, [](HWND, LPARAM m) { return ++*reinterpret_cast<long*>(m), TRUE; }, n);
      return TRUE;
    }, reinterpret_cast<LPARAM>(&windows));
  }
};

// A thousand view windows: each of 500 views is closed once while its thread still runs, and
// its window, made again, fills.
TEST_F(View, AThousandViewWindowsOpenedAndClosedLeaveNothingBehind) {
  Open(root_.Get());  // first-use costs (classes, image lists, clip) before counting
  const Resources start;
  for (int i = 0; i < 500; ++i) {
    ASSERT_TRUE(AnimationOf(Open(root_.Get(), FVM_DETAILS, nullptr, nullptr, false)));
    Last()->DestroyViewWindow();
    ASSERT_EQ(Rows(Show(Last())), kRootRows);
    Last()->DestroyViewWindow();
    views_.resize(1);
  }
  ASSERT_TRUE(ui::PumpFor([&] { return com::ModuleLockCount() == start.locks && ThreadCount() <= start.threads; }));
  const Resources end;
  EXPECT_LE(end.handles, start.handles + 5) << "kernel handles";
  EXPECT_EQ(end.windows, start.windows) << "windows";
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
    for (HWND window = nullptr; !done; window = nullptr) {
      if (!ui::WaitFor([&] { return done || (window = ui::OwnedDialog(nullptr)) != nullptr; }) || !window) continue;
      names.push_back(ui::Text(sheet::Page(window, 0), IDC_STATION_NAME));
      user::Click(window, next < buttons.size() ? buttons[next++] : IDCANCEL);
      ui::WaitFor([&] { return !IsWindow(window); });
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

void ParkCursorAwayFrom(HWND view) {
  RECT r{};
  GetWindowRect(view, &r);
  SetCursorPos(r.right + 50, r.bottom + 50);
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
}

// Puts a "Marlix Total Stations" block on the clipboard as another process would.
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
  auto rootBrowser = com::Make<BrowserDouble>();
  Open(root_.Get(), FVM_DETAILS, nullptr, rootBrowser.Get());
  auto level = Alpha();
  HWND first = Open(level.Get());
  auto secondBrowser = com::Make<BrowserDouble>();
  HWND second = Open(level.Get(), FVM_DETAILS, nullptr, secondBrowser.Get());
  Command(first, kCmdDelete);
  EXPECT_EQ(browser_->reloads, 0) << "nothing selected: nothing at all";
  Select(first, 0);
  Command(first, kCmdDelete);
  ClipStations({Record(L"One"), Record(L"Two")});
  Command(first, kCmdPaste);
  OleSetClipboard(nullptr);
  EXPECT_EQ(Stored(), (Texts{L"Bravo", L"Charlie", L"alpha"})) << "levels are deleted and pasted in the root only";
  EXPECT_TRUE(ui::PumpFor([&] { return secondBrowser->reloads == 2; })) << "each change heard by the other view";
  Refilled(second);
  EXPECT_EQ(rootBrowser->reloads, 0) << "the root view hears only changes of the root";
}

// The entries and states a user sees as each popup opens.
TEST_F(View, MergedMenuStatesAreFreshAtEachOpening) {
  HWND view = Open(root_.Get());
  ParkCursorAwayFrom(view);
  ASSERT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_FILE).at(1), L"Delete grey") << "nothing selected";
  Select(view, 2);
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_EDIT), (Texts{L"-", L"&Copy grey", L"&Paste"})) << "mouse not over a level";
  RECT row{LVIR_BOUNDS};
  SendMessageW(ListOf(view), LVM_GETITEMRECT, 1, reinterpret_cast<LPARAM>(&row));
  POINT over{row.left + 5, (row.top + row.bottom) / 2};
  ClientToScreen(ListOf(view), &over);
  SetCursorPos(over.x, over.y);
  Command(view, kCmdList);
  EXPECT_EQ(Mode(), UINT{FVM_LIST});
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_EDIT).at(1), L"&Copy") << "a mode change rebuilds too";
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_VIEW).at(4), L"List checked");
  Select(view, 0);
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_FILE).at(1), L"Delete grey") << "the add row selected";
  Last()->UIActivate(SVUIA_ACTIVATE_NOFOCUS);
  EXPECT_EQ(browser_->Popup(FCIDM_MENU_EDIT), Texts{L"Undo"}) << "without focus the Edit menu is the browser's";
  Last()->UIActivate(SVUIA_DEACTIVATE);
  EXPECT_EQ(browser_->shown, nullptr);
}

// Reads the context menu while it is open, from a second thread, and closes it.
Texts ContextMenu(HWND view, POINT at) {
  Texts entries;
  std::thread person([&] {
    HWND popup = nullptr;
    if (!ui::WaitFor([&] { return (popup = FindWindowW(L"#32768", nullptr)) && IsWindowVisible(popup); })) return;
    entries = MenuEntries(reinterpret_cast<HMENU>(SendMessageW(popup, MN_GETHMENU, 0, 0)));
    PostMessageW(view, WM_CANCELMODE, 0, 0);
  });
  SendMessageW(view, WM_CONTEXTMENU, reinterpret_cast<WPARAM>(view), MAKELPARAM(at.x, at.y));
  person.join();
  return entries;
}

bool Has(const Texts& entries, const wchar_t* entry) {
  return std::find(entries.begin(), entries.end(), entry) != entries.end();
}

// A person opens File, Edit and View on the frame's bar with the mouse: the menu loop shows
// each popup with the view's entries, and the one chosen runs.
TEST_F(View, EachMenuOpensWithTheViewsEntriesAndRunsWhatIsChosen) {
  HWND view = Open(root_.Get());
  SetWindowPos(browser_->frame, HWND_TOPMOST, 0, 0, 600, 400, SWP_SHOWWINDOW);
  ASSERT_EQ(Last()->UIActivate(SVUIA_ACTIVATE_FOCUS), S_OK);
  const auto choose = [&](int popup, UINT id) {
    std::atomic<bool> done{false};
    std::thread person([&] {
      RECT box{};
      GetMenuItemRect(browser_->frame, GetMenu(browser_->frame), popup, &box);
      ui::Click({(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      const bool shown = ui::WaitFor([&] {
        HMENU menu = reinterpret_cast<HMENU>(SendMessageW(FindWindowW(L"#32768", nullptr), MN_GETHMENU, 0, 0));
        for (int i = 0; menu && i < GetMenuItemCount(menu); ++i)  // the rectangle only once it is shown
          if (GetMenuItemID(menu, i) == id) return GetMenuItemRect(nullptr, menu, i, &box) != FALSE;
        return false;
      });
      if (shown) ui::Click({(box.left + box.right) / 2, (box.top + box.bottom) / 2});
      else PostMessageW(browser_->frame, WM_CANCELMODE, 0, 0);  // ends the menu loop a failed choice left open
      done = true;
    });
    ui::PumpFor([&] { return done.load(); }, 15000);
    person.join();
  };
  Select(view, 1);
  Command(view, kCmdCopy);
  choose(1, kCmdPaste);
  EXPECT_TRUE(ui::PumpFor([] { return Stored() == Texts{L"Bravo", L"Charlie", L"Copy of alpha", L"alpha"}; }))
      << "Edit, Paste";
  Refilled(view);
  choose(2, kCmdLargeIcons);
  EXPECT_TRUE(ui::PumpFor([&] { return Mode() == 1u; })) << "View, Large Icons";
  Select(view, 3);
  choose(0, kCmdDelete);
  EXPECT_TRUE(ui::PumpFor([] { return Stored() == Texts{L"Bravo", L"Copy of alpha", L"alpha"}; })) << "File, Delete";
  OleSetClipboard(nullptr);
}

TEST_F(View, ContextMenuOffersModesOnlyOnEmptySpaceAndLevelCommandsOnlyForALevel) {
  HWND view = Open(root_.Get());
  ParkCursorAwayFrom(view);
  EXPECT_TRUE(Has(ContextMenu(view, {300, 250}), L"Details checked"));
  Select(view, 1);
  const Texts level = ContextMenu(view, {-1, -1});
  EXPECT_FALSE(Has(level, L"Large Icons")) << "no modes with a selection";
  EXPECT_TRUE(Has(level, L"Delete"));
}

// ---- Across processes ----

// This test program again, as the peer below: a view of the root in a browser of its own,
// over the store of this process. That a level's view ignores changes of the root is the test above's.
struct Peer {
  // The peer finds the store in the environment it inherits.
  explicit Peer(const std::wstring& store)
      : process((SetEnvironmentVariableW(L"MARLIX_VIEW_PEER_STORE", store.c_str()), child::SelfPath()),
                {L"--gtest_also_run_disabled_tests", L"--gtest_filter=View.DISABLED_Peer"}) {
    ui::PumpFor([&] {
      root = FindWindowW(BrowserDouble::kClass, L"peer root");
      return root && RootRows() == 4;
    }, 30000);
  }
  ~Peer() {
    PostMessageW(root, WM_COMMAND, IDCLOSE, 0);
    ui::PumpFor([&] { return process.ExitCode() != child::Process::kNotEnded; }, 20000);
    EXPECT_EQ(process.ExitCode(), 0u) << "the peer's own checks";
  }
  HWND RootView() const { return FindWindowExW(root, nullptr, kViewWindowClass, nullptr); }
  int RootRows() const { return static_cast<int>(SendMessageW(ListOf(RootView()), LVM_GETITEMCOUNT, 0, 0)); }

  child::Process process;
  HWND root = nullptr;
};

TEST_F(View, DISABLED_Peer) {
  wchar_t store[MAX_PATH] = {};
  if (!GetEnvironmentVariableW(L"MARLIX_VIEW_PEER_STORE", store, MAX_PATH)) GTEST_SKIP() << "only as a peer";
  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  HKEY shared = nullptr;
  ASSERT_EQ(RegOpenKeyExW(HKEY_CURRENT_USER, store, 0, KEY_ALL_ACCESS, &shared), ERROR_SUCCESS);
  RegOverridePredefKey(HKEY_CURRENT_USER, shared);
  Open(root_.Get());
  SetWindowTextW(browser_->frame, L"peer root");
  const auto& commands = browser_->commands;
  EXPECT_TRUE(ui::PumpFor([&] { return std::count(commands.begin(), commands.end(), WPARAM{IDCLOSE}) > 0; }, 60000));
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
  Select(view, 3);
  Command(view, kCmdDelete);
  EXPECT_TRUE(ui::PumpFor([&] { return peer.RootRows() == 3; })) << "deleted here, gone there";
  AnswerSheets([&] { Command(view, kCmdNewLevel); }, {IDOK});
  EXPECT_TRUE(ui::PumpFor([&] { return peer.RootRows() == 4; })) << "created here, shown there";
  Refilled(view);
  Select(view, 1);
  Command(view, kCmdCopy);
  PostMessageW(peer.RootView(), WM_COMMAND, kCmdPaste, 0);
  EXPECT_TRUE(ui::PumpFor([&] { return peer.RootRows() == 5 && Rows(view).size() == 5; })) << "pasted there, shown here";
  PostMessageW(peer.RootView(), WM_COMMAND, kCmdPaste, 0);
  EXPECT_TRUE(ui::PumpFor([&] { return Rows(view).size() == 6; }));
  auto levels = sheet::StoredLevels();
  for (const wchar_t* copy : {L"Copy of alpha|5|4800|1|2|8|0|1|north line|HRB1X",
                              L"Copy of Copy of alpha|5|4800|1|2|8|0|1|north line|HRB1X"})
    EXPECT_NE(std::find(levels.begin(), levels.end(), copy), levels.end()) << testing::PrintToString(copy);
  OleSetClipboard(nullptr);
}

}  // namespace
