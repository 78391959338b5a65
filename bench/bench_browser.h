// The browser the view benchmarks host their views in.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include "server/com_base.h"

namespace bench {

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

}  // namespace bench
