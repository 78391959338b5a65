// The library contract as the system sees it (table positions, result texts, the callback,
// the temporary target path) and the registered messages that carry changes among views.
#include <gtest/gtest.h>

#include <atomic>
#include <climits>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <thread>
#include <utility>
#include <vector>

#include "shell/view_notify.h"
#include "transfer/comm_interface.h"
#include "transfer/download_dialog.h"

namespace {

// A hand-made object with a 14-entry table, as the other compiler lays it out: each
// entry records its position and first two arguments.
struct FakeObject { void** table; int slot = -1; long long first = 0, second = 0; };
template <int Slot>
long long Entry(FakeObject* self, long long a, long long b) { *self = {self->table, Slot, a, b}; return 0; }

TEST(CommInterface, CallsReachTheirTablePositions) {
  void* table[14];
  [&]<int... Slots>(std::integer_sequence<int, Slots...>) {
    ((table[Slots] = reinterpret_cast<void*>(&Entry<Slots>)), ...);
  }(std::make_integer_sequence<int, 14>());
  FakeObject fake{table};
  auto* comm = reinterpret_cast<IMarlixComm*>(&fake);
  auto reached = [&](int slot, long long first) {  // 32 bits: the rest of an int's register is undefined
    EXPECT_EQ(fake.slot, slot);
    EXPECT_EQ(static_cast<int>(fake.first), static_cast<int>(first)) << "slot " << slot;
  };
  const char* path = "x";
  comm->SetCommParameters(3, 19200, 2, 1, 1, 7, 0);
  reached(2, 3);
  comm->Initialize();
  EXPECT_EQ(fake.slot, 3);
  comm->ReceiveFile(20, true);
  reached(4, 20);
  EXPECT_EQ(static_cast<unsigned char>(fake.second), 1);
  comm->SetPoints(nullptr);
  reached(6, 0);
  comm->TerminateConnection();
  EXPECT_EQ(fake.slot, 8);
  comm->SetFilePath(path);
  reached(9, reinterpret_cast<long long>(path));
  comm->SetTimeout(30);
  reached(10, 30);
  comm->SetCallback(&CommResultCallback);
  reached(13, reinterpret_cast<long long>(&CommResultCallback));
  comm->Destroy(1);
  reached(0, 1);
}

// Read by byte offset, not through the struct the code writes with.
TEST(CommInterface, PointsBlockPresetsBytes20And92OfEachRecord) {
  PointsBlock* block = NewPointsBlock();
  ASSERT_TRUE(block);
  const auto* bytes = reinterpret_cast<const unsigned char*>(block);
  int preset = 0;
  for (size_t record = 0; record < 5000; ++record) {
    for (size_t offset : {20u, 92u}) {
      int32_t value = 0;
      std::memcpy(&value, bytes + record * 144 + offset, sizeof(value));
      preset += value == -1;
    }
  }
  EXPECT_EQ(preset, 10000);
  DeletePointsBlock(block);
}

TEST(CommInterface, ResultCodesMapToTheirTexts) {
  const std::pair<std::vector<int>, const wchar_t*> rows[] = {
      {{0}, L"No error"},
      {{-101}, L"The waiting time of the data has expired."},
      {{-102}, L"The communication's process is interrupted by the user"},
      {{-201, -202, -203}, L"Unable to create file for saving"},
      {{-204}, L"The checksum is incorrect"},
      {{-301}, L"Temporary file open error"},
      {{-302}, L"Point name or memo is wrong"},
      {{1, -1, 101, -100, -103, -200, -205, -300, -303, INT_MIN, INT_MAX}, L"Unknown error"}};
  for (const auto& [codes, text] : rows)
    for (int code : codes) EXPECT_EQ(CommResultText(code), text) << "code " << code;
}

TEST(CommInterface, CallbackPostsTheSignExtendedCodeToTheOpenDialogOnly) {
  MSG message;
  CommResultCallback(5);  // no dialog: a post to a null window would land in this thread's queue
  EXPECT_FALSE(PeekMessageW(&message, nullptr, DownloadMessage, DownloadMessage, PM_REMOVE));
  HWND target = CreateWindowExW(0, L"STATIC", L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
  ASSERT_NE(target, nullptr);
  DownloadDialogWindow = target;
  // From a thread of the library's; a sent message would time out here, as this thread pumps none.
  auto library = [](void*) -> DWORD { CommResultCallback(-101); return 0; };
  HANDLE thread = CreateThread(nullptr, 0, library, nullptr, 0, nullptr);
  EXPECT_EQ(WaitForSingleObject(thread, 10000), WAIT_OBJECT_0);
  CloseHandle(thread);
  DownloadDialogWindow = nullptr;
  ASSERT_TRUE(PeekMessageW(&message, target, DownloadMessage, DownloadMessage, PM_REMOVE));
  EXPECT_EQ(message.wParam, 0u);
  EXPECT_EQ(message.lParam, static_cast<LPARAM>(-101));
  DestroyWindow(target);
}

TEST(CommInterface, TargetPathIsAFreshTkfNameWithoutExtensionInTheTempFolder) {
  std::wstring first, second;
  ASSERT_EQ(MakeDownloadTargetPath(first), 0u);
  ASSERT_EQ(MakeDownloadTargetPath(second), 0u);
  wchar_t temp[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  ASSERT_TRUE(first.starts_with(temp)) << first;
  std::wstring name = first.substr(wcslen(temp));
  EXPECT_TRUE(name.starts_with(L"TKF")) << name;
  EXPECT_EQ(name.find_first_of(L".\\/"), std::wstring::npos) << name;
  EXPECT_EQ(GetFileAttributesW((first + L".tmp").c_str()), INVALID_FILE_ATTRIBUTES);  // deleted again
  EXPECT_NE(first, second);
}

struct Received { int count = 0; WPARAM wParam = 0; LPARAM lParam = 0; };
LRESULT CALLBACK ViewProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  auto* received = reinterpret_cast<Received*>(GetWindowLongPtrW(window, GWLP_USERDATA));
  if (received && message == GlobalNotifyMessage) *received = {received->count + 1, wParam, lParam};
  return DefWindowProcW(window, message, wParam, lParam);
}

// The stand-in honours the contract: each started transfer calls back, and Destroy
// waits for the library's own thread before anything is freed.
std::atomic<int> callbacks{0};
TEST(StandIn, EveryReceiveFileCallsBack) {
  wchar_t self[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  std::wstring folder(self, wcsrchr(self, L'\\') + 1);
  std::ofstream(std::filesystem::path(folder + L"MarlixComm.txt"), std::ios::binary) << "delay_ms=50\n";
  std::wstring error;
  IMarlixComm* comm = CreateCommObject(error);
  ASSERT_TRUE(comm) << testing::PrintToString(error);
  comm->SetCallback([](int) { ++callbacks; });
  char temp[MAX_PATH] = {}, target[MAX_PATH] = {};
  GetTempPathA(MAX_PATH, temp);
  GetTempFileNameA(temp, "TKF", 0, target);
  comm->SetFilePath(target);
  EXPECT_EQ(comm->ReceiveFile(20, true), 0);
  EXPECT_EQ(comm->ReceiveFile(20, true), 0);
  for (ULONGLONG end = GetTickCount64() + 5000; callbacks < 2 && GetTickCount64() < end;) Sleep(10);
  comm->Destroy(1);
  EXPECT_EQ(callbacks.load(), 2);
  DeleteFileA(target);
  DeleteFileA((std::string(target) + ".txt").c_str());
  DeleteFileW((folder + L"MarlixComm.txt").c_str());
}

// The transfer dialog's template, read from the resource as the dialog manager reads it.
struct TemplateItem {
  WORD id;
  WORD atom;  // 0x80 button, 0x81 edit, 0x82 static
  std::wstring text;
  RECT box;  // x, y, width, height in dialog units
  DWORD style;
};
const WORD* SkipText(const WORD* at, std::wstring* text = nullptr, WORD* atom = nullptr) {
  if (*at == 0xFFFF) {
    if (atom) *atom = at[1];
    return at + 2;
  }
  const WORD* start = at;
  while (*at) ++at;
  if (text) text->assign(reinterpret_cast<const wchar_t*>(start), at - start);
  return at + 1;
}
const WORD* Align(const WORD* at) {
  return reinterpret_cast<const WORD*>((reinterpret_cast<ULONG_PTR>(at) + 3) & ~ULONG_PTR(3));
}

TEST(DownloadTemplate, LayoutAndStyles) {
  HRSRC found = FindResourceW(GetModuleHandleW(nullptr), MAKEINTRESOURCEW(213), RT_DIALOG);
  ASSERT_TRUE(found);
  const auto* dialog = static_cast<const DLGTEMPLATE*>(LockResource(LoadResource(GetModuleHandleW(nullptr), found)));
  ASSERT_NE(dialog->style, 0xFFFF0001u) << "a plain template, not an extended one";
  EXPECT_EQ(dialog->style, DWORD(WS_POPUP | WS_CAPTION | WS_SYSMENU | DS_MODALFRAME | DS_SETFONT | DS_SYSMODAL));
  EXPECT_EQ(dialog->cx, 267);
  EXPECT_EQ(dialog->cy, 178);
  std::wstring caption, font;
  const WORD* at = SkipText(SkipText(reinterpret_cast<const WORD*>(dialog + 1)));  // menu, class
  at = SkipText(at, &caption);
  EXPECT_EQ(caption, L"Download file from Digital Level");
  EXPECT_EQ(*at, 8) << "points";
  at = SkipText(at + 1, &font);
  EXPECT_EQ(font, L"MS Sans Serif");
  std::vector<TemplateItem> items;
  for (int i = 0; i < dialog->cdit; ++i) {
    const auto* item = reinterpret_cast<const DLGITEMTEMPLATE*>(Align(at));
    TemplateItem read{item->id, 0, L"", {item->x, item->y, item->cx, item->cy}, item->style};
    at = SkipText(SkipText(reinterpret_cast<const WORD*>(item + 1), nullptr, &read.atom), &read.text);
    at += 1 + *at / sizeof(WORD);  // creation data
    items.push_back(read);
  }
  const DWORD readOnlyText = ES_READONLY | ES_MULTILINE | ES_AUTOVSCROLL | WS_VSCROLL | WS_BORDER | WS_TABSTOP;
  const TemplateItem expected[] = {
      {IDCANCEL, 0x80, L"Cancel", {80, 157, 50, 14}, WS_TABSTOP},
      {220, 0x80, L"Start", {140, 157, 50, 14}, WS_TABSTOP},
      {215, 0x82, L"Status text", {45, 142, 215, 10}, 0},
      {319, 0x82, L"Status:", {5, 142, 25, 10}, 0},
      {214, 0x81, L"", {5, 5, 255, 112}, readOnlyText},
      {320, 0x82, L"File name:", {5, 127, 35, 10}, 0},
      {217, 0x82, L"Name", {45, 127, 215, 10}, 0},
  };
  ASSERT_EQ(items.size(), std::size(expected));
  for (size_t i = 0; i < items.size(); ++i) {
    SCOPED_TRACE(testing::Message() << "control " << expected[i].id);
    EXPECT_EQ(items[i].id, expected[i].id);
    EXPECT_EQ(items[i].atom, expected[i].atom);
    EXPECT_EQ(items[i].text, expected[i].text);
    EXPECT_TRUE(EqualRect(&items[i].box, &expected[i].box));
    EXPECT_EQ(items[i].style & expected[i].style, expected[i].style);
    EXPECT_EQ(items[i].style & (WS_CHILD | WS_VISIBLE), DWORD(WS_CHILD | WS_VISIBLE));
  }
}

TEST(ViewNotify, MessagesKeepTheirTextsAndABroadcastReachesEveryViewThroughItsHiddenWindow) {
  EXPECT_EQ(GlobalNotifyMessage, RegisterWindowMessageW(L"TSShell Extension - Global Notify"));
  EXPECT_EQ(DownloadMessage, RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Download Message"));
  EXPECT_EQ(UploadMessage, RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Upload Message"));
  EXPECT_EQ(GetEnumIDListMessage, RegisterWindowMessageW(L"KLD Shell Extension - Get EnumIDList"));

  WNDCLASSW wc{0, ViewProc, 0, 0, GetModuleHandleW(nullptr), nullptr, nullptr, nullptr, nullptr, L"NotifyTestView"};
  RegisterClassW(&wc);
  Received received[2];
  HWND views[2];
  NotifyWindowPair pairs[2];
  for (int i = 0; i < 2; ++i) {
    // A message-only window, which a broadcast never reaches by itself, like a view inside a browser.
    views[i] = CreateWindowExW(0, wc.lpszClassName, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, wc.hInstance, nullptr);
    SetWindowLongPtrW(views[i], GWLP_USERDATA, reinterpret_cast<LONG_PTR>(&received[i]));
    ASSERT_EQ(CreateNotifyWindow(pairs[i], views[i]), S_OK);
  }
  EXPECT_EQ(GetParent(pairs[0].Hidden), nullptr);
  EXPECT_FALSE(IsWindowVisible(pairs[0].Hidden));
  SendMessageW(pairs[0].Hidden, DownloadMessage, 1, 1);  // other messages stay away from the view
  EXPECT_EQ(received[0].count, 0);
  BroadcastChange(2);
  MSG message;
  for (ULONGLONG end = GetTickCount64() + 5000; !(received[0].count && received[1].count) && GetTickCount64() < end;
       Sleep(10))
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
  for (const Received& view : received) {
    EXPECT_EQ(view.count, 1);
    EXPECT_EQ(view.wParam, 1u);
    EXPECT_EQ(view.lParam, 2);
  }
  // The window lets go of its pair before it is destroyed, so it can never outlive the pair holding it.
  static HWND watched;
  static LONG_PTR pairAtDestroy;
  watched = pairs[1].Hidden;
  pairAtDestroy = -1;
  HHOOK hook = SetWindowsHookExW(WH_CALLWNDPROC, [](int code, WPARAM w, LPARAM l) -> LRESULT {
    auto* call = reinterpret_cast<CWPSTRUCT*>(l);
    if (call->hwnd == watched && call->message == WM_DESTROY) pairAtDestroy = GetWindowLongPtrW(watched, GWLP_USERDATA);
    return CallNextHookEx(nullptr, code, w, l);
  }, nullptr, GetCurrentThreadId());
  DestroyNotifyWindow(pairs[1]);
  UnhookWindowsHookEx(hook);
  EXPECT_EQ(pairAtDestroy, 0);
  HWND hidden = pairs[0].Hidden;
  DestroyNotifyWindow(pairs[0]);
  EXPECT_FALSE(IsWindow(hidden));
  DestroyNotifyWindow(pairs[0]);  // a second time is harmless
  for (HWND view : views) DestroyWindow(view);
}

}  // namespace
