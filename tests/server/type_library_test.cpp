#include <windows.h>
#include <oleauto.h>
#include <gtest/gtest.h>

#include <string>

#include "server/class_ids.h"
#include "server/com_base.h"
#include "server/registrar.h"

namespace {

struct Doc {
  std::wstring name, help;
};

Doc Documentation(ITypeLib* lib, int index) {
  BSTR name = nullptr, help = nullptr;
  Doc doc;
  if (SUCCEEDED(lib->GetDocumentation(index, &name, &help, nullptr, nullptr))) {
    doc = {name ? name : L"", help ? help : L""};
  }
  SysFreeString(name);
  SysFreeString(help);
  return doc;
}

TEST(TypeLibrary, EmbeddedLibraryListsTheClassesAndTheViewInterface) {
  com::ComPtr<ITypeLib> lib;
  std::wstring self = ModuleFilePath(GetModuleHandleW(nullptr));
  ASSERT_EQ(LoadTypeLibEx(self.c_str(), REGKIND_NONE, lib.Put()), S_OK);

  TLIBATTR* attr = nullptr;
  ASSERT_EQ(lib->GetLibAttr(&attr), S_OK);
  EXPECT_TRUE(IsEqualGUID(attr->guid, LIBID_MarlixDLShellExtLib));
  EXPECT_EQ(attr->wMajorVerNum, 1);
  EXPECT_EQ(attr->wMinorVerNum, 0);
  EXPECT_EQ(attr->syskind, SYS_WIN64);
  lib->ReleaseTLibAttr(attr);
  Doc libDoc = Documentation(lib.Get(), -1);
  EXPECT_EQ(libDoc.name, L"MarlixDLShellExtLib");
  EXPECT_EQ(libDoc.help, L"MarlixDLShellExt 1.0 Type Library");

  struct { const CLSID* clsid; const wchar_t* name; } classes[] = {
      {&CLSID_MarlixDLShellFolder, L"MarlixDLShellFolder"},
      {&CLSID_MarlixDLShellView, L"MarlixDLShellView"},
      {&CLSID_MarlixDLEnumIDList, L"MarlixDLEnumIDList"},
      {&CLSID_MarlixDLExtractIcon, L"MarlixDLExtractIcon"},
      {&CLSID_MarlixDLDataObject, L"MarlixDLDataObject"},
      {&CLSID_MarlixDLQueryInfo, L"MarlixDLQueryInfo"},
      {&CLSID_MarlixDLDropTarget, L"MarlixDLDropTarget"},
      {&CLSID_MarlixDLDropTargetOnListView, L"MarlixDLDropTargetOnListView"},
      {&CLSID_MarlixDLContextMenu, L"MarlixDLContextMenu"},
  };
  for (const auto& c : classes) {
    SCOPED_TRACE(testing::PrintToString(c.name));
    com::ComPtr<ITypeInfo> info;
    ASSERT_EQ(lib->GetTypeInfoOfGuid(*c.clsid, info.Put()), S_OK);
    TYPEATTR* type = nullptr;
    ASSERT_EQ(info->GetTypeAttr(&type), S_OK);
    EXPECT_EQ(type->typekind, TKIND_COCLASS);
    info->ReleaseTypeAttr(type);
    BSTR help = nullptr;
    ASSERT_EQ(info->GetDocumentation(MEMBERID_NIL, nullptr, &help, nullptr, nullptr), S_OK);
    EXPECT_EQ(std::wstring(help ? help : L""), std::wstring(c.name) + L" Class");
    SysFreeString(help);
  }

  com::ComPtr<ITypeInfo> view;
  ASSERT_EQ(lib->GetTypeInfoOfGuid(IID_IMarlixDigitalLevelsShellView, view.Put()), S_OK);
  TYPEATTR* type = nullptr;
  ASSERT_EQ(view->GetTypeAttr(&type), S_OK);
  EXPECT_EQ(type->typekind, TKIND_INTERFACE);
  EXPECT_EQ(type->cFuncs, 0) << "nothing beyond IUnknown";
  view->ReleaseTypeAttr(type);
  EXPECT_TRUE(IsEqualIID(__uuidof(IMarlixDigitalLevelsShellView), IID_IMarlixDigitalLevelsShellView));
}

}  // namespace
