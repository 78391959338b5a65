// The library contract as the system sees it: table positions, codes, the callback,
// the points block and the temporary target path.
#include <gtest/gtest.h>

#include <cstring>

#include "shell/view_notify.h"
#include "transfer/comm_interface.h"
#include "transfer/download_dialog.h"

namespace {

// A hand-made object with a 14-entry table, as the other compiler lays it out: each
// entry records its own position, so a call through IMarlixComm shows which slot it used.
struct FakeObject {
  void** table;
  int lastSlot = -1;
  long long args[7] = {};
};

template <int Slot>
long long Entry(FakeObject* self, long long a, long long b, long long c, long long d, long long e,
                long long f, long long g) {
  self->lastSlot = Slot;
  long long values[7] = {a, b, c, d, e, f, g};
  std::memcpy(self->args, values, sizeof values);
  return 0;
}

template <int... Slots>
void FillTable(void** table, std::integer_sequence<int, Slots...>) {
  ((table[Slots] = reinterpret_cast<void*>(&Entry<Slots>)), ...);
}

TEST(CommInterface, CallsReachTheirTablePositionsWithTheirArguments) {
  void* table[14];
  FillTable(table, std::make_integer_sequence<int, 14>());
  FakeObject fake{table};
  auto* comm = reinterpret_cast<IMarlixComm*>(&fake);

  comm->SetCommParameters(3, 19200, 2, 1, 1, 7, 0);
  EXPECT_EQ(fake.lastSlot, 2);
  EXPECT_EQ(fake.args[0], 3);
  EXPECT_EQ(fake.args[1], 19200);
  EXPECT_EQ(static_cast<int>(fake.args[6]), 0);
  comm->Initialize();
  EXPECT_EQ(fake.lastSlot, 3);
  comm->ReceiveFile(20, true);
  EXPECT_EQ(fake.lastSlot, 4);
  EXPECT_EQ(static_cast<int>(fake.args[0]), 20);
  EXPECT_EQ(static_cast<unsigned char>(fake.args[1]), 1);
  comm->SetPoints(nullptr);
  EXPECT_EQ(fake.lastSlot, 6);
  comm->TerminateConnection();
  EXPECT_EQ(fake.lastSlot, 8);
  comm->SetFilePath("x");
  EXPECT_EQ(fake.lastSlot, 9);
  comm->SetTimeout(30);
  EXPECT_EQ(fake.lastSlot, 10);
  EXPECT_EQ(static_cast<int>(fake.args[0]), 30);
  comm->SetCallback(&CommResultCallback);
  EXPECT_EQ(fake.lastSlot, 13);
  comm->Destroy(1);
  EXPECT_EQ(fake.lastSlot, 0);
  EXPECT_EQ(static_cast<unsigned>(fake.args[0]), 1u);
}

TEST(CommInterface, ResultCodesMapToTheirTexts) {
  EXPECT_EQ(CommResultText(0), L"No error");
  EXPECT_EQ(CommResultText(-101), L"The waiting time of the data has expired.");
  EXPECT_EQ(CommResultText(-102), L"The communication's process is interrupted by the user");
  for (int code : {-201, -202, -203}) EXPECT_EQ(CommResultText(code), L"Unable to create file for saving");
  EXPECT_EQ(CommResultText(-204), L"The checksum is incorrect");
  EXPECT_EQ(CommResultText(-301), L"Temporary file open error");
  EXPECT_EQ(CommResultText(-302), L"Point name or memo is wrong");
  for (int code : {1, 101, -200, -205, -303, INT_MIN, INT_MAX}) EXPECT_EQ(CommResultText(code), L"Unknown error");
}

TEST(CommInterface, LastErrorBecomesAWin32FailureCodeOnlyWhenPositive) {
  EXPECT_EQ(LastErrorToFailureCode(ERROR_MOD_NOT_FOUND), static_cast<HRESULT>(0x8007007E));
  EXPECT_EQ(LastErrorToFailureCode(0x0001FFFF), static_cast<HRESULT>(0x8007FFFF));
  EXPECT_EQ(LastErrorToFailureCode(0), 0);
  EXPECT_EQ(LastErrorToFailureCode(0xC0000135), static_cast<HRESULT>(0xC0000135));
}

LRESULT CALLBACK RecordingProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  return DefWindowProcW(window, message, wParam, lParam);
}

DWORD WINAPI CallbackFromAnotherThread(void*) {
  CommResultCallback(-101);
  return 0;
}

TEST(CommInterface, CallbackPostsTheSignExtendedCodeToTheOpenDialogOnly) {
  WNDCLASSW wc{};
  wc.lpfnWndProc = RecordingProc;
  wc.hInstance = GetModuleHandleW(nullptr);
  wc.lpszClassName = L"CommCallbackTarget";
  RegisterClassW(&wc);
  HWND target = CreateWindowExW(0, wc.lpszClassName, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr,
                                wc.hInstance, nullptr);
  ASSERT_NE(target, nullptr);

  MSG message;
  DownloadDialogWindow = nullptr;
  CommResultCallback(5);  // would land in this thread's queue if it posted to a null window
  EXPECT_FALSE(PeekMessageW(&message, nullptr, DownloadMessage, DownloadMessage, PM_REMOVE));

  DownloadDialogWindow = target;
  HANDLE thread = CreateThread(nullptr, 0, CallbackFromAnotherThread, nullptr, 0, nullptr);
  ASSERT_NE(thread, nullptr);
  WaitForSingleObject(thread, 10000);
  CloseHandle(thread);
  DownloadDialogWindow = nullptr;
  ASSERT_TRUE(PeekMessageW(&message, target, DownloadMessage, DownloadMessage, PM_REMOVE));
  EXPECT_EQ(message.wParam, 0u);
  EXPECT_EQ(message.lParam, static_cast<LPARAM>(-101));
  DestroyWindow(target);
}

TEST(CommInterface, PointsBlockPresetsBothFieldsOfEveryRecord) {
  PointsBlock* block = NewPointsBlock();
  ASSERT_NE(block, nullptr);
  const auto* bytes = reinterpret_cast<const unsigned char*>(block);
  for (size_t record = 0; record < kPointRecordCount; ++record) {
    int32_t first, second;
    std::memcpy(&first, bytes + record * 144 + 20, 4);
    std::memcpy(&second, bytes + record * 144 + 92, 4);
    ASSERT_EQ(first, -1) << record;
    ASSERT_EQ(second, -1) << record;
  }
  DeletePointsBlock(block);
  DeletePointsBlock(nullptr);
}

TEST(CommInterface, TargetPathIsAFreshTkfNameWithoutExtensionInTheTempFolder) {
  std::wstring first, second;
  ASSERT_EQ(MakeDownloadTargetPath(first), 0u);
  ASSERT_EQ(MakeDownloadTargetPath(second), 0u);
  wchar_t temp[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  EXPECT_EQ(first.rfind(temp, 0), 0u) << first;
  std::wstring name = first.substr(wcslen(temp));
  EXPECT_EQ(name.rfind(L"TKF", 0), 0u);
  EXPECT_EQ(name.find(L'.'), std::wstring::npos);
  EXPECT_EQ(GetFileAttributesW((first + L".tmp").c_str()), INVALID_FILE_ATTRIBUTES);
  EXPECT_EQ(GetFileAttributesW((first + L".TMP").c_str()), INVALID_FILE_ATTRIBUTES);
  EXPECT_NE(first, second);
}

}  // namespace
