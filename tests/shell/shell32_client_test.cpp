// The registered folder as Wine's own shell32, ExplorerBrowser and Open dialog show it to a person, keys and all.
#include "shell/shell_test_util.h"

#include <gtest/gtest.h>
#include <shellapi.h>
#include <commctrl.h>
#include <commdlg.h>

#include <atomic>
#include <functional>
#include <thread>

#include "config/sheet_driver.h"
#include "support/registry_sandbox.h"

namespace {
// Listing and parsing names are the ExplorerBrowser's and the Open dialog's below.
TEST(Shell32Client, ShowsALevelUnderMyComputerWithItsNameAttributesIconAndTip) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"North Site");
  com::ComPtr<IShellFolder> desktop, parent;
  ASSERT_EQ(SHGetDesktopFolder(desktop.Put()), S_OK);
  std::wstring path = std::wstring(kFolderPath) + L"\\North Site";
  UniqueList absolute;
  ASSERT_EQ(desktop->ParseDisplayName(nullptr, nullptr, path.data(), nullptr, absolute.Put(), nullptr), S_OK);
  EXPECT_EQ(Name(desktop.Get(), absolute.Get(), SHGDN_INFOLDER), L"North Site") << "the desktop finds our folder";
  SHFILEINFOW info{};
  ASSERT_NE(SHGetFileInfoW(reinterpret_cast<LPCWSTR>(absolute.Get()), 0, &info, sizeof(info),
                           SHGFI_PIDL | SHGFI_DISPLAYNAME | SHGFI_ATTRIBUTES | SHGFI_ICON | SHGFI_LARGEICON), 0u);
  win::UniqueIcon shellIcon(info.hIcon);
  EXPECT_STREQ(info.szDisplayName, L"North Site");
  EXPECT_EQ(info.dwAttributes & (SFGAO_FOLDER | SFGAO_DROPTARGET), static_cast<DWORD>(SFGAO_FOLDER | SFGAO_DROPTARGET));
  // Wine's shell32 (8.0) ignores GIL_NOTFILENAME and never calls Extract: the icon is a picture of its own.
  EXPECT_TRUE(info.hIcon);
  LPCITEMIDLIST child = nullptr;
  ASSERT_EQ(SHBindToParent(absolute.Get(), IID_IShellFolder, parent.PutVoid(), &child), S_OK);
  com::ComPtr<IQueryInfo> tip;
  ASSERT_EQ(parent->GetUIObjectOf(nullptr, 1, &child, IID_IQueryInfo, nullptr, tip.PutVoid()), S_OK);
  win::UniqueCoMem<wchar_t> tipText;
  ASSERT_EQ(tip->GetInfoTip(0, tipText.Put()), S_OK);
  EXPECT_STREQ(tipText.Get(), L"Marlix Digital Levels\\North Site");
}

// A person presses `key`, with Ctrl if told, with the focus in `window`, and the host goes on
// until `done`. `view`, if given, is the host's current view, to which its loop hands every key
// first as Explorer's window does; otherwise the host is another thread.
bool Type(HWND window, WORD key, const std::function<bool()>& done, IShellView* view = nullptr, bool ctrl = false) {
  HWND top = GetAncestor(window, GA_ROOT);
  SetForegroundWindow(top);
  SendMessageW(top, WM_NEXTDLGCTL, reinterpret_cast<WPARAM>(window), TRUE);
  if (view) SetFocus(window);
  std::vector<INPUT> keys;
  const auto press = [&](WORD vk, DWORD flags) {
    keys.push_back({INPUT_KEYBOARD});
    keys.back().ki.wVk = vk;
    keys.back().ki.dwFlags = flags;
  };
  if (ctrl) press(VK_CONTROL, 0);
  press(key, 0);
  press(key, KEYEVENTF_KEYUP);
  if (ctrl) press(VK_CONTROL, KEYEVENTF_KEYUP);
  SendInput(static_cast<UINT>(keys.size()), keys.data(), sizeof(INPUT));
  if (!view) return ui::WaitFor(done);
  for (DWORD start = GetTickCount(); !done(); MsgWaitForMultipleObjects(0, nullptr, FALSE, 10, QS_ALLINPUT)) {
    if (GetTickCount() - start > 10000) return false;
    for (MSG msg; PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE); DispatchMessageW(&msg))
      if (msg.message == WM_KEYDOWN) view->TranslateAccelerator(&msg);
  }
  return true;
}

