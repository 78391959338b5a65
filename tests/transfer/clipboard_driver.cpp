// Two processes and the real OLE clipboard. "owner" puts the data object of a level's
// file on the clipboard, starts "reader" and works its own download dialog from a helper
// thread; "reader" takes the descriptor and then the contents through OLE's marshalling
// and checks the bytes. The owner then checks that the temporary file is gone.
#include <windows.h>
#include <ole2.h>
#include <shlobj.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "server/com_base.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"

namespace {

constexpr DWORD kLimitMs = 60000;

int Fail(const char* what, long code = 0) {
  std::printf("FAIL: %s (0x%08lx)\n", what, static_cast<unsigned long>(code));
  return 1;
}

CLIPFORMAT Cf(const wchar_t* name) { return static_cast<CLIPFORMAT>(RegisterClipboardFormatW(name)); }

int Reader() {
  com::ComPtr<IDataObject> clip;
  HRESULT hr = OleGetClipboard(clip.Put());
  if (FAILED(hr)) return Fail("OleGetClipboard", hr);

  FORMATETC f{Cf(L"FileGroupDescriptorW"), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
  STGMEDIUM m{};
  hr = clip->GetData(&f, &m);
  if (hr != S_OK) return Fail("descriptor", hr);
  {
    win::GlobalLockGuard<FILEGROUPDESCRIPTORW> group(m.hGlobal);
    if (!group.Get() || group.Get()->cItems != 1 || std::wcscmp(group.Get()->fgd[0].cFileName, L"file1.tkf"))
      return Fail("descriptor contents");
  }
  ReleaseStgMedium(&m);

  f = {Cf(L"FileContents"), nullptr, DVASPECT_CONTENT, 0, TYMED_ISTREAM};
  hr = clip->GetData(&f, &m);
  if (hr != S_OK || m.tymed != TYMED_ISTREAM || !m.pstm) return Fail("contents", hr);
  std::vector<char> bytes;
  char block[4096];
  ULONG got = 0;
  do {
    hr = m.pstm->Read(block, sizeof block, &got);
    if (hr == S_OK) bytes.insert(bytes.end(), block, block + got);
  } while (hr == S_OK && got == sizeof block);
  ReleaseStgMedium(&m);
  if (hr != S_OK) return Fail("read", hr);
  if (!IsStandInJob(bytes)) return Fail("bytes differ from the stand-in's job", long(bytes.size()));
  std::printf("ok: %zu bytes through the clipboard\n", bytes.size());
  return 0;
}

int Owner(const wchar_t* self) {
  RegistrySandbox sandbox;
  PrivateTempDir temp;
  CStationRecord level;
  level.Name = L"Clip";
  if (AddStation(level) != S_OK) return Fail("AddStation");
  const std::set<std::wstring> before = TransferFiles();

  auto data = com::Make<CMarlixDLDataObject>();
  win::UniqueCoMem<ITEMIDLIST> list(MakeFullList(L"Clip", true));
  data->AddItem(list.Get());
  HRESULT hr = OleSetClipboard(data.Get());
  data.Reset();  // the clipboard holds the only reference now
  if (FAILED(hr)) return Fail("OleSetClipboard", hr);

  DialogDriver driver(GetCurrentThreadId(), 220, {}, kLimitMs);
  std::wstring cmd = L"\"" + std::wstring(self) + L"\" reader";
  STARTUPINFOW si{sizeof si};
  PROCESS_INFORMATION pi{};
  if (!CreateProcessW(self, cmd.data(), nullptr, nullptr, FALSE, 0, nullptr, nullptr, &si, &pi))
    return Fail("CreateProcess", GetLastError());
  CloseHandle(pi.hThread);

  // Keep the apartment serving the reader's calls until it ends.
  const ULONGLONG deadline = GetTickCount64() + kLimitMs;
  while (MsgWaitForMultipleObjects(1, &pi.hProcess, FALSE, 100, QS_ALLINPUT) != WAIT_OBJECT_0) {
    MSG msg;
    while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) {
      TranslateMessage(&msg);
      DispatchMessageW(&msg);
    }
    if (GetTickCount64() > deadline) {
      TerminateProcess(pi.hProcess, 99);
      WaitForSingleObject(pi.hProcess, 5000);
      break;
    }
  }
  DWORD readerCode = 1;
  GetExitCodeProcess(pi.hProcess, &readerCode);
  CloseHandle(pi.hProcess);
  const bool clicked = driver.Finish();
  OleSetClipboard(nullptr);

  if (!clicked) return Fail("download dialog never came up");
  if (readerCode != 0) return Fail("reader", long(readerCode));
  if (TransferFiles() != before) return Fail("a temporary .txt file stayed behind");
  return 0;
}

}  // namespace

int main() {
  int argc = 0;
  wchar_t** argv = CommandLineToArgvW(GetCommandLineW(), &argc);
  wchar_t self[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  if (FAILED(OleInitialize(nullptr))) return 3;
  int rc = 2;
  if (argc >= 2 && std::wcscmp(argv[1], L"owner") == 0) rc = Owner(self);
  else if (argc >= 2 && std::wcscmp(argv[1], L"reader") == 0) rc = Reader();
  OleUninitialize();
  LocalFree(argv);
  return rc;
}
