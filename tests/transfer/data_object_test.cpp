#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "data_test_support.h"
#include "helpers/win_handles.h"
#include "server/com_base.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"
#include "transfer/download_dialog.h"

namespace {

FORMATETC Request(const wchar_t* name, DWORD tymed, LONG index = -1) {
  return {CLIPFORMAT(RegisterClipboardFormatW(name)), nullptr, DVASPECT_CONTENT, index, tymed};
}

com::ComPtr<CMarlixDLDataObject> ObjectFor(std::initializer_list<std::pair<const wchar_t*, bool>> items) {
  auto obj = com::Make<CMarlixDLDataObject>();
  for (auto& [level, withFile] : items) {
    win::UniqueCoMem<ITEMIDLIST> list(MakeFullList(level, withFile));
    obj->AddItem(list.Get());
  }
  return obj;
}

class DataObject : public testing::Test {
 protected:
  void AddLevels(std::initializer_list<const wchar_t*> names) {
    for (const wchar_t* name : names) {
      CStationRecord r;
      r.Name = name;
      ASSERT_EQ(AddStation(r), S_OK);
    }
  }
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), locks_); }
  RegistrySandbox sandbox_;
  PrivateTempDir temp_;
  long locks_ = com::ModuleLockCount();
  STGMEDIUM m_{};
};

TEST_F(DataObject, DropEffectDescriptorAndIdListArrayBytes) {
  auto obj = ObjectFor({{L"Lev", true}, {L"Other", true}});
  FORMATETC f = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  EXPECT_EQ(m_.pUnkForRelease, nullptr);
  EXPECT_EQ(GlobalFlags(m_.hGlobal) & GMEM_DDESHARE, UINT(GMEM_DDESHARE));
  EXPECT_EQ(win::GlobalLockGuard<DWORD>(m_.hGlobal).Size(), 4u);
  EXPECT_EQ(*win::GlobalLockGuard<DWORD>(m_.hGlobal).Get(), DWORD(DROPEFFECT_COPY));
  ReleaseStgMedium(&m_);

  f = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  {
    win::GlobalLockGuard<FILEGROUPDESCRIPTORW> group(m_.hGlobal);
    ASSERT_EQ(group.Size(), 4u + 592u * 2);
    EXPECT_EQ(group.Get()->cItems, 2u);
    EXPECT_STREQ(group.Get()->fgd[1].cFileName, L"file1.tkf");
    EXPECT_EQ(group.Get()->fgd[1].dwFlags, 0u);
  }
  ReleaseStgMedium(&m_);

  f = Request(L"Shell IDList Array", TYMED_HGLOBAL);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  win::UniqueCoMem<ITEMIDLIST> full(MakeFullList(L"Lev", true));
  const BYTE* ids = reinterpret_cast<const BYTE*>(full.Get());
  const USHORT rootCb = *reinterpret_cast<const USHORT*>(ids);
  const UINT parentIds = rootCb + *reinterpret_cast<const USHORT*>(ids + rootCb);
  const UINT parentSize = parentIds + 2, fileSize = 41;
  {
    win::GlobalLockGuard<BYTE> block(m_.hGlobal);
    const BYTE* b = block.Get();
    const auto* cida = reinterpret_cast<const CIDA*>(b);
    ASSERT_EQ(block.Size(), 16 + parentSize + 2 * fileSize);
    EXPECT_EQ(cida->cidl, 2u);
    EXPECT_EQ(cida->aoffset[0], 16u);
    EXPECT_EQ(cida->aoffset[1], 16u + parentSize);
    EXPECT_EQ(cida->aoffset[2], 16u + parentSize + fileSize);
    EXPECT_EQ(std::memcmp(b + 16, ids, parentIds), 0) << "root and level of the first item";
    EXPECT_EQ(*reinterpret_cast<const USHORT*>(b + 16 + parentIds), 0);
    EXPECT_EQ(std::memcmp(b + cida->aoffset[2], ids + parentIds, fileSize), 0);
  }
  ReleaseStgMedium(&m_);

  // The exact medium test refuses a request that also allows another medium.
  f = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL | TYMED_ISTREAM);
  EXPECT_EQ(obj->GetData(&f, &m_), E_INVALIDARG);
  EXPECT_EQ(obj->QueryGetData(&f), S_FALSE);
}

