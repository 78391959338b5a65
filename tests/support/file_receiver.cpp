// A receiver of virtual files in a process of its own, as Explorer is one: it takes a
// drop (or the clipboard), reads "FileGroupDescriptorW", then "FileContents" for each
// index, and writes each stream into a folder under the descriptor's name.
//   file_receiver drop <folder> <x> <y> <seconds>   a window at (x, y), 200x150, that takes one drop
//   file_receiver paste <folder>                     what the clipboard holds, at once
// Prints one line per file ("received <name> <bytes>") or a failure, and exits 0 only if
// every file was written. Exit 2: nothing was dropped in time.
#include <windows.h>
#include <ole2.h>
#include <shlobj.h>

#include <cstdio>
#include <string>
#include <vector>

namespace {

std::wstring g_folder;
int g_result = 2;

bool WriteStream(IStream* stream, const std::wstring& path, size_t& total) {
  HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
  if (file == INVALID_HANDLE_VALUE) return false;
  std::vector<char> buffer(4096);
  bool ok = true;
  for (;;) {
    ULONG got = 0;
    HRESULT hr = stream->Read(buffer.data(), ULONG(buffer.size()), &got);
    DWORD written = 0;
    if (got && !WriteFile(file, buffer.data(), got, &written, nullptr)) ok = false;
    total += got;
    if (FAILED(hr) || got < buffer.size()) break;
  }
  CloseHandle(file);
  return ok;
}

// 0 if every file of the data was written.
int ReceiveAll(IDataObject* data) {
  FORMATETC descriptor{CLIPFORMAT(RegisterClipboardFormatW(CFSTR_FILEDESCRIPTORW)), nullptr, DVASPECT_CONTENT, -1,
                       TYMED_HGLOBAL};
  STGMEDIUM medium{};
  HRESULT hr = data->GetData(&descriptor, &medium);
  if (hr != S_OK) {
    std::printf("failed descriptor 0x%08lx\n", hr);
    return 1;
  }
  std::vector<std::wstring> names;
  if (auto* group = static_cast<FILEGROUPDESCRIPTORW*>(GlobalLock(medium.hGlobal))) {
    for (UINT i = 0; i < group->cItems; ++i) names.push_back(group->fgd[i].cFileName);
    GlobalUnlock(medium.hGlobal);
  }
  ReleaseStgMedium(&medium);
  int failures = 0;
  for (size_t i = 0; i < names.size(); ++i) {
    FORMATETC contents{CLIPFORMAT(RegisterClipboardFormatW(CFSTR_FILECONTENTS)), nullptr, DVASPECT_CONTENT, LONG(i),
                       TYMED_ISTREAM};
    STGMEDIUM stream{};
    hr = data->GetData(&contents, &stream);
    size_t bytes = 0;
    if (hr == S_OK && stream.tymed == TYMED_ISTREAM && WriteStream(stream.pstm, g_folder + L"\\" + names[i], bytes)) {
      std::printf("received %ls %zu\n", names[i].c_str(), bytes);
    } else {
      std::printf("failed contents %ls 0x%08lx\n", names[i].c_str(), hr);
      ++failures;
    }
    if (hr == S_OK) ReleaseStgMedium(&stream);
  }
  std::fflush(stdout);
  return failures ? 1 : 0;
}

struct Target : IDropTarget {
  STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
    if (riid != IID_IUnknown && riid != IID_IDropTarget) return *ppv = nullptr, E_NOINTERFACE;
    *ppv = this;
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return 2; }
  STDMETHODIMP_(ULONG) Release() override { return 1; }
  STDMETHODIMP DragEnter(IDataObject*, DWORD, POINTL, DWORD* effect) override {
    *effect &= DROPEFFECT_COPY;
    return S_OK;
  }
  STDMETHODIMP DragOver(DWORD, POINTL, DWORD* effect) override {
    *effect &= DROPEFFECT_COPY;
    return S_OK;
  }
  STDMETHODIMP DragLeave() override { return S_OK; }
  STDMETHODIMP Drop(IDataObject* data, DWORD, POINTL, DWORD* effect) override {
    g_result = ReceiveAll(data);
    *effect = g_result == 0 ? DROPEFFECT_COPY : DROPEFFECT_NONE;
    PostQuitMessage(0);
    return S_OK;
  }
};

}  // namespace

int wmain(int argc, wchar_t** argv) {
  if (argc < 3) return 3;
  std::wstring mode = argv[1];
  g_folder = argv[2];
  OleInitialize(nullptr);
  if (mode == L"paste") {
    IDataObject* data = nullptr;
    if (OleGetClipboard(&data) != S_OK) return std::printf("failed clipboard\n"), 1;
    g_result = ReceiveAll(data);
    data->Release();
  } else if (mode == L"drop" && argc >= 6) {
    WNDCLASSW wc{};
    wc.lpfnWndProc = DefWindowProcW;
    wc.hInstance = GetModuleHandleW(nullptr);
    wc.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
    wc.lpszClassName = L"MarlixTestReceiver";
    RegisterClassW(&wc);
    HWND window = CreateWindowExW(WS_EX_TOPMOST, wc.lpszClassName, L"Receiver", WS_POPUP | WS_VISIBLE | WS_BORDER,
                                  _wtoi(argv[3]), _wtoi(argv[4]), 200, 150, nullptr, nullptr, wc.hInstance, nullptr);
    Target target;
    RegisterDragDrop(window, &target);
    std::printf("ready\n");
    std::fflush(stdout);
    SetTimer(window, 1, _wtoi(argv[5]) * 1000, nullptr);
    MSG msg;
    while (GetMessageW(&msg, nullptr, 0, 0) > 0) {
      if (msg.message == WM_TIMER) break;
      DispatchMessageW(&msg);
    }
    RevokeDragDrop(window);
    DestroyWindow(window);
  } else {
    return 3;
  }
  OleUninitialize();
  return g_result;
}
