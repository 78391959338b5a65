// Registration of the type library embedded in a module as resource TYPELIB 1.
#pragma once
#include <windows.h>

HRESULT RegisterModuleTypeLib(HMODULE module);
HRESULT UnregisterModuleTypeLib(HMODULE module);
