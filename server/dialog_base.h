// A small modal dialog framework: a dialog template run by DialogBoxParamW, virtual
// handlers, a message map for commands and registered messages, and data exchange
// between controls and members.
#pragma once
#include <windows.h>
#include <functional>
#include <string>
#include <vector>

class CDialog {
 public:
  CDialog(UINT templateId, HWND parent) noexcept;
  virtual ~CDialog();
  CDialog(const CDialog&) = delete;
  CDialog& operator=(const CDialog&) = delete;

  // Runs the dialog: IDOK (1) or IDCANCEL (2) as ended, -1 if it could not be made.
  INT_PTR DoModal();
  HWND Handle() const noexcept { return window_; }

  // Calls DoDataExchange; false if a control could not be read.
  bool UpdateData(bool toControls);
  void EndDialog(INT_PTR result);

 protected:
  // Called with toControls true to fill the controls, false to read them back.
  virtual void DoDataExchange(bool toControls);
  // Fills the controls; the result is WM_INITDIALOG's (TRUE: default focus).
  virtual BOOL OnInitDialog();
  // Reads the controls and ends with IDOK.
  virtual void OnOK();
  // Ends with IDCANCEL.
  virtual void OnCancel();
  // Routes WM_COMMAND through the map, then IDOK and IDCANCEL; true if handled.
  virtual bool OnCommand(WPARAM wParam, LPARAM lParam);
  // The window is gone (WM_NCDESTROY); the object lives on.
  virtual void PostNcDestroy();

  // Message map entries: a button click (or menu/accelerator command) by control id,
  // and any message by number, registered ones included.
  void MapCommand(UINT id, std::function<void()> handler);
  void MapMessage(UINT message, std::function<LRESULT(WPARAM, LPARAM)> handler);

  // Data exchange helpers, shared with the property pages (see ddx below).
  void DdxText(bool toControls, int id, std::wstring& value);
  void DdxComboIndex(bool toControls, int id, int& index);
  void DdxComboExact(bool toControls, int id, std::wstring& value);
  void DdxComboPrefix(bool toControls, int id, std::wstring& value);

  HWND Item(int id) const noexcept { return GetDlgItem(window_, id); }

 private:
  static INT_PTR CALLBACK DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
  static INT_PTR Route(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
  bool Dispatch(UINT message, WPARAM wParam, LPARAM lParam, INT_PTR& result);

  struct MessageEntry {
    UINT message;
    std::function<LRESULT(WPARAM, LPARAM)> handler;
  };
  struct CommandEntry {
    UINT id;
    std::function<void()> handler;
  };

  UINT templateId_;
  HWND parent_;
  HWND window_ = nullptr;
  std::vector<MessageEntry> messages_;
  std::vector<CommandEntry> commands_;
};

// The text of a window, any length.
std::wstring WindowText(HWND window);

// Exchange between the controls of a dialog window and members, for dialogs and property pages.
namespace ddx {
// Text: edit or static control text.
void Text(HWND dialog, bool toControls, int id, std::wstring& value);
// Combo box by index of the selection (-1 none).
void ComboIndex(HWND dialog, bool toControls, int id, int& index);
// Combo box by text: selects the item equal to it, case counting. Reading gives the
// selected item's text, or the edit text of a combo box that has one.
void ComboExact(HWND dialog, bool toControls, int id, std::wstring& value);
// Combo box by text: selects the first item that begins with it (the control's own search).
void ComboPrefix(HWND dialog, bool toControls, int id, std::wstring& value);
}  // namespace ddx
