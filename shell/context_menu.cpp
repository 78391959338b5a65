#include "shell/context_menu.h"

#include <cstring>

STDMETHODIMP CMarlixDLContextMenu::QueryContextMenu(HMENU menu, UINT index, UINT first, UINT, UINT flags) noexcept {
  if (flags & CMF_DEFAULTONLY) return MAKE_HRESULT(SEVERITY_SUCCESS, 0, 0);
  InsertMenuW(menu, index, MF_BYPOSITION, first, L"&Sample Explorer Bar Command");
  return MAKE_HRESULT(SEVERITY_SUCCESS, 0, 1);
}

STDMETHODIMP CMarlixDLContextMenu::InvokeCommand(CMINVOKECOMMANDINFO* info) noexcept {
  if (!info || info->lpVerb) return E_INVALIDARG;
  MessageBoxW(info->hwnd, L"Explorer Bar Command selected.", L"Sample Explorer Bar", MB_ICONINFORMATION);
  return S_OK;
}

// The wide forms get the narrow bytes, as this menu always answered; callers that
// show them see the text through their own conversion, or not at all.
STDMETHODIMP CMarlixDLContextMenu::GetCommandString(UINT_PTR id, UINT type, UINT*, CHAR* text, UINT) noexcept {
  static const char kVerb[] = "command";
  static const char kHelp[] = "Explorer Bar command help text";
  switch (type) {
    case GCS_VERBW:
      if (id != 0 || !text) return E_INVALIDARG;
      std::memcpy(text, kVerb, sizeof(kVerb));
      return S_OK;
    case GCS_HELPTEXTW:
      if (id != 0 || !text) return E_INVALIDARG;
      std::memcpy(text, kHelp, sizeof(kHelp));
      return S_OK;
    case GCS_VALIDATEW:
      return S_OK;
    default:
      return E_INVALIDARG;
  }
}
