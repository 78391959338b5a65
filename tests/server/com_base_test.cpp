#include <gtest/gtest.h>
#include <objidl.h>
#include <shlobj.h>

#include "server/com_base.h"
#include "support/registry_sandbox.h"

namespace {

class TwoFaces : public com::ComObject<IPersistFolder, IDropTarget> {
 public:
  STDMETHODIMP GetClassID(CLSID*) override { return E_NOTIMPL; }
  STDMETHODIMP Initialize(PCIDLIST_ABSOLUTE) override { return S_OK; }
  STDMETHODIMP DragEnter(IDataObject*, DWORD, POINTL, DWORD*) override { return E_NOTIMPL; }
  STDMETHODIMP DragOver(DWORD, POINTL, DWORD*) override { return E_NOTIMPL; }
  STDMETHODIMP DragLeave() override { return E_NOTIMPL; }
  STDMETHODIMP Drop(IDataObject*, DWORD, POINTL, DWORD*) override { return E_NOTIMPL; }
};

TEST(ComObject, AnswersListedInterfacesOnlyAndHoldsTheModule) {
  long before = com::ModuleLockCount();
  {
    auto obj = com::Make<TwoFaces>();
    ASSERT_TRUE(obj);
    EXPECT_EQ(com::ModuleLockCount(), before + 1);

    com::ComPtr<IDropTarget> target;
    EXPECT_EQ(obj.As(&target), S_OK);
    com::ComPtr<IUnknown> a, b;
    EXPECT_EQ(target.As(&a), S_OK);
    com::ComPtr<IPersistFolder> folder;
    EXPECT_EQ(obj.As(&folder), S_OK);
    EXPECT_EQ(folder.As(&b), S_OK);
    EXPECT_EQ(a.Get(), b.Get()) << "one identity for IUnknown";

    // IPersist is a base of IPersistFolder but not listed, so it is not answered.
    com::ComPtr<IPersist> persist;
    EXPECT_EQ(obj.As(&persist), E_NOINTERFACE);
    EXPECT_FALSE(persist);
    EXPECT_EQ(obj->QueryInterface(IID_IDropTarget, nullptr), E_POINTER);
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(RegistrySandbox, RedirectsAndCleansTheCurrentUser) {
  std::wstring scratch;
  {
    RegistrySandbox sandbox;
    scratch = sandbox.ScratchPath(HKEY_CURRENT_USER);
    EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, L"Software\\Probe"));
    RegWriteDword(HKEY_CURRENT_USER, L"Software\\Probe", L"V", 7);
    EXPECT_EQ(RegReadDword(HKEY_CURRENT_USER, L"Software\\Probe", L"V"), 7u);
  }
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, L"Software\\Probe"));
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, scratch));
}

}  // namespace
