#pragma once
#include <windows.h>

// The module that holds this code: the DLL in production, the test program in tests.
// Resources (strings, dialogs, icons) are always loaded from it.
HINSTANCE ModuleInstance() noexcept;