TEST_F(DataObject, StationsBlockLeavesOutLevelsDeletedMeanwhile) {
  AddLevels({L"North", L"South"});
  auto obj = ObjectFor({{L"North", true}, {L"South", false}});
  CStationRecord gone;
  gone.Name = L"North";
  ASSERT_EQ(DeleteStation(gone), S_OK);
  FORMATETC f = Request(L"Marlix Total Stations", TYMED_HGLOBAL);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  std::vector<CStationRecord> records;
  UnpackStations(m_.hGlobal, records);
  ASSERT_EQ(records.size(), 1u);
  EXPECT_EQ(records[0].Name, L"South");
  ReleaseStgMedium(&m_);

  auto empty = com::Make<CMarlixDLDataObject>();
  ASSERT_EQ(empty->GetData(&f, &m_), S_OK);
  EXPECT_EQ(*win::GlobalLockGuard<DWORD>(m_.hGlobal).Get(), 0u) << "a block with count 0";
  ReleaseStgMedium(&m_);
  m_.tymed = 0x55;
  for (const wchar_t* name : {L"FileGroupDescriptorW", L"Shell IDList Array"}) {
    f = Request(name, TYMED_HGLOBAL);
    EXPECT_EQ(empty->GetData(&f, &m_), S_FALSE) << name;
  }
  f = Request(L"FileContents", TYMED_ISTREAM, 0);
  EXPECT_EQ(empty->GetData(&f, &m_), S_FALSE);
  EXPECT_EQ(m_.tymed, 0x55u) << "the medium stays untouched";
}

TEST_F(DataObject, QueriesEnumerationAndSetData) {
  auto obj = ObjectFor({{L"A", true}});
  FORMATETC f = Request(L"FileContents", TYMED_HGLOBAL | TYMED_ISTREAM);
  EXPECT_EQ(obj->QueryGetData(&f), S_OK) << "the stream bit is enough";
  f = Request(L"FileContents", TYMED_HGLOBAL);
  EXPECT_EQ(obj->QueryGetData(&f), S_FALSE);
  for (auto name : {L"FileGroupDescriptorW", L"Shell IDList Array", L"Preferred DropEffect", L"Marlix Total Stations"}) {
    f = Request(name, TYMED_HGLOBAL);
    EXPECT_EQ(obj->QueryGetData(&f), S_OK) << name;
  }
  com::ComPtr<IEnumFORMATETC> list;
  ASSERT_EQ(obj->EnumFormatEtc(DATADIR_SET, list.Put()), S_OK);
  FORMATETC got[8]{};
  ULONG fetched = 0;
  list->Next(8, got, &fetched);
  ASSERT_EQ(fetched, 4u) << "Preferred DropEffect is answered but not listed";
  const wchar_t* order[] = {L"FileContents", L"FileGroupDescriptorW", L"Shell IDList Array", L"Marlix Total Stations"};
  for (int i = 0; i < 4; ++i) EXPECT_EQ(got[i].cfFormat, Request(order[i], 0).cfFormat) << order[i];

  // SetData keeps nothing and leaves the medium with its owner.
  FORMATETC text{CF_UNICODETEXT, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
  STGMEDIUM given{TYMED_HGLOBAL, {}, nullptr};
  given.hGlobal = GlobalAlloc(GMEM_MOVEABLE, 8);
  EXPECT_EQ(obj->SetData(&text, &given, TRUE), S_OK);
  EXPECT_EQ(GlobalSize(given.hGlobal), 8u);
  EXPECT_EQ(obj->GetData(&text, &m_), E_INVALIDARG);
  EXPECT_EQ(obj->QueryGetData(&text), S_FALSE);
  ReleaseStgMedium(&given);
}

TEST_F(DataObject, ContentsRefusedBeforeAnyDialog) {
  AddLevels({L"A"});
  auto obj = ObjectFor({{L"A", true}, {L"A", false}, {L"Gone", true}});
  DialogDriver watch(GetCurrentThreadId(), IDCANCEL, {}, 3000);
  for (LONG index : {-1L, 3L, LONG(0x80000000), 1L}) {
    FORMATETC f = Request(L"FileContents", TYMED_ISTREAM, index);
    EXPECT_EQ(obj->GetData(&f, &m_), S_FALSE) << "index " << index;
  }
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM, 2);
  EXPECT_EQ(obj->GetData(&f, &m_), E_FAIL) << "FindStation's code";
  watch.Finish();
  EXPECT_FALSE(watch.DialogSeen());

  // Any live transfer window blocks every request; a stale handle does not.
  HWND fake = CreateWindowExW(0, L"STATIC", L"", WS_POPUP, 0, 0, 1, 1, nullptr, nullptr, nullptr, nullptr);
  FORMATETC drop = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
  for (HWND* slot : {&DownloadDialogWindow, &UploadDialogWindow}) {
    *slot = fake;
    EXPECT_EQ(obj->QueryGetData(&drop), E_INVALIDARG);
    EXPECT_EQ(obj->GetData(&drop, &m_), E_INVALIDARG);
    *slot = nullptr;
  }
  DestroyWindow(fake);
  DownloadDialogWindow = fake;
  EXPECT_EQ(obj->QueryGetData(&drop), S_OK);
  DownloadDialogWindow = nullptr;
}

