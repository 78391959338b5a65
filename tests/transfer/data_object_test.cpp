#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "server/class_creators.h"
#include "server/com_base.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"

namespace {

CLIPFORMAT Cf(const wchar_t* name) { return static_cast<CLIPFORMAT>(RegisterClipboardFormatW(name)); }

FORMATETC Request(const wchar_t* name, DWORD tymed, LONG index = -1) {
  return {Cf(name), nullptr, DVASPECT_CONTENT, index, tymed};
}

com::ComPtr<CMarlixDLDataObject> ObjectFor(std::initializer_list<std::pair<const wchar_t*, bool>> items) {
  auto obj = com::Make<CMarlixDLDataObject>();
  for (auto& [level, file] : items) {
    win::UniqueCoMem<ITEMIDLIST> list(MakeFullList(level, file));
    obj->AddItem(list.Get());
  }
  return obj;
}

void AddLevel(const wchar_t* name) {
  CStationRecord r;
  r.Name = name;
  ASSERT_EQ(AddStation(r), S_OK);
}

class DataObject : public testing::Test {
 protected:
  RegistrySandbox sandbox_;
  long locks_ = com::ModuleLockCount();
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), locks_); }
};

TEST_F(DataObject, DropEffectAndGroupDescriptorBytes) {
  auto obj = ObjectFor({{L"A", true}, {L"B", true}});
  FORMATETC f = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
  STGMEDIUM m{};
  ASSERT_EQ(obj->GetData(&f, &m), S_OK);
  EXPECT_EQ(m.tymed, DWORD(TYMED_HGLOBAL));
  EXPECT_EQ(m.pUnkForRelease, nullptr);
  {
    win::GlobalLockGuard<DWORD> lock(m.hGlobal);
    EXPECT_EQ(lock.Size(), 4u);
    EXPECT_EQ(*lock.Get(), DWORD(DROPEFFECT_COPY));
  }
  ReleaseStgMedium(&m);

  f = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL);
  ASSERT_EQ(obj->GetData(&f, &m), S_OK);
  {
    win::GlobalLockGuard<BYTE> lock(m.hGlobal);
    ASSERT_EQ(lock.Size(), 4u + 592u * 2);
    auto* group = reinterpret_cast<FILEGROUPDESCRIPTORW*>(lock.Get());
    EXPECT_EQ(group->cItems, 2u);
    for (int i = 0; i < 2; ++i) {
      EXPECT_STREQ(group->fgd[i].cFileName, L"file1.tkf");
      EXPECT_EQ(group->fgd[i].dwFlags, 0u);
      EXPECT_EQ(group->fgd[i].nFileSizeLow, 0u);
    }
  }
  ReleaseStgMedium(&m);

  // Exact medium test: another medium allowed beside it is refused.
  f = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL | TYMED_ISTREAM);
  EXPECT_EQ(obj->GetData(&f, &m), E_INVALIDARG);
  EXPECT_EQ(obj->QueryGetData(&f), S_FALSE);
}

TEST_F(DataObject, IdListArrayHoldsParentAndChildrenAtTheirOffsets) {
  auto obj = ObjectFor({{L"Lev", true}, {L"Other", true}});
  FORMATETC f = Request(L"Shell IDList Array", TYMED_HGLOBAL);
  STGMEDIUM m{};
  ASSERT_EQ(obj->GetData(&f, &m), S_OK);
  win::UniqueCoMem<ITEMIDLIST> full(MakeFullList(L"Lev", true));
  const BYTE* fullBytes = reinterpret_cast<const BYTE*>(full.Get());
  const USHORT rootCb = *reinterpret_cast<const USHORT*>(fullBytes);
  const USHORT levelCb = *reinterpret_cast<const USHORT*>(fullBytes + rootCb);
  const UINT parentSize = rootCb + levelCb + 2;
  const UINT fileSize = 39 + 2;
  {
    win::GlobalLockGuard<BYTE> lock(m.hGlobal);
    const BYTE* b = lock.Get();
    const auto* cida = reinterpret_cast<const CIDA*>(b);
    ASSERT_EQ(lock.Size(), 4u * 2 + 8 + parentSize + 2 * fileSize);
    EXPECT_EQ(cida->cidl, 2u);
    EXPECT_EQ(cida->aoffset[0], 16u);
    EXPECT_EQ(cida->aoffset[1], 16u + parentSize);
    EXPECT_EQ(cida->aoffset[2], 16u + parentSize + fileSize);
    // The parent is root and level of the first item, closed by its terminator.
    EXPECT_EQ(std::memcmp(b + 16, fullBytes, rootCb + levelCb), 0);
    EXPECT_EQ(*reinterpret_cast<const USHORT*>(b + 16 + rootCb + levelCb), 0);
    for (int i = 1; i <= 2; ++i) {
      const BYTE* child = b + cida->aoffset[i];
      EXPECT_EQ(*reinterpret_cast<const USHORT*>(child), 39);
      EXPECT_EQ(std::memcmp(child, fullBytes + rootCb + levelCb, fileSize), 0);
    }
  }
  ReleaseStgMedium(&m);
}

