#include <gtest/gtest.h>

#include <map>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "server/class_creators.h"
#include "shell/shell_folder.h"
#include "support/registry_sandbox.h"
#include "transfer/download_dialog.h"
#include "transfer/drop_target.h"
#include "store/station_record.h"

namespace {

// A source that answers queries for the formats it is given, each with its own answer
// (by default every format, with S_OK), and notes what it was asked.
struct Offers : com::ComObject<IDataObject> {
  STDMETHODIMP GetData(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP GetDataHere(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP QueryGetData(FORMATETC* f) override {
    wchar_t name[64] = L"CF_HDROP";
    if (f->cfFormat != CF_HDROP) GetClipboardFormatNameW(f->cfFormat, name, 64);
    asked.push_back(std::wstring(name) + (f->tymed == TYMED_ISTREAM ? L"/stream" : L"") +
                    (f->dwAspect == DVASPECT_CONTENT && f->lindex == -1 && !f->ptd ? L"" : L"/odd"));
    if (answers.empty()) return S_OK;
    auto found = answers.find(name);
    return found == answers.end() ? DV_E_FORMATETC : found->second;
  }
  STDMETHODIMP GetCanonicalFormatEtc(FORMATETC*, FORMATETC*) override { return E_NOTIMPL; }
  STDMETHODIMP SetData(FORMATETC*, STGMEDIUM*, BOOL) override { return E_NOTIMPL; }
  STDMETHODIMP EnumFormatEtc(DWORD, IEnumFORMATETC**) override { return E_NOTIMPL; }
  STDMETHODIMP DAdvise(FORMATETC*, DWORD, IAdviseSink*, DWORD*) override { return E_NOTIMPL; }
  STDMETHODIMP DUnadvise(DWORD) override { return E_NOTIMPL; }
  STDMETHODIMP EnumDAdvise(IEnumSTATDATA**) override { return E_NOTIMPL; }
  std::map<std::wstring, HRESULT> answers;
  std::vector<std::wstring> asked;
};

class DropTargets : public testing::Test {
 protected:
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), locks_); }
  RegistrySandbox sandbox_;
  com::ComPtr<Offers> data_ = com::Make<Offers>();
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
  EXPECT_TRUE(data_->asked.empty()) << "the data is never looked at";
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
  EXPECT_TRUE(data_->asked.empty());
}

// A list target over a real list window, set up as a view of `folder` would set it up.
class ListTarget : public DropTargets {
 protected:
  HRESULT Enter(IDataObject* data, const wchar_t* folder = L"Marlix Digital Levels") {
    win::UniqueCoMem<ITEMIDLIST> list(CPidlMgr().CreateListFromPath(folder));
    target_->SetTarget(list_, view_.Get(), list.Get());
    DWORD effect = DROPEFFECT_LINK;
    HRESULT hr = target_->DragEnter(data, MK_LBUTTON, {0, 0}, &effect);
    EXPECT_EQ(effect, DWORD(DROPEFFECT_LINK)) << "DragEnter leaves the effect alone";
    target_->SetTarget(nullptr, nullptr, nullptr);
    return hr;
  }
  void SetUp() override {
    ASSERT_EQ(root_->Initialize(nullptr), S_OK);
    ASSERT_EQ(root_->CreateViewObject(nullptr, IID_IShellView, view_.PutVoid()), S_OK);
  }
  void TearDown() override {
    DestroyWindow(list_);
    view_.Reset();
    root_.Reset();
    target_.Reset();
    DropTargets::TearDown();
  }
  HWND list_ = CreateWindowExW(0, WC_LISTVIEWW, nullptr, WS_POPUP, 0, 0, 100, 100, nullptr, nullptr, nullptr, nullptr);
  com::ComPtr<CMarlixDLShellFolder> root_ = com::Make<CMarlixDLShellFolder>();
  com::ComPtr<IShellView> view_;
  com::ComPtr<CMarlixDLDropTargetOnListView> target_ = com::Make<CMarlixDLDropTargetOnListView>();
};

// Files on disk, an id array, or both halves of a virtual file, asked in that order.
TEST_F(ListTarget, EnterAsksForFilesThenIdsThenBothHalvesOfAVirtualFile) {
  data_->answers = {{L"FileContents", S_OK}};
  EXPECT_EQ(Enter(data_.Get()), E_INVALIDARG) << "contents without a descriptor";
  EXPECT_EQ(data_->asked, (std::vector<std::wstring>{L"CF_HDROP", L"Shell IDList Array", L"FileGroupDescriptorW"}));
  data_->asked.clear();
  data_->answers = {{L"FileGroupDescriptorW", S_OK}};
  EXPECT_EQ(Enter(data_.Get()), E_INVALIDARG) << "a descriptor alone";
  EXPECT_EQ(data_->asked.back(), L"FileContents/stream");
  data_->answers = {{L"FileGroupDescriptorW", S_OK}, {L"FileContents", S_OK}};
  EXPECT_EQ(Enter(data_.Get()), S_OK);
  data_->answers = {{L"CF_HDROP", S_OK}};
  EXPECT_EQ(Enter(data_.Get()), S_OK);
  data_->answers = {{L"Shell IDList Array", S_OK}};
  EXPECT_EQ(Enter(data_.Get()), S_OK);
}

TEST_F(ListTarget, OnlyAnAnswerOfExactlyZeroCountsAsOffered) {
  data_->answers = {{L"CF_HDROP", S_FALSE}, {L"Shell IDList Array", E_FAIL}, {L"FileGroupDescriptorW", S_FALSE}};
  EXPECT_EQ(Enter(data_.Get()), E_INVALIDARG);
  data_->answers = {{L"FileGroupDescriptorW", S_OK}, {L"FileContents", S_FALSE}};
  EXPECT_EQ(Enter(data_.Get()), E_INVALIDARG);
}

TEST_F(ListTarget, ALevelsOwnViewTakesNothing) {
  EXPECT_EQ(Enter(data_.Get(), L"Marlix Digital Levels\\North"), E_INVALIDARG);
  EXPECT_TRUE(data_->asked.empty());
}

TEST_F(ListTarget, OurVirtualFileIsTakenUnlessItsDownloadIsRunning) {
  CStationRecord level;
  level.Name = L"North";
  ASSERT_EQ(AddStation(level), S_OK);
  com::ComPtr<IDataObject> file;
  ASSERT_EQ(CreateMarlixDLDataObject(IID_IDataObject, file.PutVoid()), S_OK);
  static_cast<CMarlixDLDataObject*>(file.Get())->AddItem(win::UniqueCoMem<ITEMIDLIST>(MakeFullList(L"North", true)).Get());
  EXPECT_EQ(Enter(file.Get()), S_OK);
  DownloadDialogWindow = list_;  // any live window stands for the open dialog
  EXPECT_EQ(Enter(file.Get()), E_INVALIDARG);
  DownloadDialogWindow = nullptr;
}

}  // namespace
