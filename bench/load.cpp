// Time from LoadLibraryW of the module to its first initialised folder object
// (DllGetClassObject, CreateInstance, IPersistFolder::Initialize), against the same for a
// minimal folder DLL built alongside; the two are loaded in turn, each unloaded again, so
// both pay a full load every round. The system DLLs the module imports are loaded first, as
// they are in any shell host; otherwise each round would time their loading too, since they
// leave with the module. Prints the medians and their ratio.
#include <windows.h>
#include <shlobj.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <string>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;
using GetClassObjectFn = HRESULT(STDAPICALLTYPE*)(REFCLSID, REFIID, void**);

const CLSID kModuleFolder = {0x7f0c89f4, 0xce25, 0x42b8, {0x91, 0x8b, 0x41, 0x18, 0xce, 0x2c, 0xc5, 0xdf}};
const CLSID kMinimalFolder = {0x3f0e4b1c, 0x8d7a, 0x4c2e, {0x9b, 0x61, 0x5a, 0x4d, 0x2c, 0x7e, 0x8f, 0x10}};

std::wstring WindowsPath(const char* unixPath) {  // the build's paths, through drive Z:
  std::wstring path = L"Z:";
  for (const char* c = unixPath; *c; ++c) path += *c == '/' ? L'\\' : wchar_t(*c);
  return path;
}

struct Times {
  double load = -1, total = -1;  // microseconds to LoadLibraryW's return, to the first folder
};

// The times of one load, total -1 if a step fails. Unloads the DLL afterwards.
Times FirstFolder(const std::wstring& path, const CLSID& clsid, LPCITEMIDLIST where, bool* unloaded) {
  Times times;
  Clock::time_point start = Clock::now();
  HMODULE module = LoadLibraryW(path.c_str());
  times.load = std::chrono::duration<double, std::micro>(Clock::now() - start).count();
  if (!module) return times;
  auto getClassObject = reinterpret_cast<GetClassObjectFn>(reinterpret_cast<void*>(GetProcAddress(module, "DllGetClassObject")));
  IClassFactory* factory = nullptr;
  IPersistFolder* folder = nullptr;
  if (getClassObject && SUCCEEDED(getClassObject(clsid, IID_IClassFactory, reinterpret_cast<void**>(&factory))) &&
      SUCCEEDED(factory->CreateInstance(nullptr, IID_IPersistFolder, reinterpret_cast<void**>(&folder))) &&
      SUCCEEDED(folder->Initialize(where))) {
    times.total = std::chrono::duration<double, std::micro>(Clock::now() - start).count();
  }
  if (folder) folder->Release();
  if (factory) factory->Release();
  FreeLibrary(module);
  *unloaded = GetModuleHandleW(path.c_str()) == nullptr;
  return times;
}

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

}  // namespace

int main() {
  CoInitialize(nullptr);
  for (const wchar_t* system : {L"comctl32.dll", L"oleaut32.dll", L"shlwapi.dll", L"version.dll", L"comdlg32.dll"}) {
    LoadLibraryW(system);
  }
  LPITEMIDLIST computer = nullptr;
  if (FAILED(SHGetSpecialFolderLocation(nullptr, CSIDL_DRIVES, &computer))) return 1;
  const std::wstring modulePath = WindowsPath(MARLIX_DLL_PATH), minimalPath = WindowsPath(MINIMAL_DLL_PATH);
  const int rounds = 41;
  std::vector<double> module, minimal, moduleLoad, minimalLoad;
  bool moduleUnloaded = true, minimalUnloaded = true, unloaded = false;
  for (int i = 0; i <= rounds; ++i) {  // round 0 warms the file cache and is not counted
    Times a = FirstFolder(modulePath, kModuleFolder, computer, &unloaded);
    moduleUnloaded = moduleUnloaded && unloaded;
    Times b = FirstFolder(minimalPath, kMinimalFolder, computer, &unloaded);
    minimalUnloaded = minimalUnloaded && unloaded;
    if (a.total < 0 || b.total < 0) {
      std::printf("a step failed in round %d (module %s, minimal %s)\n", i, a.total < 0 ? "failed" : "ok",
                  b.total < 0 ? "failed" : "ok");
      return 1;
    }
    if (i > 0) {
      module.push_back(a.total);
      minimal.push_back(b.total);
      moduleLoad.push_back(a.load);
      minimalLoad.push_back(b.load);
    }
  }
  double a = Median(module), b = Median(minimal);
  std::printf("LoadLibraryW to the first initialised folder, median of %d rounds%s:\n", rounds,
              moduleUnloaded && minimalUnloaded ? ", each a full load" : " (a DLL stayed loaded)");
  std::printf("           to the folder   of which LoadLibraryW\n");
  std::printf("  module   %10.0f us   %10.0f us\n", a, Median(moduleLoad));
  std::printf("  minimal  %10.0f us   %10.0f us\n", b, Median(minimalLoad));
  std::printf("  ratio    %10.2f\n", a / b);
  CoTaskMemFree(computer);
  CoUninitialize();
  return 0;
}
