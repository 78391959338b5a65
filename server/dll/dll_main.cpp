#include <windows.h>

#include "base/boundary.h"
#include "server/module_app.h"

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
  switch (reason) {
    case DLL_PROCESS_ATTACH:
      DisableThreadLibraryCalls(instance);
      return boundary::CallOr<BOOL>(FALSE, [] { return TheModuleApp().InitInstance(); });
    case DLL_PROCESS_DETACH:
      boundary::CallVoid([] { TheModuleApp().ExitInstance(); });
      break;
  }
  return TRUE;
}
