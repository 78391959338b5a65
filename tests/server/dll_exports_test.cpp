#include <gtest/gtest.h>

#include <shlobj.h>

#include "loaded_dll.h"
#include "server/class_ids.h"
#include "server/com_base.h"
#include "support/registry_sandbox.h"

namespace {

const CLSID* const kServedClasses[] = {
    &CLSID_MarlixDLShellFolder, &CLSID_MarlixDLShellView,  &CLSID_MarlixDLEnumIDList,
    &CLSID_MarlixDLExtractIcon, &CLSID_MarlixDLDataObject, &CLSID_MarlixDLQueryInfo,
    &CLSID_MarlixDLDropTarget,  &CLSID_MarlixDLDropTargetOnListView,
};

class DllExports : public testing::Test {
 protected:
  // The module reads and writes the user's settings at load and unload.
  RegistrySandbox sandbox_;
  LoadedDll dll_;

  void SetUp() override {
    ASSERT_TRUE(dll_.module) << "cannot load " << testing::PrintToString(dll_.path);
    ASSERT_TRUE(dll_.canUnloadNow && dll_.getClassObject && dll_.registerServer && dll_.unregisterServer);
  }
};

TEST_F(DllExports, ClassObjectsForTheMapOnly) {
  EXPECT_EQ(dll_.canUnloadNow(), S_OK);

  void* raw = reinterpret_cast<void*>(1);
  EXPECT_EQ(dll_.getClassObject(CLSID_MarlixDLContextMenu, IID_IClassFactory, &raw), CLASS_E_CLASSNOTAVAILABLE);
  EXPECT_EQ(raw, nullptr);
  EXPECT_EQ(dll_.getClassObject(IID_IUnknown, IID_IClassFactory, &raw), CLASS_E_CLASSNOTAVAILABLE);
  EXPECT_EQ(dll_.getClassObject(CLSID_MarlixDLShellFolder, IID_IClassFactory, nullptr), E_POINTER);

  for (const CLSID* clsid : kServedClasses) {
    com::ComPtr<IClassFactory> factory;
    ASSERT_EQ(dll_.getClassObject(*clsid, IID_IClassFactory, factory.PutVoid()), S_OK);
    EXPECT_EQ(dll_.canUnloadNow(), S_FALSE) << "a class object holds the module";

    com::ComPtr<IUnknown> outer(factory.Get()), made;
    EXPECT_EQ(factory->CreateInstance(outer.Get(), IID_IUnknown, made.PutVoid()), CLASS_E_NOAGGREGATION);
    EXPECT_FALSE(made);
    EXPECT_EQ(factory->CreateInstance(nullptr, IID_IUnknown, nullptr), E_POINTER);
    outer.Reset();

    // A class whose object can be made standalone keeps the module while it lives.
    if (SUCCEEDED(factory->CreateInstance(nullptr, IID_IUnknown, made.PutVoid()))) {
      factory.Reset();
      EXPECT_EQ(dll_.canUnloadNow(), S_FALSE);
      made.Reset();
    }
    factory.Reset();
    EXPECT_EQ(dll_.canUnloadNow(), S_OK);
  }

  com::ComPtr<IUnknown> unknown;
  EXPECT_EQ(dll_.getClassObject(CLSID_MarlixDLDataObject, IID_IDropTarget, unknown.PutVoid()), E_NOINTERFACE);
  EXPECT_EQ(dll_.canUnloadNow(), S_OK);
}

TEST_F(DllExports, LockServerHoldsTheModule) {
  com::ComPtr<IClassFactory> factory;
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLQueryInfo, IID_IClassFactory, factory.PutVoid()), S_OK);
  EXPECT_EQ(factory->LockServer(TRUE), S_OK);
  factory.Reset();
  EXPECT_EQ(dll_.canUnloadNow(), S_FALSE) << "the lock outlives the class object";
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLDropTarget, IID_IClassFactory, factory.PutVoid()), S_OK);
  EXPECT_EQ(factory->LockServer(FALSE), S_OK);
  factory.Reset();
  EXPECT_EQ(dll_.canUnloadNow(), S_OK);
}

}  // namespace

namespace {

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
  EXPECT_EQ(size, 12u);
  EXPECT_EQ(saved[0], 140);
  EXPECT_EQ(saved[1], 260);
}

TEST_F(DllExports, ImageListsAreBuiltAtLoad) {
  com::ComPtr<IClassFactory> factory;
  ASSERT_EQ(dll_.getClassObject(CLSID_MarlixDLExtractIcon, IID_IClassFactory, factory.PutVoid()), S_OK);
  com::ComPtr<IExtractIconW> icon;
  ASSERT_EQ(factory->CreateInstance(nullptr, IID_IExtractIconW, icon.PutVoid()), S_OK);
  for (UINT index : {0u, 1u, 2u}) {
    HICON large = nullptr, small = nullptr;
    EXPECT_EQ(icon->Extract(L"", index, &large, &small, 0), S_OK);
    EXPECT_TRUE(large && small) << index;
    if (large) DestroyIcon(large);
    if (small) DestroyIcon(small);
  }
}

}  // namespace