TEST_F(DataObject, StationsBlockLeavesOutLevelsDeletedMeanwhile) {
  AddLevel(L"North");
  AddLevel(L"South");
  auto obj = ObjectFor({{L"North", true}, {L"South", false}, {L"Nowhere", true}});
  CStationRecord gone;
  gone.Name = L"North";
  ASSERT_EQ(DeleteStation(gone), S_OK);

  FORMATETC f = Request(L"Marlix Total Stations", TYMED_HGLOBAL);
  STGMEDIUM m{};
  ASSERT_EQ(obj->GetData(&f, &m), S_OK);
  std::vector<CStationRecord> records;
  UnpackStations(m.hGlobal, records);
  ASSERT_EQ(records.size(), 1u);
  EXPECT_EQ(records[0].Name, L"South");
  ReleaseStgMedium(&m);

  // An empty object gives a block with count 0.
  auto empty = com::Make<CMarlixDLDataObject>();
  ASSERT_EQ(empty->GetData(&f, &m), S_OK);
  {
    win::GlobalLockGuard<DWORD> lock(m.hGlobal);
    EXPECT_EQ(lock.Size(), 4u);
    EXPECT_EQ(*lock.Get(), 0u);
  }
  ReleaseStgMedium(&m);
}

TEST_F(DataObject, EmptyObjectAndUnknownRequests) {
  auto obj = com::Make<CMarlixDLDataObject>();
  STGMEDIUM m{};
  m.tymed = 0x55;
  for (const wchar_t* name : {L"FileGroupDescriptorW", L"Shell IDList Array"}) {
    FORMATETC f = Request(name, TYMED_HGLOBAL);
    EXPECT_EQ(obj->GetData(&f, &m), S_FALSE) << name;
  }
  FORMATETC contents = Request(L"FileContents", TYMED_ISTREAM, 0);
  EXPECT_EQ(obj->GetData(&contents, &m), S_FALSE);
  EXPECT_EQ(m.tymed, 0x55u) << "medium untouched";

  FORMATETC text{CF_UNICODETEXT, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
  EXPECT_EQ(obj->GetData(&text, &m), E_INVALIDARG);
  EXPECT_EQ(obj->QueryGetData(&text), S_FALSE);

  // SetData keeps nothing and leaves the medium to its owner.
  STGMEDIUM given{};
  given.tymed = TYMED_HGLOBAL;
  given.hGlobal = GlobalAlloc(GMEM_MOVEABLE, 8);
  EXPECT_EQ(obj->SetData(&text, &given, TRUE), S_OK);
  EXPECT_NE(GlobalSize(given.hGlobal), 0u);
  EXPECT_EQ(obj->GetData(&text, &m), E_INVALIDARG);
  ReleaseStgMedium(&given);

  EXPECT_EQ(obj->GetDataHere(&text, &m), E_NOTIMPL);
  FORMATETC out{};
  EXPECT_EQ(obj->GetCanonicalFormatEtc(&text, &out), E_NOTIMPL);
  DWORD conn = 0;
  EXPECT_EQ(obj->DAdvise(&text, 0, nullptr, &conn), E_NOTIMPL);
  EXPECT_EQ(obj->DUnadvise(0), E_NOTIMPL);
  IEnumSTATDATA* advise = nullptr;
  EXPECT_EQ(obj->EnumDAdvise(&advise), E_NOTIMPL);
}

TEST_F(DataObject, QueriesAndEnumerationListTheFormats) {
  auto obj = ObjectFor({{L"A", true}});
  FORMATETC f = Request(L"FileContents", TYMED_HGLOBAL | TYMED_ISTREAM);
  EXPECT_EQ(obj->QueryGetData(&f), S_OK) << "FileContents only needs the stream bit";
  f = Request(L"FileContents", TYMED_HGLOBAL);
  EXPECT_EQ(obj->QueryGetData(&f), S_FALSE);
  for (const wchar_t* name : {L"FileGroupDescriptorW", L"Shell IDList Array", L"Preferred DropEffect",
                              L"Marlix Total Stations"}) {
    f = Request(name, TYMED_HGLOBAL);
    EXPECT_EQ(obj->QueryGetData(&f), S_OK) << name;
  }

  com::ComPtr<IEnumFORMATETC> list;
  ASSERT_EQ(obj->EnumFormatEtc(DATADIR_SET, list.Put()), S_OK);
  FORMATETC got[8]{};
  ULONG fetched = 0;
  EXPECT_EQ(list->Next(8, got, &fetched), S_OK);
  ASSERT_EQ(fetched, 4u) << "Preferred DropEffect is not listed";
  EXPECT_EQ(got[0].cfFormat, Cf(L"FileContents"));
  EXPECT_EQ(got[1].cfFormat, Cf(L"FileGroupDescriptorW"));
  EXPECT_EQ(got[2].cfFormat, Cf(L"Shell IDList Array"));
  EXPECT_EQ(got[3].cfFormat, Cf(L"Marlix Total Stations"));
  for (auto& g : got) {
    if (!g.cfFormat) continue;
    EXPECT_EQ(g.ptd, nullptr);
    EXPECT_EQ(g.dwAspect, DWORD(DVASPECT_CONTENT));
    EXPECT_EQ(g.lindex, -1);
  }

  com::ComPtr<IDropSource> source;
  EXPECT_EQ(obj.As(&source), S_OK);
  com::ComPtr<IDataObject> data;
  EXPECT_EQ(source.As(&data), S_OK);

  // The class object's creator hands out the same interfaces.
  com::ComPtr<IDropSource> made;
  EXPECT_EQ(CreateMarlixDLDataObject(IID_IDropSource, made.PutVoid()), S_OK);
  com::ComPtr<IStream> none;
  EXPECT_EQ(CreateMarlixDLDataObject(IID_IStream, none.PutVoid()), E_NOINTERFACE);
}

TEST_F(DataObject, ContentsRefusedWithoutADialog) {
  AddLevel(L"A");
  auto obj = ObjectFor({{L"A", true}, {L"A", false}});
  DialogDriver watch(GetCurrentThreadId(), IDCANCEL, {}, 3000);
  STGMEDIUM m{};
  for (LONG index : {-1L, 2L, LONG(0x80000000), 1L}) {
    FORMATETC f = Request(L"FileContents", TYMED_ISTREAM, index);
    EXPECT_EQ(obj->GetData(&f, &m), S_FALSE) << index;
  }
  auto missing = ObjectFor({{L"Gone", true}});
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM, 0);
  EXPECT_EQ(missing->GetData(&f, &m), E_FAIL);
  watch.Finish();
  EXPECT_FALSE(watch.DialogSeen());
}

