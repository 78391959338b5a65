// The menu the folder hands out for IContextMenu: one sample entry, no commands on levels.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include "base/com_base.h"

class CMarlixDLContextMenu : public com::ComObject<IContextMenu> {
 public:
  STDMETHODIMP QueryContextMenu(HMENU menu, UINT index, UINT first, UINT last, UINT flags) noexcept override;
  STDMETHODIMP InvokeCommand(CMINVOKECOMMANDINFO* info) noexcept override;
  STDMETHODIMP GetCommandString(UINT_PTR id, UINT type, UINT* reserved, CHAR* text, UINT size) noexcept override;
};
