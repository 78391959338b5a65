// A small dialog framework: a window made from a dialog template, virtual handlers, a map of
// commands, notifications and registered messages, and data exchange between controls and
// members. Modal dialogs and property pages share it; they differ only in how they are run.
#pragma once
#include <windows.h>
#include <functional>
#include <string>
#include <vector>

class CDialogWindow {
 public:
  CDialogWindow(const CDialogWindow&) = delete;
  CDialogWindow& operator=(const CDialogWindow&) = delete;

  // Null until WM_INITDIALOG, and again once the window is gone.
  HWND Handle() const noexcept { return window_; }
  // Calls DoDataExchange; false if there is no window.
  bool UpdateData(bool toControls);

 protected:
  CDialogWindow() noexcept = default;
  virtual ~CDialogWindow() = default;

  // Called with toControls true to fill the controls, false to read them back.
  virtual void DoDataExchange(bool toControls);
  // Fills the controls; the result is WM_INITDIALOG's (TRUE: default focus).
  virtual BOOL OnInitDialog();
  // WM_COMMAND that no map entry took; true if handled.
  virtual bool OnCommand(WPARAM wParam, LPARAM lParam);
  // The window is gone (WM_NCDESTROY); the object lives on.
  virtual void PostNcDestroy();

  // Map entries: a click (or menu or accelerator command) of control `id`, a notification
  // `code` of control `id`, and any message by number, registered ones included.
  void MapCommand(UINT id, std::function<void()> handler);
  void MapNotification(UINT id, UINT code, std::function<void()> handler);
  void MapMessage(UINT message, std::function<LRESULT(WPARAM, LPARAM)> handler);

  // Text: edit or static control text.
  void DdxText(bool toControls, int id, std::wstring& value);
  // Combo box by text: selects the item equal to it, case counting. Reading gives the
  // selected item's text, or the edit text of a combo box that has one.
  void DdxComboExact(bool toControls, int id, std::wstring& value);
  // Combo box by text: selects the first item that begins with it (the control's own search).
  void DdxComboPrefix(bool toControls, int id, std::wstring& value);
  // Reads the combo box into `value` and gives null, or gives the box to fill from `value`.
  HWND ComboToFill(bool toControls, int id, std::wstring& value);

  HWND Item(int id) const noexcept { return GetDlgItem(window_, id); }

  // The one router of both kinds: `arriving` is the object that WM_INITDIALOG brings.
  // A handler that throws gets the default handling: FALSE, not processed.
  static INT_PTR Route(CDialogWindow* arriving, HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept;

 private:
  bool Dispatch(UINT message, WPARAM wParam, LPARAM lParam, INT_PTR& result);

  static constexpr UINT kClick = ~0u;  // the code of a MapCommand entry: BN_CLICKED, menu or accelerator
  struct CommandEntry {
    UINT id;
    UINT code;
    std::function<void()> handler;
  };
  struct MessageEntry {
    UINT message;
    std::function<LRESULT(WPARAM, LPARAM)> handler;
  };

  HWND window_ = nullptr;
  std::vector<CommandEntry> commands_;
  std::vector<MessageEntry> messages_;
};

// A modal dialog run by DialogBoxParamW.
class CDialog : public CDialogWindow {
 public:
  CDialog(UINT templateId, HWND parent) noexcept : templateId_(templateId), parent_(parent) {}

  // Runs the dialog: IDOK (1) or IDCANCEL (2) as ended, -1 if it could not be made.
  INT_PTR DoModal();
  void EndDialog(INT_PTR result);

 protected:
  // Reads the controls and ends with IDOK.
  virtual void OnOK();
  // Ends with IDCANCEL.
  virtual void OnCancel();
  // IDOK and IDCANCEL.
  bool OnCommand(WPARAM wParam, LPARAM lParam) override;

 private:
  static INT_PTR CALLBACK DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept;

  UINT templateId_;
  HWND parent_;
};

// The text of a window, any length.
std::wstring WindowText(HWND window);
