#pragma once
#include <windows.h>

// The module that holds this code: the DLL in production, the test program in tests.
// Resources (strings, dialogs, icons) are always loaded from it.
HINSTANCE ModuleInstance() noexcept;

// Registers a window class of this module with the style, cursor and background every
// window of ours uses, unless it is there already. Browser windows run on threads of
// their own, so another thread registering it meanwhile counts as success.
bool RegisterModuleClass(const wchar_t* name, WNDPROC procedure) noexcept;
