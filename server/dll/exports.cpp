#include <windows.h>
#include <olectl.h>

#include "base/boundary.h"
#include "server/module_app.h"

STDAPI DllCanUnloadNow() { return TheModuleApp().Server().CanUnloadNow(); }

STDAPI DllGetClassObject(REFCLSID clsid, REFIID riid, LPVOID* ppv) {
  TheModuleApp().OnHostCall();
  return boundary::Call([&] { return TheModuleApp().Server().GetClassObject(clsid, riid, ppv); });
}

STDAPI DllRegisterServer() {
  TheModuleApp().OnHostCall();
  return boundary::Call([] { return TheModuleApp().Server().RegisterServer(); });
}

// Answers S_OK whatever happened, running out of memory included.
STDAPI DllUnregisterServer() {
  TheModuleApp().OnHostCall();
  boundary::CallVoid([] { TheModuleApp().Server().UnregisterServer(); });
  return S_OK;
}
