// A level's file copied to the clipboard pastes whole in another process, as Explorer pastes it, leaving no file behind.
// The driver puts the file of a level with the longest name on the clipboard, starts the file
// receiver, which pastes it, and works its own download dialog meanwhile.
#include <windows.h>
#include <ole2.h>
#include <process.h>
#include <shellapi.h>

#include <cstdio>
#include <cwchar>

#include "data_test_support.h"
#include "base/resource_ids.h"
#include "base/win_handles.h"
#include "store/station_record.h"
#include "support/modal_user.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"

namespace {

int Fail(const char* what, long code = 0) {
  std::printf("FAIL: %s (0x%08lx)\n", what, static_cast<unsigned long>(code));
  return 1;
}

int Owner(const wchar_t* receiver) {
  RegistrySandbox sandbox;
  CStationRecord level;
  level.Name = std::wstring(kMaxStationNameLength, L'c');  // the road at the longest name
  if (AddStation(level) != S_OK) return Fail("AddStation");
  const std::set<std::wstring> before = TransferFiles();
  {
    auto data = com::Make<CMarlixDLDataObject>();
    data->AddItem(win::UniqueCoMem<ITEMIDLIST>(MakeFullList(level.Name, true)).Get());
    if (HRESULT hr = OleSetClipboard(data.Get()); FAILED(hr)) return Fail("OleSetClipboard", hr);
  }  // the clipboard holds the only reference now
  const std::wstring folder = TempDir() + L"marlix_paste_" + std::to_wstring(GetCurrentProcessId());
  CreateDirectoryW(folder.c_str(), nullptr);
  HANDLE reader = HANDLE(_wspawnl(_P_NOWAIT, receiver, L"receiver", L"paste", folder.c_str(), nullptr));
  if (reader == INVALID_HANDLE_VALUE) return Fail("starting the reader");
  bool started = false;
  DWORD readerCode = 1;
  user::RunModal([&] {  // the apartment serves the reader's calls until it ends
    DWORD index;
    if (CoWaitForMultipleHandles(COWAIT_DISPATCH_WINDOW_MESSAGES | COWAIT_DISPATCH_CALLS, 60000, 1, &reader, &index) != S_OK)
      TerminateProcess(reader, 99);
    return INT_PTR(0);
  }, [&](HWND dialog) { started = true; user::Click(dialog, IDC_TRANSFER_START); }, nullptr, 60000);
  GetExitCodeProcess(reader, &readerCode);
  CloseHandle(reader);
  OleSetClipboard(nullptr);
  if (!started) return Fail("download dialog never came up");
  if (readerCode != 0) return Fail("reader", long(readerCode));
  if (TransferFiles() != before) return Fail("a temporary .txt file stayed behind");
  std::vector<char> bytes;
  if (FILE* file = _wfopen((folder + L"\\file1.tkf").c_str(), L"rb")) {
    for (int c; (c = std::fgetc(file)) != EOF;) bytes.push_back(char(c));
    std::fclose(file);
  }
  if (!IsStandInJob(bytes)) return Fail("the pasted file1.tkf is not the stand-in's job", long(bytes.size()));
  std::printf("ok: %zu bytes through the clipboard\n", bytes.size());
  return 0;
}

}  // namespace

int main() {
  int argc = 0;
  wchar_t** argv = CommandLineToArgvW(GetCommandLineW(), &argc);
  if (argc < 2 || FAILED(OleInitialize(nullptr))) return 3;
  const int rc = Owner(argv[1]);
  OleUninitialize();
  return rc;
}
