#include <windows.h>

#include "server/module_app.h"

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
  switch (reason) {
    case DLL_PROCESS_ATTACH:
      DisableThreadLibraryCalls(instance);
      return TheModuleApp().InitInstance();
    case DLL_PROCESS_DETACH:
      TheModuleApp().ExitInstance();
      break;
  }
  return TRUE;
}