TEST_F(DataObject, DragSourceCleansThePictureOnlyWhenNothingIsHeld) {
  auto obj = com::Make<CMarlixDLDataObject>();
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS) << "no picture: nothing";
  EXPECT_FALSE(obj->DragImageShown);

  HWND list = CreateWindowExW(0, L"STATIC", L"", WS_POPUP | WS_VISIBLE, 0, 0, 50, 50, nullptr, nullptr,
                              nullptr, nullptr);
  HIMAGELIST image = ImageList_Create(16, 16, ILC_COLOR32, 1, 1);
  HDC screen = GetDC(nullptr);
  HBITMAP bitmap = CreateCompatibleBitmap(screen, 16, 16);
  ReleaseDC(nullptr, screen);
  ImageList_Add(image, bitmap, nullptr);
  DeleteObject(bitmap);
  obj->SetDragImage(image, list, POINT{-3, -4});
  EXPECT_EQ(obj->DragHotSpot.x, -3);

  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_TRUE(obj->DragImageShown);
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_NONE), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_TRUE(obj->DragImageShown);

  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_LBUTTON), S_OK);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, MK_LBUTTON), DRAGDROP_S_CANCEL);
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_SHIFT), DRAGDROP_S_DROP);
  EXPECT_TRUE(obj->DragImageShown) << "a modifier still held keeps the picture";
  EXPECT_EQ(obj->DragImage, image);

  EXPECT_EQ(obj->QueryContinueDrag(FALSE, 0), DRAGDROP_S_DROP);
  EXPECT_FALSE(obj->DragImageShown);
  EXPECT_EQ(obj->DragImage, nullptr);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, 0), DRAGDROP_S_CANCEL);
  DestroyWindow(list);
}

}  // namespace
