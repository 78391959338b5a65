// Explorer loads the module, gets each class it asks for with the interface it needs, and unloads it when done.
#include <gtest/gtest.h>
#include <shlobj.h>
#include <tuple>
#include "base/class_ids.h"
#include "base/com_base.h"
#include "support/registry_sandbox.h"
namespace {
// The built MarlixDLShellExt.dll loaded into the test process, with its exports.
struct LoadedDll {
  LoadedDll() {  // MARLIX_DLL_PATH is the build's Unix path; Wine maps it through drive Z:.
    for (char c : std::string(MARLIX_DLL_PATH)) path += c == '/' ? L'\\' : wchar_t(c);
    if (!(module = LoadLibraryW(path.c_str()))) return;
    canUnloadNow = reinterpret_cast<decltype(canUnloadNow)>(reinterpret_cast<void*>(GetProcAddress(module, "DllCanUnloadNow")));
    getClassObject = reinterpret_cast<decltype(getClassObject)>(
        reinterpret_cast<void*>(GetProcAddress(module, "DllGetClassObject")));
  }
  ~LoadedDll() { if (module) FreeLibrary(module); }
  std::wstring path = L"Z:";
  HMODULE module = nullptr;
  HRESULT(STDAPICALLTYPE* canUnloadNow)() = nullptr;
  HRESULT(STDAPICALLTYPE* getClassObject)(REFCLSID, REFIID, void**) = nullptr;
};
struct DllExports : testing::Test {
  void SetUp() override {
    ASSERT_TRUE(dll_.module) << "cannot load " << testing::PrintToString(dll_.path);
    ASSERT_TRUE(dll_.canUnloadNow && dll_.getClassObject);
  }
  RegistrySandbox sandbox_;  // the module reads and writes the user's settings at load and unload
  LoadedDll dll_;
};
TEST_F(DllExports, EachClassAnswersWhatItsClientsAsk) {
  EXPECT_EQ(dll_.canUnloadNow(), S_OK);
  void* raw = reinterpret_cast<void*>(1);
  EXPECT_EQ(dll_.getClassObject(CLSID_MarlixDLContextMenu, IID_IClassFactory, &raw), CLASS_E_CLASSNOTAVAILABLE);
  EXPECT_EQ(raw, nullptr);
  const std::tuple<const CLSID*, const IID*, const char*> rows[] = {
      {&CLSID_MarlixDLShellFolder, &IID_IPersistFolder, "folder"},
      {&CLSID_MarlixDLShellFolder, &IID_IShellFolder, "folder"},
      {&CLSID_MarlixDLShellView, &IID_IShellView, "view"},
      {&CLSID_MarlixDLEnumIDList, &IID_IEnumIDList, "item list"},
      {&CLSID_MarlixDLExtractIcon, &IID_IExtractIconW, "icons"},
      {&CLSID_MarlixDLDataObject, &IID_IDataObject, "data object"},
      {&CLSID_MarlixDLQueryInfo, &IID_IQueryInfo, "tip"},
      {&CLSID_MarlixDLDropTarget, &IID_IDropTarget, "drop target"},
      {&CLSID_MarlixDLDropTargetOnListView, &IID_IDropTarget, "list drop target"},
  };
  for (const auto& [clsid, iid, what] : rows) {
    SCOPED_TRACE(what);
    com::ComPtr<IClassFactory> factory;
    ASSERT_EQ(dll_.getClassObject(*clsid, IID_IClassFactory, factory.PutVoid()), S_OK);
    EXPECT_EQ(dll_.canUnloadNow(), S_FALSE) << "a class object holds the module";
    com::ComPtr<IUnknown> made;
    EXPECT_EQ(factory->CreateInstance(factory.Get(), *iid, made.PutVoid()), CLASS_E_NOAGGREGATION);
    EXPECT_EQ(factory->CreateInstance(nullptr, *iid, made.PutVoid()), S_OK);
    factory.Reset();
    EXPECT_EQ(dll_.canUnloadNow(), made ? S_FALSE : S_OK) << "an object keeps the module while it lives";
    made.Reset();
    EXPECT_EQ(dll_.canUnloadNow(), S_OK);
  }
}
TEST_F(DllExports, LockServerHoldsTheModuleAndImageListsAreBuiltAtLoad) {
  com::ComPtr<IClassFactory> factory;
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLQueryInfo, IID_IClassFactory, factory.PutVoid()), S_OK);
  EXPECT_EQ(factory->LockServer(TRUE), S_OK);
  factory.Reset();
  EXPECT_EQ(dll_.canUnloadNow(), S_FALSE) << "the lock outlives the class object";
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLDropTarget, IID_IClassFactory, factory.PutVoid()), S_OK);
  EXPECT_EQ(factory->LockServer(FALSE), S_OK);
  factory.Reset();
  EXPECT_EQ(dll_.canUnloadNow(), S_OK);
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLExtractIcon, IID_IClassFactory, factory.PutVoid()), S_OK);
  EXPECT_EQ(factory->LockServer(FALSE), S_OK);
  EXPECT_EQ(dll_.canUnloadNow(), S_FALSE) << "an unlock without a lock took away the class object's hold";
  com::ComPtr<IExtractIconW> icon;
  ASSERT_EQ(factory->CreateInstance(nullptr, IID_IExtractIconW, icon.PutVoid()), S_OK);
  for (UINT index : {0u, 1u, 2u}) {
    HICON large = nullptr, small = nullptr;
    EXPECT_EQ(icon->Extract(L"", index, &large, &small, 0), S_OK);
    EXPECT_TRUE(large && small) << index;
    for (HICON h : {large, small}) if (h) DestroyIcon(h);
  }
}
TEST(DllLifetime, ColumnWidthsAreReadAtLoadAndWrittenBackAtUnload) {
  RegistrySandbox sandbox;
  const std::wstring base = L"Software\\Gravon\\Shell Extensions\\Marlix DL View";
  const int32_t seeded[4] = {140, 260, 7, 9};
  RegSetKeyValueW(HKEY_CURRENT_USER, base.c_str(), L"Display Settings", REG_BINARY, seeded, sizeof(seeded));
  {
    LoadedDll dll;
    ASSERT_TRUE(dll.module);
    RegDeleteKeyValueW(HKEY_CURRENT_USER, base.c_str(), L"Display Settings");
  }
  int32_t saved[4] = {};
  DWORD size = sizeof(saved);
  ASSERT_EQ(RegGetValueW(HKEY_CURRENT_USER, base.c_str(), L"Display Settings", RRF_RT_REG_BINARY, nullptr, saved,
                         &size), ERROR_SUCCESS);
  EXPECT_EQ(std::make_tuple(size, saved[0], saved[1]), std::make_tuple(DWORD(12), 140, 260));
}
}  // namespace
