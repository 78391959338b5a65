#include "loaded_dll.h"

namespace {
template <class F>
void Bind(HMODULE module, const char* name, F* f) {
  *f = reinterpret_cast<F>(reinterpret_cast<void*>(GetProcAddress(module, name)));
}
}  // namespace

// MARLIX_DLL_PATH is the build's Unix path; Wine maps it through drive Z:.
LoadedDll::LoadedDll() {
  std::string unix = MARLIX_DLL_PATH;
  path = L"Z:";
  for (char c : unix) path += c == '/' ? L'\\' : wchar_t(c);
  module = LoadLibraryW(path.c_str());
  if (!module) return;
  Bind(module, "DllCanUnloadNow", &canUnloadNow);
  Bind(module, "DllGetClassObject", &getClassObject);
  Bind(module, "DllRegisterServer", &registerServer);
  Bind(module, "DllUnregisterServer", &unregisterServer);
}

LoadedDll::~LoadedDll() {
  if (module) FreeLibrary(module);
}
