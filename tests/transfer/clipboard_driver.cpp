// Two processes and the real OLE clipboard. "owner" puts a level's file on the clipboard,
// starts "reader" and works its own download dialog; "reader" takes the descriptor and then
// the contents through OLE's marshalling and checks the bytes; the owner, that no file stays.
#include <windows.h>
#include <ole2.h>
#include <process.h>

#include <cstdio>
#include <cwchar>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"

namespace {

int Fail(const char* what, long code = 0) {
  std::printf("FAIL: %s (0x%08lx)\n", what, static_cast<unsigned long>(code));
  return 1;
}

int Reader() {
  com::ComPtr<IDataObject> clip;
  FORMATETC f = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL);
  STGMEDIUM m{};
  HRESULT hr = OleGetClipboard(clip.Put());
  if (FAILED(hr) || (hr = clip->GetData(&f, &m)) != S_OK) return Fail("descriptor", hr);
  const FILEGROUPDESCRIPTORW group = *win::GlobalLockGuard<FILEGROUPDESCRIPTORW>(m.hGlobal).Get();
  ReleaseStgMedium(&m);
  if (group.cItems != 1 || std::wcscmp(group.fgd[0].cFileName, L"file1.tkf")) return Fail("descriptor contents");
  f = Request(L"FileContents", TYMED_ISTREAM, 0);
  if ((hr = clip->GetData(&f, &m)) != S_OK || m.tymed != TYMED_ISTREAM) return Fail("contents", hr);
  const std::vector<char> bytes = ReadAll(m.pstm);
  ReleaseStgMedium(&m);
  if (!IsStandInJob(bytes)) return Fail("bytes differ from the stand-in's job", long(bytes.size()));
  std::printf("ok: %zu bytes through the clipboard\n", bytes.size());
  return 0;
}

int Owner() {
  RegistrySandbox sandbox;
  CStationRecord level;
  level.Name = L"Clip";
  if (AddStation(level) != S_OK) return Fail("AddStation");
  const std::set<std::wstring> before = TransferFiles();
  {
    auto data = com::Make<CMarlixDLDataObject>();
    data->AddItem(win::UniqueCoMem<ITEMIDLIST>(MakeFullList(L"Clip", true)).Get());
    if (HRESULT hr = OleSetClipboard(data.Get()); FAILED(hr)) return Fail("OleSetClipboard", hr);
  }  // the clipboard holds the only reference now
  DialogDriver driver(220, {}, 60000);
  wchar_t self[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  HANDLE reader = HANDLE(_wspawnl(_P_NOWAIT, self, L"driver", L"reader", nullptr));
  if (reader == INVALID_HANDLE_VALUE) return Fail("starting the reader");
  DWORD index, readerCode = 1;  // the apartment serves the reader's calls until it ends
  if (CoWaitForMultipleHandles(COWAIT_DISPATCH_WINDOW_MESSAGES | COWAIT_DISPATCH_CALLS, 60000, 1,
                               &reader, &index) != S_OK)
    TerminateProcess(reader, 99);
  GetExitCodeProcess(reader, &readerCode);
  CloseHandle(reader);
  const bool clicked = driver.Finish();
  OleSetClipboard(nullptr);
  if (!clicked) return Fail("download dialog never came up");
  if (readerCode != 0) return Fail("reader", long(readerCode));
  if (TransferFiles() != before) return Fail("a temporary .txt file stayed behind");
  return 0;
}

}  // namespace

int main() {
  const std::wstring command = GetCommandLineW();
  if (FAILED(OleInitialize(nullptr))) return 3;
  const int rc = command.ends_with(L" owner") ? Owner() : command.ends_with(L" reader") ? Reader() : 2;
  OleUninitialize();
  return rc;
}
