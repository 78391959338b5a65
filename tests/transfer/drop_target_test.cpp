#include <gtest/gtest.h>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "server/class_creators.h"
#include "shell/shell_folder.h"
#include "support/registry_sandbox.h"
#include "transfer/drop_target.h"

namespace {

// A source that offers every format, so that a refusal can't be put down to the data.
struct OffersEverything : com::ComObject<IDataObject> {
  STDMETHODIMP GetData(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP GetDataHere(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP QueryGetData(FORMATETC*) override { ++queries; return S_OK; }
  STDMETHODIMP GetCanonicalFormatEtc(FORMATETC*, FORMATETC*) override { return E_NOTIMPL; }
  STDMETHODIMP SetData(FORMATETC*, STGMEDIUM*, BOOL) override { return E_NOTIMPL; }
  STDMETHODIMP EnumFormatEtc(DWORD, IEnumFORMATETC**) override { return E_NOTIMPL; }
  STDMETHODIMP DAdvise(FORMATETC*, DWORD, IAdviseSink*, DWORD*) override { return E_NOTIMPL; }
  STDMETHODIMP DUnadvise(DWORD) override { return E_NOTIMPL; }
  STDMETHODIMP EnumDAdvise(IEnumSTATDATA**) override { return E_NOTIMPL; }
  int queries = 0;
};

class DropTargets : public testing::Test {
 protected:
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), locks_); }
  RegistrySandbox sandbox_;
  com::ComPtr<OffersEverything> data_ = com::Make<OffersEverything>();
  long locks_ = com::ModuleLockCount();
};

// What the folder hands out for a level refuses all four calls, with any arguments.
TEST_F(DropTargets, TheItemTargetRefusesEverything) {
  auto folder = com::Make<CMarlixDLShellFolder>();
  ASSERT_EQ(folder->Initialize(nullptr), S_OK);
  win::UniqueCoMem<ITEMIDLIST> level(CPidlMgr().CreateItem(PIDL_LEVEL, L"North", sizeof(L"North")));
  LPCITEMIDLIST items[] = {level.Get()};
  com::ComPtr<IDropTarget> target;
  ASSERT_EQ(folder->GetUIObjectOf(nullptr, 1, items, IID_IDropTarget, nullptr, target.PutVoid()), S_OK);
  DWORD effect = DROPEFFECT_COPY;
  EXPECT_EQ(target->DragEnter(data_.Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->DragOver(0, {0, 0}, nullptr), E_INVALIDARG);
  EXPECT_EQ(target->DragLeave(), E_INVALIDARG);
  EXPECT_EQ(target->Drop(nullptr, 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(effect, DWORD(DROPEFFECT_COPY));
  EXPECT_EQ(data_->queries, 0) << "the data is never looked at";
}

// Made by its class object, the list target has no list, view or folder to read.
TEST_F(DropTargets, AListTargetNobodySetUpRefusesWithoutTouchingAnything) {
  com::ComPtr<IDropTarget> target;
  ASSERT_EQ(CreateMarlixDLDropTargetOnListView(IID_IDropTarget, target.PutVoid()), S_OK);
  DWORD effect = DROPEFFECT_MOVE;
  EXPECT_EQ(target->DragEnter(data_.Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->DragOver(0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->Drop(data_.Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->DragLeave(), S_OK);
  EXPECT_EQ(effect, DWORD(DROPEFFECT_MOVE));
  EXPECT_EQ(data_->queries, 0);
}

}  // namespace