// Wine's ExplorerBrowser hosts the view as Explorer's window does: the browser makes
// the view, the view's thread fills it, and activating a level moves the browser.
TEST(ExplorerBrowserClient, ShowsTheLevelsAndMovesIntoALevelWhenItIsActivated) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"South Site");
  SeedLevel(1, L"North Site");
  SeedLevel(2, L"Spare");
  HWND frame = CreateWindowExW(0, L"STATIC", nullptr, WS_POPUP | WS_VISIBLE, 0, 0, 640, 480, nullptr, nullptr,
                               nullptr, nullptr);
  com::ComPtr<IExplorerBrowser> browser = BrowseToFolder(frame, {0, 0, 600, 400});
  ASSERT_TRUE(browser);
  HWND list = CurrentList(browser.Get());
  ASSERT_TRUE(list);
  EXPECT_EQ(ListRows(list), (std::vector<std::wstring>{L"Add New Digital Level", L"North Site", L"South Site", L"Spare"}));
  EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(list, GWL_STYLE)), 0x50010149u) << "Details, as the browser asked";
  SHELLFLAGSTATE shell{};
  shell.fWin95Classic = TRUE;  // what a shell that doesn't know the setting leaves
  SHGetSettings(&shell, SSF_DOUBLECLICKINWEBVIEW | SSF_WIN95CLASSIC);
  EXPECT_EQ(ListView_GetExtendedListViewStyle(list), (shell.fWin95Classic || shell.fDoubleClickInWebView) ? 0u : 0x848u)
      << "the user's click setting";
  // Wine's browser merges no menus (E_NOTIMPL, no popups): the view tests read them in a browser of their own.
  com::ComPtr<IShellView> view;
  ASSERT_EQ(browser->GetCurrentView(IID_IShellView, view.PutVoid()), S_OK);
  com::ComPtr<IOleCommandTarget> commands;
  ASSERT_EQ(view->QueryInterface(IID_IOleCommandTarget, commands.PutVoid()), S_OK);
  EXPECT_EQ(commands->Exec(nullptr, 1284, 0, nullptr, nullptr), S_OK);
  EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(list, GWL_STYLE)), 0x5001014Au) << "Small Icons";
  // A Delete typed in the frame's address bar is the bar's; the same key in the list deletes.
  HWND address = CreateWindowExW(0, L"EDIT", L"Levels", WS_CHILD | WS_VISIBLE, 0, 410, 600, 20, frame, nullptr,
                                 nullptr, nullptr);
  ListView_SetItemState(list, 3, LVIS_SELECTED | LVIS_FOCUSED, LVIS_SELECTED | LVIS_FOCUSED);
  EXPECT_TRUE(Type(address, VK_DELETE, [&] { return ui::Text(address) != L"Levels"; }, view.Get()));
  EXPECT_EQ(sheet::StoredLevels().size(), 3u) << "a key of the address bar deletes no level";
  EXPECT_TRUE(Type(list, VK_DELETE, [] { return sheet::StoredLevels().size() == 2; }, view.Get())) << "the list's";
  list = CurrentList(browser.Get());
  ListView_SetItemState(list, 1, LVIS_SELECTED | LVIS_FOCUSED, LVIS_SELECTED | LVIS_FOCUSED);
  const UINT stations = RegisterClipboardFormatW(L"Marlix Total Stations");
  EXPECT_TRUE(Type(list, 'C', [&] { return IsClipboardFormatAvailable(stations) != FALSE; }, view.Get(), true));
  EXPECT_TRUE(Type(list, 'V', [] { return sheet::StoredLevels().size() == 3; }, view.Get(), true)) << "Ctrl+C, Ctrl+V";
  OleSetClipboard(nullptr);
  list = CurrentList(browser.Get());
  view.Reset(), commands.Reset();

  ListView_SetItemState(list, 2, LVIS_SELECTED | LVIS_FOCUSED, LVIS_SELECTED | LVIS_FOCUSED);
  SendMessageW(list, WM_KEYDOWN, VK_RETURN, 0);
  HWND levelList = CurrentList(browser.Get());
  ASSERT_TRUE(levelList);
  EXPECT_NE(levelList, list) << "a new view on the level";
  EXPECT_EQ(ListRows(levelList), std::vector<std::wstring>{L"file1.tkf"});
  EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(levelList, GWL_STYLE)), 0x5001014Au) << "the mode of our view before";
  EXPECT_EQ(browser->Destroy(), S_OK);
  browser.Reset();
  DestroyWindow(frame);
}

