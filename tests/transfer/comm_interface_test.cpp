// The library contract as the system sees it: table positions, codes, the callback,
// the temporary target path, and the registered messages.
#include <gtest/gtest.h>

#include <utility>

#include "shell/view_notify.h"
#include "transfer/comm_interface.h"
#include "transfer/download_dialog.h"

namespace {

// A hand-made object with a 14-entry table, as the other compiler lays it out: each
// entry records its position and first two arguments.
struct FakeObject {
  void** table;
  int slot = -1;
  long long first = 0, second = 0;
};

template <int Slot>
long long Entry(FakeObject* self, long long a, long long b) {
  *self = {self->table, Slot, a, b};
  return 0;
}

template <int... Slots>
void FillTable(void** table, std::integer_sequence<int, Slots...>) {
  ((table[Slots] = reinterpret_cast<void*>(&Entry<Slots>)), ...);
}

TEST(CommInterface, CallsReachTheirTablePositions) {
  void* table[14];
  FillTable(table, std::make_integer_sequence<int, 14>());
  FakeObject fake{table};
  auto* comm = reinterpret_cast<IMarlixComm*>(&fake);
  auto expect = [&](int slot, long long first) {
    EXPECT_EQ(fake.slot, slot);
    EXPECT_EQ(static_cast<int>(fake.first), first);
  };
  comm->SetCommParameters(3, 19200, 2, 1, 1, 7, 0); expect(2, 3);
  comm->Initialize(); EXPECT_EQ(fake.slot, 3);
  comm->ReceiveFile(20, true); expect(4, 20);
  EXPECT_EQ(static_cast<unsigned char>(fake.second), 1);
  comm->SetPoints(nullptr); expect(6, 0);
  comm->TerminateConnection(); EXPECT_EQ(fake.slot, 8);
  comm->SetFilePath("x"); EXPECT_EQ(fake.slot, 9);
  comm->SetTimeout(30); expect(10, 30);
  comm->SetCallback(&CommResultCallback); EXPECT_EQ(fake.slot, 13);
  comm->Destroy(1); expect(0, 1);
}

TEST(CommInterface, ResultCodesMapToTheirTexts) {
  EXPECT_EQ(CommResultText(0), L"No error");
  EXPECT_EQ(CommResultText(-101), L"The waiting time of the data has expired.");
  EXPECT_EQ(CommResultText(-102), L"The communication's process is interrupted by the user");
  for (int code : {-201, -202, -203}) EXPECT_EQ(CommResultText(code), L"Unable to create file for saving");
  EXPECT_EQ(CommResultText(-204), L"The checksum is incorrect");
  EXPECT_EQ(CommResultText(-301), L"Temporary file open error");
  EXPECT_EQ(CommResultText(-302), L"Point name or memo is wrong");
  for (int code : {1, 101, -200, -205, -303, INT_MIN}) EXPECT_EQ(CommResultText(code), L"Unknown error");
}

DWORD WINAPI CallbackFromAnotherThread(void*) {
  CommResultCallback(-101);
  return 0;
}

TEST(CommInterface, CallbackPostsTheSignExtendedCodeToTheOpenDialogOnly) {
  HWND target = CreateWindowExW(0, L"STATIC", L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
  ASSERT_NE(target, nullptr);
  MSG message;
  CommResultCallback(5);  // no dialog: a post to a null window would land in this thread's queue
  EXPECT_FALSE(PeekMessageW(&message, nullptr, DownloadMessage, DownloadMessage, PM_REMOVE));

  DownloadDialogWindow = target;
  HANDLE thread = CreateThread(nullptr, 0, CallbackFromAnotherThread, nullptr, 0, nullptr);
  WaitForSingleObject(thread, 10000);
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
  ASSERT_EQ(first.rfind(temp, 0), 0u) << first;
  std::wstring name = first.substr(wcslen(temp));
  EXPECT_EQ(name.rfind(L"TKF", 0), 0u);
  EXPECT_EQ(name.find(L'.'), std::wstring::npos);
  EXPECT_EQ(GetFileAttributesW((first + L".tmp").c_str()), INVALID_FILE_ATTRIBUTES);  // deleted again
  EXPECT_NE(first, second);
}

TEST(CommInterface, MessagesAreRegisteredUnderTheirProtocolTexts) {
  EXPECT_EQ(GlobalNotifyMessage, RegisterWindowMessageW(L"TSShell Extension - Global Notify"));
  EXPECT_EQ(DownloadMessage, RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Download Message"));
  EXPECT_EQ(UploadMessage, RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Upload Message"));
  EXPECT_EQ(GetEnumIDListMessage, RegisterWindowMessageW(L"KLD Shell Extension - Get EnumIDList"));
  EXPECT_GE(GlobalNotifyMessage, 0xC000u);
}

}  // namespace