std::vector<char> ReadAll(IStream* stream) {
  std::vector<char> all;
  char block[4096];
  for (ULONG got = sizeof block; got == sizeof block && stream->Read(block, sizeof block, &got) == S_OK;)
    all.insert(all.end(), block, block + got);
  return all;
}

TEST_F(DataObject, DownloadWhileOtherRequestsAreRefused) {
  AddLevels({L"A"});
  auto obj = ObjectFor({{L"A", true}});
  auto other = ObjectFor({{L"A", true}});
  const auto before = TransferFiles();
  HRESULT queried = S_OK, fetched = S_OK;
  DialogDriver driver(GetCurrentThreadId(), 220, [&](HWND) {
    FORMATETC drop = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
    FORMATETC group = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL);
    STGMEDIUM m{};
    queried = other->QueryGetData(&drop);
    fetched = other->GetData(&group, &m);
  });
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM | TYMED_HGLOBAL, 0);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  EXPECT_TRUE(driver.Finish());
  EXPECT_EQ(queried, E_INVALIDARG);
  EXPECT_EQ(fetched, E_INVALIDARG);
  ASSERT_EQ(m_.tymed, DWORD(TYMED_ISTREAM));
  EXPECT_EQ(m_.pUnkForRelease, nullptr);
  EXPECT_EQ(TransferFiles().size(), before.size() + 1) << "the received .txt waits";
  EXPECT_TRUE(IsStandInJob(ReadAll(m_.pstm)));
  EXPECT_EQ(TransferFiles(), before) << "the short read deleted it";
  char more[4];
  ULONG got = 9;
  EXPECT_EQ(m_.pstm->Read(more, 4, &got), S_OK);
  EXPECT_EQ(got, 0u);
  EXPECT_EQ(m_.pstm->Release(), 0u) << "one reference for the caller";

  // No cache: the same request runs a new transfer, and a cancel leaves the medium alone.
  DialogDriver cancel(GetCurrentThreadId(), IDCANCEL);
  m_.tymed = 0x77;
  EXPECT_EQ(obj->GetData(&f, &m_), S_FALSE);
  EXPECT_TRUE(cancel.Finish());
  EXPECT_EQ(m_.tymed, 0x77u);
  EXPECT_EQ(DownloadDialogWindow, nullptr);
}

TEST_F(DataObject, EachIndexIsATransferAndAnEarlyReleaseKeepsTheFile) {
  AddLevels({L"A", L"B"});
  auto obj = ObjectFor({{L"A", true}, {L"B", true}});
  const auto before = TransferFiles();
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM, 1);
  DialogDriver driver(GetCurrentThreadId(), 220);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  EXPECT_TRUE(driver.Finish());
  char buf[2];
  ULONG got = 0;
  EXPECT_EQ(m_.pstm->Read(buf, 2, &got), S_OK);
  ReleaseStgMedium(&m_);
  EXPECT_EQ(TransferFiles().size(), before.size() + 1) << "released before the end: the file stays";
}

TEST_F(DataObject, DragPictureIsCleanedOnlyWhenNothingIsHeld) {
  auto obj = com::Make<CMarlixDLDataObject>();
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_FALSE(obj->DragImageShown) << "no picture: nothing";

  HWND list = CreateWindowExW(0, L"STATIC", L"", WS_POPUP | WS_VISIBLE, 0, 0, 50, 50, nullptr, nullptr,
                              nullptr, nullptr);
  HIMAGELIST image = ImageList_Create(16, 16, ILC_COLOR32, 1, 1);
  ImageList_ReplaceIcon(image, -1, LoadIconW(nullptr, IDI_APPLICATION));
  obj->SetDragImage(image, list, POINT{-3, -4});
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_TRUE(obj->DragImageShown);
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_NONE), DRAGDROP_S_USEDEFAULTCURSORS);

  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_LBUTTON), S_OK);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, MK_LBUTTON), DRAGDROP_S_CANCEL);
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_SHIFT), DRAGDROP_S_DROP);
  EXPECT_TRUE(obj->DragImageShown) << "a modifier still held keeps the picture";
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, 0), DRAGDROP_S_DROP);
  EXPECT_FALSE(obj->DragImageShown);
  EXPECT_EQ(obj->DragImage, nullptr);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, 0), DRAGDROP_S_CANCEL);
  DestroyWindow(list);
}

}  // namespace
