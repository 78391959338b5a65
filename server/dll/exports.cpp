#include <windows.h>
#include <olectl.h>

#include "server/module_app.h"

STDAPI DllCanUnloadNow() { return TheModuleApp().Server().CanUnloadNow(); }

STDAPI DllGetClassObject(REFCLSID clsid, REFIID riid, LPVOID* ppv) {
  return TheModuleApp().Server().GetClassObject(clsid, riid, ppv);
}

STDAPI DllRegisterServer() { return TheModuleApp().Server().RegisterServer(); }

STDAPI DllUnregisterServer() { return TheModuleApp().Server().UnregisterServer(); }
