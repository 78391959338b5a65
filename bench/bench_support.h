// What the benchmarks share: a scratch store, the bare registry walk they are measured
// against, the browser the view benchmarks host their views in, and a first-paint clock.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "base/com_base.h"
#include "store/station_record.h"

namespace bench {

// A scratch copy of HKEY_CURRENT_USER for the life of the object, removed afterwards. Without
// one the benchmark would measure the user's own levels, so it ends there.
class ScratchStore {
 public:
  explicit ScratchStore(const wchar_t* name)
      : path_(std::wstring(L"Software\\") + name + std::to_wstring(GetCurrentProcessId())) {
    if (RegCreateKeyExW(HKEY_CURRENT_USER, path_.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &key_, nullptr) !=
            ERROR_SUCCESS ||
        RegOverridePredefKey(HKEY_CURRENT_USER, key_) != ERROR_SUCCESS) {
      std::fprintf(stderr, "no scratch key\n");
      std::exit(1);
    }
  }
  ~ScratchStore() {
    RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
    if (key_) RegCloseKey(key_);
    RegDeleteTreeW(HKEY_CURRENT_USER, path_.c_str());
  }

 private:
  std::wstring path_;
  HKEY key_ = nullptr;
};

// The levels' names read straight from the registry: what enumeration costs at the least.
inline size_t BareWalk() {
  HKEY levels = nullptr;
  if (RegOpenKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, KEY_READ, &levels) != ERROR_SUCCESS) return 0;
  size_t count = 0;
  for (DWORD index = 0;; ++index) {
    wchar_t key[MAX_PATH];
    DWORD length = MAX_PATH;
    if (RegEnumKeyExW(levels, index, key, &length, nullptr, nullptr, nullptr, nullptr) != ERROR_SUCCESS) break;
    HKEY level = nullptr;
    if (RegOpenKeyExW(levels, key, 0, KEY_READ, &level) != ERROR_SUCCESS) continue;
    wchar_t name[MAX_PATH + 1];
    DWORD size = MAX_PATH * sizeof(wchar_t);
    if (RegQueryValueExW(level, L"Name", nullptr, nullptr, reinterpret_cast<BYTE*>(name), &size) == ERROR_SUCCESS)
      ++count;
    RegCloseKey(level);
  }
  RegCloseKey(levels);
  return count;
}

// Writes levels "Level 0" .. "Level <count-1>" key by key, with a name only: AddStation
// would search the growing store each time.
inline void SeedLevels(int count) {
  HKEY levels = nullptr;
  RegCreateKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &levels,
                  nullptr);
  for (int i = 0; i < count; ++i) {
    std::wstring key = L"Station " + std::to_wstring(i), name = L"Level " + std::to_wstring(i);
    HKEY level = nullptr;
    RegCreateKeyExW(levels, key.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &level, nullptr);
    RegSetValueExW(level, L"Name", 0, REG_SZ, reinterpret_cast<const BYTE*>(name.c_str()),
                   static_cast<DWORD>((name.size() + 1) * sizeof(wchar_t)));
    RegCloseKey(level);
  }
  RegCloseKey(levels);
}

// The least a browser must do for a view: give it a window.
class Browser : public com::ComObject<IShellBrowser> {
 public:
  explicit Browser(HWND frame) : frame_(frame) {}
  STDMETHODIMP GetWindow(HWND* window) override { *window = frame_; return S_OK; }
  STDMETHODIMP ContextSensitiveHelp(BOOL) override { return E_NOTIMPL; }
  STDMETHODIMP InsertMenusSB(HMENU, LPOLEMENUGROUPWIDTHS) override { return S_OK; }
  STDMETHODIMP SetMenuSB(HMENU, HOLEMENU, HWND) override { return S_OK; }
  STDMETHODIMP RemoveMenusSB(HMENU) override { return S_OK; }
  STDMETHODIMP SetStatusTextSB(LPCWSTR) override { return S_OK; }
  STDMETHODIMP EnableModelessSB(BOOL) override { return S_OK; }
  STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) override { return S_FALSE; }
  STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE, UINT) override { return E_NOTIMPL; }
  STDMETHODIMP GetViewStateStream(DWORD, IStream** stream) override { *stream = nullptr; return E_NOTIMPL; }
  STDMETHODIMP GetControlWindow(UINT, HWND* window) override { *window = nullptr; return E_NOTIMPL; }
  STDMETHODIMP SendControlMsg(UINT, UINT, WPARAM, LPARAM, LRESULT* result) override {
    if (result) *result = 0;
    return S_OK;
  }
  STDMETHODIMP QueryActiveShellView(IShellView** view) override { *view = nullptr; return E_NOTIMPL; }
  STDMETHODIMP OnViewWindowActive(IShellView*) override { return S_OK; }
  STDMETHODIMP SetToolbarItems(LPTBBUTTONSB, UINT, UINT) override { return S_OK; }
 private:
  HWND frame_;
};

// The median time from the start of `run` to the first WM_PAINT its modal loop takes from the
// queue; the window is cancelled right after that paint, so `run` returns.
namespace first_paint {
inline LARGE_INTEGER started;
inline double ms = -1;
inline HHOOK hook = nullptr;

inline LRESULT CALLBACK OnGetMessage(int code, WPARAM wParam, LPARAM lParam) {
  auto* message = reinterpret_cast<MSG*>(lParam);
  if (code == HC_ACTION && wParam == PM_REMOVE && message->message == WM_PAINT && ms < 0) {
    LARGE_INTEGER now, frequency;
    QueryPerformanceCounter(&now);
    QueryPerformanceFrequency(&frequency);
    ms = 1000.0 * static_cast<double>(now.QuadPart - started.QuadPart) / static_cast<double>(frequency.QuadPart);
    PostMessageW(GetAncestor(message->hwnd, GA_ROOT), WM_COMMAND, IDCANCEL, 0);
  }
  return CallNextHookEx(hook, code, wParam, lParam);
}
}  // namespace first_paint

template <class Run>
double MedianFirstPaint(int rounds, Run run) {
  first_paint::hook = SetWindowsHookExW(WH_GETMESSAGE, first_paint::OnGetMessage, nullptr, GetCurrentThreadId());
  std::vector<double> times;
  for (int i = 0; i < rounds; ++i) {
    first_paint::ms = -1;
    QueryPerformanceCounter(&first_paint::started);
    run();
    if (first_paint::ms >= 0) times.push_back(first_paint::ms);
  }
  UnhookWindowsHookEx(first_paint::hook);
  if (times.empty()) return -1;
  std::sort(times.begin(), times.end());
  return times[times.size() / 2];
}

}  // namespace bench