// comdlg32's Open dialog, driven from a second thread as a person would; the dialog's
// own thread only answers what the hook asks of it.
struct OpenDialogRun {
  std::atomic<HWND> hook{nullptr}, dialog{nullptr};
  std::atomic<int> fileOk{0};
};
OpenDialogRun* openDialog = nullptr;
constexpr UINT kBrowseTo = WM_APP + 1;

// Windows' file dialog hands every key of its loop to its view first; Wine's never asks its
// view, so this hook on the dialog's thread does what Windows' dialog does.
LRESULT CALLBACK ViewKeysFirst(int code, WPARAM wParam, LPARAM lParam) {
  auto* msg = reinterpret_cast<MSG*>(lParam);
  auto* browser = reinterpret_cast<IShellBrowser*>(SendMessageW(openDialog->dialog, WM_USER + 7, 0, 0));
  com::ComPtr<IShellView> view;
  if (code == MSGF_DIALOGBOX && msg->message == WM_KEYDOWN && browser && browser->QueryActiveShellView(view.Put()) == S_OK)
    view->TranslateAccelerator(msg);
  return CallNextHookEx(nullptr, code, wParam, lParam);
}

UINT_PTR CALLBACK OpenDialogHook(HWND hook, UINT message, WPARAM, LPARAM lParam) {
  if (message == WM_INITDIALOG) openDialog->hook = hook;
  if (message == WM_NOTIFY && reinterpret_cast<NMHDR*>(lParam)->code == CDN_INITDONE) openDialog->dialog = GetParent(hook);
  if (message == WM_NOTIFY && reinterpret_cast<NMHDR*>(lParam)->code == CDN_FILEOK) ++openDialog->fileOk;
  if (message == kBrowseTo) {
    // The dialog's own browser, as every view inside it sees it.
    auto* browser = reinterpret_cast<IShellBrowser*>(SendMessageW(GetParent(hook), WM_USER + 7, 0, 0));
    SetWindowLongPtrW(hook, DWLP_MSGRESULT,
                      browser ? browser->BrowseObject(reinterpret_cast<LPCITEMIDLIST>(lParam), SBSP_ABSOLUTE) : E_FAIL);
    return TRUE;
  }
  return 0;
}

// The view the dialog shows, once filled with `rows` rows.
HWND DialogList(HWND dialog, size_t rows) {
  HWND list = nullptr;
  ui::PumpFor([&] {
    HWND view = FindWindowExW(dialog, nullptr, L"TSViewNSClass", nullptr);
    list = view ? GetDlgItem(view, 2000) : nullptr;
    return list && !FindWindowExW(list, nullptr, ANIMATE_CLASSW, nullptr) && ListRows(list).size() == rows;
  });
  return list;
}

void ActivateRow(HWND list, int row) {
  ListView_SetItemState(list, -1, 0, LVIS_SELECTED);
  ListView_SetItemState(list, row, LVIS_SELECTED | LVIS_FOCUSED, LVIS_SELECTED | LVIS_FOCUSED);
  SendMessageW(list, WM_KEYDOWN, VK_RETURN, 0);
}

