// Another program a person uses beside Explorer: a folder window taking dropped or pasted files, or a drag source.
//   shell_peer drop <folder> <x> <y> <seconds>   a 200x150 window at (x, y) that takes one drop
//   shell_peer paste <folder>                     what the clipboard holds, at once
// A receiver writes each "FileContents" stream into <folder> under its descriptor's name, prints
// "received <name> <bytes>" or a failure, and exits 0 only if every file was written (2: no drop in time).
//   shell_peer drag <x> <y> <seconds> <parsing name>...
// Drags the shell's data object of the items once the left button is pressed on its window; prints
// "effects <bit set of every effect the target answered>" and "result <hr> <effect>".
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
  char buffer[4096];
  bool ok = true;
  ULONG got = sizeof(buffer);
  for (DWORD written = 0; got == sizeof(buffer) && SUCCEEDED(stream->Read(buffer, sizeof(buffer), &got)); total += got)
    ok = ok && WriteFile(file, buffer, got, &written, nullptr);
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

// Static objects of this program: their counts don't matter.
template <class Interface>
struct Static : Interface {
  STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
    if (riid != IID_IUnknown && riid != __uuidof(Interface)) return *ppv = nullptr, E_NOINTERFACE;
    *ppv = this;
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return 2; }
  STDMETHODIMP_(ULONG) Release() override { return 1; }
};

struct Target : Static<IDropTarget> {
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

// Ends the drag when the button goes up, and remembers what the target offered on the way.
struct Source : Static<IDropSource> {
  STDMETHODIMP QueryContinueDrag(BOOL escape, DWORD keys) override {
    if (escape) return DRAGDROP_S_CANCEL;
    return keys & MK_LBUTTON ? S_OK : DRAGDROP_S_DROP;
  }
  STDMETHODIMP GiveFeedback(DWORD effect) override {
    seen |= 1u << (effect & 7);
    return DRAGDROP_S_USEDEFAULTCURSORS;
  }
  unsigned seen = 0;
};

HWND MakeWindow(const wchar_t* title, int x, int y) {
  WNDCLASSW wc{};
  wc.lpfnWndProc = DefWindowProcW;
  wc.hInstance = GetModuleHandleW(nullptr);
  wc.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
  wc.lpszClassName = L"MarlixShellPeer";
  RegisterClassW(&wc);
  return CreateWindowExW(WS_EX_TOPMOST, wc.lpszClassName, title, WS_POPUP | WS_VISIBLE | WS_BORDER, x, y, 200, 150,
                         nullptr, nullptr, wc.hInstance, nullptr);
}

// Runs messages until `stop` says so or `seconds` pass; false on time-out.
template <class Stop>
bool Pump(HWND window, int seconds, Stop stop) {
  SetTimer(window, 1, seconds * 1000, nullptr);
  MSG msg;
  while (GetMessageW(&msg, nullptr, 0, 0) > 0) {
    if (msg.message == WM_TIMER && msg.hwnd == window) return false;
    if (stop(msg)) return true;
    DispatchMessageW(&msg);
  }
  return true;
}

int Drag(int x, int y, int seconds, int count, wchar_t** names) {
  std::vector<LPITEMIDLIST> absolute(count);
  for (int i = 0; i < count; ++i)
    if (SHParseDisplayName(names[i], nullptr, &absolute[i], 0, nullptr) != S_OK) return std::printf("failed parse %ls\n", names[i]), 1;
  IShellFolder* parent = nullptr;
  LPCITEMIDLIST child = nullptr;
  if (SHBindToParent(absolute[0], IID_IShellFolder, reinterpret_cast<void**>(&parent), &child) != S_OK) return 1;
  std::vector<LPCITEMIDLIST> children;
  for (LPITEMIDLIST item : absolute) children.push_back(ILFindLastID(item));
  IDataObject* data = nullptr;
  HRESULT hr = parent->GetUIObjectOf(nullptr, UINT(count), children.data(), IID_IDataObject, nullptr,
                                     reinterpret_cast<void**>(&data));
  parent->Release();
  if (hr != S_OK) return std::printf("failed data object 0x%08lx\n", hr), 1;
  HWND window = MakeWindow(L"Drag source", x, y);
  std::printf("ready\n");
  std::fflush(stdout);
  int rc = 2;
  if (Pump(window, seconds, [](const MSG& msg) { return msg.message == WM_LBUTTONDOWN; })) {
    Source source;
    DWORD effect = 0;
    hr = DoDragDrop(data, &source, DROPEFFECT_COPY | DROPEFFECT_MOVE | DROPEFFECT_LINK, &effect);
    std::printf("effects %u\nresult 0x%08lx %lu\n", source.seen, hr, effect);
    rc = 0;
  }
  std::fflush(stdout);
  data->Release();
  for (LPITEMIDLIST item : absolute) CoTaskMemFree(item);
  DestroyWindow(window);
  return rc;
}

}  // namespace

int wmain(int argc, wchar_t** argv) {
  if (argc < 3) return 3;
  std::wstring mode = argv[1];
  g_folder = argv[2];
  OleInitialize(nullptr);
  if (mode == L"drag" && argc >= 6) {
    g_result = Drag(_wtoi(argv[2]), _wtoi(argv[3]), _wtoi(argv[4]), argc - 5, argv + 5);
  } else if (mode == L"paste") {
    IDataObject* data = nullptr;
    if (OleGetClipboard(&data) != S_OK) return std::printf("failed clipboard\n"), 1;
    g_result = ReceiveAll(data);
    data->Release();
  } else if (mode == L"drop" && argc >= 6) {
    HWND window = MakeWindow(L"Receiver", _wtoi(argv[3]), _wtoi(argv[4]));
    Target target;
    RegisterDragDrop(window, &target);
    std::printf("ready\n");
    std::fflush(stdout);
    Pump(window, _wtoi(argv[5]), [](const MSG&) { return false; });
    RevokeDragDrop(window);
    DestroyWindow(window);
  } else {
    return 3;
  }
  OleUninitialize();
  return g_result;
}
