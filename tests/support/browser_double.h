// A browser of the tests' own, for a view to open in where no real host shows what it is told.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "base/com_base.h"

// Each entry of `menu` as a user reads it: its text ("-" for a separator) and then
// " default", " grey", " checked" as its state says.
std::vector<std::wstring> MenuEntries(HMENU menu);

// What Explorer's window is to its view: it lends File, Edit and View popups to merge into,
// shows the bar the view sets and hands that bar's popups and the view's commands to the
// view, and keeps the view state stream. It records what the view tells it. Its frame is a
// hidden top-level window of class kClass, which another process finds by its title.
class BrowserDouble : public com::ComObject<IShellBrowser> {
 public:
  static constexpr const wchar_t* kClass = L"BrowserDoubleFrame";

  BrowserDouble();
  ~BrowserDouble() override { DestroyWindow(frame); }

  HWND frame = nullptr;
  HMENU shown = nullptr;             // the bar the view set; null once it took it back
  int lent = 0;                      // merges filled with the browser's popups and not given back
  int reloads = 0;                   // the browser's own refresh, asked for by the view
  std::vector<WPARAM> commands;      // every other WM_COMMAND of the frame
  std::vector<std::wstring> status;  // "parts <count> <first width>" and each text of the status bar
  com::ComPtr<IStream> stream;       // the view state; none until written or seeded

  void SeedMode(UINT mode);
  UINT StoredMode();                       // 0 without a stream
  std::vector<std::wstring> Popup(UINT id);  // the entries of the bar's popup `id` as it opens

  STDMETHODIMP GetWindow(HWND* window) noexcept override { return *window = frame, S_OK; }
  STDMETHODIMP ContextSensitiveHelp(BOOL) noexcept override { return E_NOTIMPL; }
  STDMETHODIMP InsertMenusSB(HMENU menu, LPOLEMENUGROUPWIDTHS) noexcept override;
  STDMETHODIMP SetMenuSB(HMENU menu, HOLEMENU, HWND active) noexcept override;
  STDMETHODIMP RemoveMenusSB(HMENU menu) noexcept override;
  STDMETHODIMP SetStatusTextSB(LPCWSTR) noexcept override { return S_OK; }
  STDMETHODIMP EnableModelessSB(BOOL) noexcept override { return S_OK; }
  STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) noexcept override { return S_FALSE; }
  STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE, UINT) noexcept override { return S_OK; }
  STDMETHODIMP GetViewStateStream(DWORD mode, IStream** result) noexcept override;
  STDMETHODIMP GetControlWindow(UINT, HWND* window) noexcept override { return *window = nullptr, E_NOTIMPL; }
  STDMETHODIMP SendControlMsg(UINT id, UINT message, WPARAM wParam, LPARAM lParam, LRESULT* result) noexcept override;
  STDMETHODIMP QueryActiveShellView(IShellView** view) noexcept override { return *view = nullptr, E_NOTIMPL; }
  STDMETHODIMP OnViewWindowActive(IShellView*) noexcept override { return S_OK; }
  STDMETHODIMP SetToolbarItems(LPTBBUTTONSB, UINT, UINT) noexcept override { return S_OK; }

 private:
  static LRESULT CALLBACK FrameProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
  HWND active_ = nullptr;  // the view window the shown bar belongs to
};
