// A small modal property sheet layer over PropertySheetW: pages from dialog templates with
// virtual handlers and data exchange, and a sheet whose window is reached through the
// PSCB_INITIALIZED callback so that its commands can be intercepted.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <functional>
#include <string>
#include <vector>

#include "base/dialog_base.h"

// A combo box control as the platform gives it, attached by data exchange.
class CComboBox {
 public:
  void Attach(HWND window) noexcept { window_ = window; }
  HWND Handle() const noexcept { return window_; }
  // Index of the new entry, or CB_ERR.
  int AddString(const std::wstring& text) const;

 private:
  HWND window_ = nullptr;
};

class CPropertySheet;

class CPropertyPage : public CDialogWindow {
 public:
  explicit CPropertyPage(UINT templateId) noexcept : templateId_(templateId) {}

  // Enables the sheet's Apply button (or clears this page's change mark).
  void SetModified(bool changed = true);

 private:
  friend class CPropertySheet;
  static INT_PTR CALLBACK PageProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept;

  UINT templateId_;
};

class CPropertySheet {
 public:
  // The caption is the module's string `captionId`, as the platform loads it.
  CPropertySheet(UINT captionId, HWND parent, UINT startPage) noexcept;
  virtual ~CPropertySheet() = default;
  CPropertySheet(const CPropertySheet&) = delete;
  CPropertySheet& operator=(const CPropertySheet&) = delete;

  // The page is not owned and must outlive the modal run.
  void AddPage(CPropertyPage* page);
  // Runs the sheet: IDOK (1) when it ended by OK, IDCANCEL (2) otherwise, -1 if it could not be made.
  INT_PTR DoModal();
  HWND Handle() const noexcept { return window_; }

 protected:
  // WM_COMMAND of the sheet window; the base hands it to the platform's sheet.
  virtual BOOL OnCommand(WPARAM wParam, LPARAM lParam);
  // Runs once the platform has built the sheet, its tabs and buttons, before the first page exists.
  virtual BOOL OnInitDialog();

 private:
  static int CALLBACK SheetCallback(HWND window, UINT message, LPARAM lParam) noexcept;
  static LRESULT CALLBACK SheetProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept;

  UINT captionId_;
  HWND parent_;
  UINT startPage_;
  std::vector<CPropertyPage*> pages_;
  HWND window_ = nullptr;
  WNDPROC platformProc_ = nullptr;
  bool endedWithOk_ = false;
};
