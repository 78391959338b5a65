// Explorer short of memory: whichever allocation fails, no exception, no leak, and the module still unloads.
// Each place that allocates (operator new or the task allocator), told apart by its call stack, fails in turn
// at its first allocation: a loop's later rounds take the same road as its first.
#include <gtest/gtest.h>
#include <windows.h>
#include <commctrl.h>
#include <algorithm>
#include <atomic>
#include <cstdio>
#include <functional>
#include "shell/shell_folder.h"
#include "base/class_ids.h"
#include "base/com_base.h"
#include "server/object_map.h"
#include "server/server_module.h"
#include "shell/shell_test_util.h"
#include "shell/shell_view.h"
#include "store/station_record.h"
#include "support/browser_double.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"
namespace {
std::atomic<long> liveBlocks{0};  // operator new blocks not yet deleted
std::atomic<long> liveTaskBlocks{0};  // task allocator blocks made while the spy was in
DWORD armedThread = 0;
bool everyThread = false;  // counts other threads too while armed: the view's worker
// The places met by a run that failed nothing, in order; then the one that fails (0: none).
ULONG64 places[8192], failAt = 0;
size_t placeCount = 0;
SRWLOCK placesLock = SRWLOCK_INIT;
std::atomic<bool> failed{false};
// The row's own inputs are made with counting paused: only the module's calls are swept.
struct Paused {
  Paused() : thread(std::exchange(armedThread, 0)) {}
  ~Paused() { armedThread = thread; }
  DWORD thread;
};
// A place that allocates: the chain of our own calls that leads to it, leaving out the system's
// (they change with how a message came) and, on the armed thread, those below the row's call
// (they change with where the sweep started it).
USHORT rowDepth = 0;
USHORT Frames(void** frames) noexcept { return RtlCaptureStackBackTrace(1, 100, frames, nullptr); }
bool Ours(const void* address) noexcept {
  static const auto* image = reinterpret_cast<const BYTE*>(GetModuleHandleW(nullptr));
  static const auto* headers = reinterpret_cast<const IMAGE_NT_HEADERS*>(
      image + reinterpret_cast<const IMAGE_DOS_HEADER*>(image)->e_lfanew);
  return address >= image && address < image + headers->OptionalHeader.SizeOfImage;
}
ULONG64 Place() noexcept {
  void* frames[100];
  USHORT n = Frames(frames);
  if (GetCurrentThreadId() == armedThread) n -= std::min(n, rowDepth);
  ULONG64 hash = 14695981039346656037ull;
  for (USHORT i = 0; i < n; ++i)
    if (Ours(frames[i])) hash = (hash ^ reinterpret_cast<ULONG_PTR>(frames[i])) * 1099511628211ull;
  return hash;
}
bool ShouldFail() noexcept {
  if (!armedThread || (!everyThread && GetCurrentThreadId() != armedThread)) return false;
  const ULONG64 place = Place();
  if (failAt) return place == failAt && !failed.exchange(true);
  AcquireSRWLockExclusive(&placesLock);
  if (std::find(places, places + placeCount, place) == places + placeCount && placeCount < std::size(places))
    places[placeCount++] = place;
  ReleaseSRWLockExclusive(&placesLock);
  return false;
}
void* Allocate(size_t size) noexcept {
  void* block = ShouldFail() ? nullptr : std::malloc(size ? size : 1);
  liveBlocks += block != nullptr;
  return block;
}
void Release(void* block) noexcept {
  liveBlocks -= block != nullptr;
  std::free(block);
}
// The task allocator, through which item ids and returned strings go.
class Spy final : public IMallocSpy {
 public:
  STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
    *ppv = riid == IID_IUnknown || riid == IID_IMallocSpy ? this : nullptr;
    return *ppv ? S_OK : E_NOINTERFACE;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return 2; }
  STDMETHODIMP_(ULONG) Release() override { return 1; }
  STDMETHODIMP_(SIZE_T) PreAlloc(SIZE_T size) override { return ShouldFail() ? 0 : size; }
  STDMETHODIMP_(void*) PostAlloc(void* block) override {
    if (block) ++liveTaskBlocks;
    return block;
  }
  STDMETHODIMP_(void*) PreFree(void* block, BOOL spied) override {
    if (block && spied) --liveTaskBlocks;
    return block;
  }
  STDMETHODIMP_(void) PostFree(BOOL) override {}
  STDMETHODIMP_(SIZE_T) PreRealloc(void* block, SIZE_T size, void** out, BOOL) override {
    *out = block;
    return size;
  }
  STDMETHODIMP_(void*) PostRealloc(void* block, BOOL) override { return block; }
  STDMETHODIMP_(void*) PreGetSize(void* block, BOOL) override { return block; }
  STDMETHODIMP_(SIZE_T) PostGetSize(SIZE_T size, BOOL) override { return size; }
  STDMETHODIMP_(void*) PreDidAlloc(void* block, BOOL) override { return block; }
  STDMETHODIMP_(int) PostDidAlloc(void*, BOOL, int result) override { return result; }
  STDMETHODIMP_(void) PreHeapMinimize() override {}
  STDMETHODIMP_(void) PostHeapMinimize() override {}
} spy;
}  // namespace
// The runtime's other forms (arrays, nothrow) come through these.
void* operator new(size_t size) {
  if (void* block = Allocate(size)) return block;
  throw std::bad_alloc();
}
void operator delete(void* block) noexcept { Release(block); }
void operator delete(void* block, size_t) noexcept { Release(block); }
namespace {
const wchar_t kStore[] = L"Software\\Gravon\\Shell Extensions\\Marlix DL View\\Levels\\Station ";
// What the host does in one row, releasing everything it got.
struct Row {
  const char* name;
  std::function<void()> run;
};
template <class Make>
auto Unswept(Make make) {
  Paused paused;
  return make();
}
UniqueList Id(tagPIDLTYPE type, const wchar_t* text) {
  return Unswept([&] { return MakeId(type, text); });
}
com::ComPtr<IShellFolder> Root() {
  com::ComPtr<IShellFolder> root;
  if (FAILED(CreateMarlixDLShellFolder(IID_IShellFolder, root.PutVoid()))) return nullptr;
  com::ComPtr<IPersistFolder> persist;
  if (root.As(&persist) != S_OK || persist->Initialize(nullptr) != S_OK) return nullptr;
  return root;
}
void FolderBinding() {
  auto root = Root();
  if (!root) return;
  wchar_t name[] = L"Alpha level\\file1.tkf";
  LPITEMIDLIST parsed = nullptr;
  root->ParseDisplayName(nullptr, nullptr, name, nullptr, &parsed, nullptr);
  CoTaskMemFree(parsed);
  UniqueList alpha = Id(PIDL_LEVEL, L"Alpha level");
  com::ComPtr<IShellFolder> level;
  root->BindToObject(alpha.Get(), nullptr, IID_IShellFolder, level.PutVoid());
}
void FolderEnumeration() {
  auto root = Root();
  if (!root) return;
  IEnumIDList* list = nullptr;
  if (root->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &list) == S_OK) {
    LPITEMIDLIST item = nullptr;
    while (list->Next(1, &item, nullptr) == S_OK) CoTaskMemFree(item);
    list->Release();
  }
}
void FolderAnswers() {
  auto root = Root();
  if (!root) return;
  UniqueList alpha = Id(PIDL_LEVEL, L"Alpha level"), beta = Id(PIDL_LEVEL, L"Beta level");
  LPCITEMIDLIST items[] = {alpha.Get(), beta.Get()};
  SFGAOF attributes = SFGAO_VALIDATE;
  root->GetAttributesOf(2, items, &attributes);
  root->CompareIDs(0, alpha.Get(), beta.Get());
  for (DWORD flags : {0x0000, 0x8000, 0x8001}) {
    STRRET name{};
    if (root->GetDisplayNameOf(alpha.Get(), flags, &name) == S_OK && name.uType == STRRET_WSTR)
      CoTaskMemFree(name.pOleStr);
  }
}
void FolderItemObjects() {
  auto root = Root();
  if (!root) return;
  UniqueList alpha = Id(PIDL_LEVEL, L"Alpha level");
  LPCITEMIDLIST items[] = {alpha.Get()};
  for (REFIID riid : {IID_IExtractIconW, IID_IQueryInfo, IID_IDataObject, IID_IDropTarget}) {
    com::ComPtr<IUnknown> object;
    if (root->GetUIObjectOf(nullptr, 1, items, riid, nullptr, object.PutVoid()) != S_OK) continue;
    com::ComPtr<IQueryInfo> info;
    com::ComPtr<IDataObject> data;
    if (object->QueryInterface(IID_IQueryInfo, info.PutVoid()) == S_OK) {
      LPWSTR tip = nullptr;
      EXPECT_TRUE(info->GetInfoTip(0, &tip) != S_OK || tip[0]) << "a tip object without its item";
      CoTaskMemFree(tip);
    }
    if (object.As(&data) == S_OK) {
      FORMATETC request = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(L"FileGroupDescriptorW")), nullptr,
                           DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
      STGMEDIUM medium{};
      HRESULT hr = data->GetData(&request, &medium);
      EXPECT_NE(hr, S_FALSE) << "a data object without its item";
      if (hr == S_OK) ReleaseStgMedium(&medium);
    }
  }
  com::ComPtr<IUnknown> menu;
  root->CreateViewObject(nullptr, IID_IContextMenu, menu.PutVoid());
}
void DataObjectFormats() {
  auto object = com::Make<CMarlixDLDataObject>();
  if (!object) return;
  UniqueList alpha = Unswept([] { return MakeFull(L"Marlix Digital Levels\\Alpha level"); });
  object->AddItem(alpha.Get());
  object->AddItem(alpha.Get());
  for (const wchar_t* format : {L"Preferred DropEffect", L"FileGroupDescriptorW", L"Shell IDList Array",
                                L"Marlix Total Stations", L"FileContents"}) {
    const bool stream = format[4] == L'C';
    FORMATETC request = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(format)), nullptr, DVASPECT_CONTENT, 0,
                         static_cast<DWORD>(stream ? TYMED_ISTREAM : TYMED_HGLOBAL)};
    STGMEDIUM medium{};
    if (object->GetData(&request, &medium) == S_OK) ReleaseStgMedium(&medium);
    object->QueryGetData(&request);
  }
  IEnumFORMATETC* formats = nullptr;
  if (object->EnumFormatEtc(DATADIR_GET, &formats) == S_OK) {
    for (FORMATETC entry; formats->Next(1, &entry, nullptr) == S_OK;) continue;
    formats->Release();
  }
}
// A person dismissing each dialog as it comes up: Cancel on a sheet, Close on a message box.
// The hook runs on the thread that shows it and posts only, so it makes no allocation the sweep counts.
LRESULT CALLBACK Dismiss(int code, WPARAM wParam, LPARAM lParam) {
  const auto* call = reinterpret_cast<const CWPRETSTRUCT*>(lParam);
  if (code == HC_ACTION && call->message == WM_INITDIALOG && !(GetWindowLongW(call->hwnd, GWL_STYLE) & WS_CHILD)) {
    if (PropSheet_GetCurrentPageHwnd(call->hwnd)) PostMessageW(call->hwnd, WM_COMMAND, IDCANCEL, 0);
    else PostMessageW(call->hwnd, WM_CLOSE, 0, 0);
  }
  return CallNextHookEx(nullptr, code, wParam, lParam);
}
// Runs `action`, a modal one, while the person dismisses what it shows.
template <class Action>
void Dismissing(Action action) {
  HHOOK person = SetWindowsHookExW(WH_CALLWNDPROCRET, Dismiss, nullptr, GetCurrentThreadId());
  action();
  UnhookWindowsHookEx(person);
}
// A file's contents: the download dialog comes up and is cancelled before Start.
void DownloadCancelled() {
  auto object = com::Make<CMarlixDLDataObject>();
  if (!object) return;
  UniqueList file = Unswept([] { return MakeFull(L"Marlix Digital Levels\\Alpha level\\file1.tkf"); });
  object->AddItem(file.Get());
  FORMATETC request = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(L"FileContents")), nullptr, DVASPECT_CONTENT,
                       0, TYMED_ISTREAM};
  STGMEDIUM medium{};
  Dismissing([&] {
    if (object->GetData(&request, &medium) == S_OK) ReleaseStgMedium(&medium);
  });
}
// The view opened in a browser; filled, with its worker's enumerator and the rows made from it,
// after which the clip must have stopped whatever failed; in use, once filled, with the menus of
// its activation, a copy of a level, its paste and a refill by the Details command; or, once
// filled, with the level's property sheet.
enum class Stage { Open, Fill, Use, Sheet };
void View(Stage stage) {
  com::ComPtr<BrowserDouble> browser = Unswept([] { return com::Make<BrowserDouble>(); });
  everyThread = stage != Stage::Open;
  if (auto root = Root()) {
    IShellView* view = nullptr;
    if (root->CreateViewObject(nullptr, IID_IShellView, reinterpret_cast<void**>(&view)) == S_OK) {
      FOLDERSETTINGS settings{FVM_DETAILS, 0};
      RECT box{0, 0, 300, 200};
      HWND window = nullptr;
      // In use and for the sheet, the opening and the first fill are left to the rows before.
      const DWORD armed = armedThread;
      if (stage >= Stage::Use) armedThread = 0;
      if (view->CreateViewWindow(nullptr, &settings, browser.Get(), &box, &window) == S_OK) {
        HWND list = FindWindowExW(window, nullptr, WC_LISTVIEWW, nullptr);
        const auto filled = [&] {
          return ui::PumpFor([&] { return !FindWindowExW(list, nullptr, ANIMATE_CLASSW, nullptr); }, 5000);
        };
        EXPECT_TRUE(stage == Stage::Open || filled()) << "the clip still plays";
        if (stage >= Stage::Use) {
          LVITEMW selected{};
          selected.stateMask = selected.state = LVIS_SELECTED;
          SendMessageW(list, LVM_SETITEMSTATE, 1, reinterpret_cast<LPARAM>(&selected));
          armedThread = armed;
          view->UIActivate(SVUIA_ACTIVATE_FOCUS);
          if (stage == Stage::Sheet) {
            Dismissing([&] { SendMessageW(window, WM_COMMAND, kCmdProperties, 0); });
          } else {
            SendMessageW(window, WM_COMMAND, kCmdCopy, 0);
            SendMessageW(window, WM_COMMAND, kCmdPaste, 0);
            SendMessageW(window, WM_COMMAND, kCmdDetails, 0);
            EXPECT_TRUE(filled()) << "the clip of the refill still plays";
          }
          Paused paused;
          OleSetClipboard(nullptr);
          CStationRecord copy;
          copy.Name = L"Copy of Alpha level";
          DeleteStation(copy);
          view->UIActivate(SVUIA_DEACTIVATE);
          EXPECT_EQ(browser->lent, 0) << "a merged menu the browser filled was never given back";
        }
        view->DestroyViewWindow();
      }
      armedThread = armed;
      view->Release();
    }
  }
  Paused paused;
  everyThread = false;
  browser.Reset();
  // Messages go on being handled until the view's worker has let go of the module.
  ui::PumpFor([] { return com::ModuleLockCount() == 0; }, 5000);
}
void Registration() {
  CServerModule server;
  server.SetTypeLibId(LIBID_MarlixDLShellExtLib);
  server.Init(ModuleObjectMap(), GetModuleHandleW(nullptr));
  server.RegisterServer();
  server.UnregisterServer();
}
const Row kRows[] = {
    {"folder: initialize, parse and bind", FolderBinding},
    {"folder: enumeration", FolderEnumeration},
    {"folder: attributes, comparison and names", FolderAnswers},
    {"folder: item objects, tip and menu", FolderItemObjects},
    {"data object: every format and the format list", DataObjectFormats},
    {"data object: a file's contents, its download dialog cancelled", DownloadCancelled},
    {"registration and unregistration", Registration},
    {"the view's creation, in a browser", [] { View(Stage::Open); }},
    {"the view's fill, on its worker thread and the window's", [] { View(Stage::Fill); }},
    {"the view's menus, a copy, its paste and a refill", [] { View(Stage::Use); }},
    {"the view's property sheet of a level", [] { View(Stage::Sheet); }},
};
class AllocationSweep : public testing::TestWithParam<Row> {
 protected:
  static void SetUpTestSuite() { ASSERT_EQ(CoRegisterMallocSpy(&spy), S_OK); }
  static void TearDownTestSuite() { CoRevokeMallocSpy(); }
  RegistrySandbox sandbox_{{HKEY_CLASSES_ROOT, HKEY_LOCAL_MACHINE, HKEY_CURRENT_USER}};
};
// Runs the row with the first allocation at `place` failing (none for 0); false if none failed.
bool RunFailing(const Row& row, ULONG64 place) {
  failAt = place;
  failed = false;
  void* frames[100];
  rowDepth = Frames(frames);
  armedThread = GetCurrentThreadId();
  try {
    row.run();
  } catch (...) {
    armedThread = 0;
    ADD_FAILURE() << "an exception came out with an allocation at place " << place << " failing";
    return false;
  }
  armedThread = 0;
  return failed;
}
TEST_P(AllocationSweep, NoExceptionNoLeakAndTheModuleUnloads) {
  const Row& row = GetParam();
  for (int n : {0, 1})
    RegWriteString(HKEY_CURRENT_USER, kStore + std::to_wstring(n), L"Name", n ? L"Beta level" : L"Alpha level");
  RegWriteString(HKEY_LOCAL_MACHINE, L"HARDWARE\\DEVICEMAP\\SERIALCOMM", L"a", L"COM3");  // the sheet's port list
  row.run();  // first-use state of the process is made once, outside the count
  placeCount = 0;
  RunFailing(row, 0);
  long swept = 0;
  for (size_t i = 0; i < placeCount && !HasFailure(); ++i) {
    const long blocks = liveBlocks, taskBlocks = liveTaskBlocks;
    long handles = KernelHandleCount();
    swept += RunFailing(row, places[i]);
    EXPECT_EQ(liveBlocks - blocks, 0) << "with place " << i << " failing";
    // Wine opens some handles once for the life of the process: a leak is what comes back.
    if (KernelHandleCount() != handles) handles = KernelHandleCount(), RunFailing(row, places[i]);
    EXPECT_EQ(KernelHandleCount() - handles, 0) << "kernel handles (registry keys too), place " << i << " failing";
    EXPECT_EQ(liveTaskBlocks - taskBlocks, 0) << "task allocator, with place " << i << " failing";
    EXPECT_EQ(com::ModuleLockCount(), 0) << "with place " << i << " failing";
  }
  std::printf("[ swept    ] %s: %ld of %zu places\n", row.name, swept, placeCount);
  EXPECT_TRUE(swept > 0 && swept == static_cast<long>(placeCount)) << "every place met, and only those, failed once";
}
INSTANTIATE_TEST_SUITE_P(Rows, AllocationSweep, testing::ValuesIn(kRows),
                         [](const testing::TestParamInfo<Row>& info) { return "Row" + std::to_string(info.index); });
}  // namespace