TEST(OpenDialogClient, ListsTheLevelsOpensOneAndTakesItsFileAsTheDefaultCommand) {
  RegistrySandbox sandbox;
  const std::wstring longest(kMaxStationNameLength, L'n');  // its file's address is the longest of all
  SeedLevel(0, longest);
  SeedLevel(1, L"Spare");
  OpenDialogRun run;
  openDialog = &run;
  UniqueList folder;
  ASSERT_EQ(SHParseDisplayName(kFolderPath, nullptr, folder.Put(), 0, nullptr), S_OK);
  std::vector<std::wstring> rootRows, levelRows;
  HRESULT browsed = E_PENDING;
  std::thread person([&] {
    ui::PumpFor([&] { return run.dialog.load() != nullptr; });
    if (!run.dialog) return;
    browsed = static_cast<HRESULT>(SendMessageW(run.hook, kBrowseTo, 0, reinterpret_cast<LPARAM>(folder.Get())));
    HWND list = DialogList(run.dialog, 3);
    rootRows = list ? ListRows(list) : rootRows;
    // A Delete typed in the file-name box is the box's; the same key in the list deletes.
    HWND name = reinterpret_cast<HWND>(SendMessageW(GetDlgItem(run.dialog, cmb13), CBEM_GETEDITCONTROL, 0, 0));
    if (list) ListView_SetItemState(list, 2, LVIS_SELECTED | LVIS_FOCUSED, LVIS_SELECTED | LVIS_FOCUSED);
    SetWindowTextW(name, L"x");  // after the selection, which the dialog copies into the box
    EXPECT_TRUE(name && Type(name, VK_DELETE, [&] { return ui::Text(name).empty(); })) << "the file-name box's";
    EXPECT_EQ(sheet::StoredLevels().size(), 2u) << "a key of the file-name box deletes no level";
    EXPECT_TRUE(list && Type(list, VK_DELETE, [] { return sheet::StoredLevels().size() == 1; })) << "the list's";
    list = DialogList(run.dialog, 2);
    if (list) ActivateRow(list, 1);
    HWND levelList = DialogList(run.dialog, 1);
    levelRows = levelList ? ListRows(levelList) : levelRows;
    if (levelList) ActivateRow(levelList, 0);
    ui::PumpFor([&] { return run.fileOk > 0 || !IsWindow(run.dialog); }, 3000);
    if (IsWindow(run.dialog)) PostMessageW(run.dialog, WM_COMMAND, IDCANCEL, 0);
  });
  wchar_t file[MAX_PATH] = {};
  OPENFILENAMEW ofn{sizeof(ofn)};
  ofn.lpstrFile = file;
  ofn.nMaxFile = MAX_PATH;
  ofn.Flags = OFN_EXPLORER | OFN_ENABLEHOOK;
  ofn.lpfnHook = OpenDialogHook;
  HHOOK keys = SetWindowsHookExW(WH_MSGFILTER, ViewKeysFirst, nullptr, GetCurrentThreadId());
  BOOL chosen = GetOpenFileNameW(&ofn);
  UnhookWindowsHookEx(keys);
  person.join();
  openDialog = nullptr;
  EXPECT_EQ(browsed, S_OK);
  EXPECT_EQ(rootRows, (std::vector<std::wstring>{L"Add New Digital Level", longest, L"Spare"}));
  EXPECT_EQ(levelRows, std::vector<std::wstring>{L"file1.tkf"});
  EXPECT_EQ(run.fileOk, 1) << "the file reached the dialog's default command";
  EXPECT_TRUE(chosen);
  EXPECT_STREQ(file, (kParsingRoot + L"\\" + longest + L"\\file1.tkf").c_str()) << "259 characters";
}

// Runs last: the test above has released all it got from the shell.
TEST(Shell32ClientModule, UnloadsOnceTheShellHasLetGo) {
  HMODULE module = GetModuleHandleW(L"MarlixDLShellExt.dll");
  ASSERT_TRUE(module) << "loaded by the shell in the test before";
  auto canUnload = reinterpret_cast<HRESULT(STDAPICALLTYPE*)()>(reinterpret_cast<void*>(GetProcAddress(module, "DllCanUnloadNow")));
  ASSERT_TRUE(canUnload);
  EXPECT_EQ(canUnload(), S_OK) << "every object of the module was released";
}
}  // namespace
