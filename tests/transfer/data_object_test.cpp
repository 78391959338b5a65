#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <fstream>
#include <map>

#include "data_test_support.h"
#include "base/win_handles.h"
#include "shell/shell_folder.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"
#include "transfer/download_dialog.h"
#include "transfer/drop_target.h"
#include "transfer/stream2.h"

namespace {

class DataObject : public testing::Test {
 protected:
  // Stores the levels, then makes an object of the items (level, with the virtual file).
  com::ComPtr<CMarlixDLDataObject> Make(std::initializer_list<const wchar_t*> levels,
                                        std::initializer_list<std::pair<const wchar_t*, bool>> items) {
    for (CStationRecord r; auto name : levels) { r.Name = name; EXPECT_EQ(AddStation(r), S_OK); }
    auto obj = com::Make<CMarlixDLDataObject>();
    for (auto& [level, file] : items) obj->AddItem(win::UniqueCoMem<ITEMIDLIST>(MakeFullList(level, file)).Get());
    return obj;
  }
  // The bytes of a block answered with S_OK as a medium that passes to the caller.
  static std::vector<BYTE> Fetch(IDataObject* obj, const wchar_t* format) {
    FORMATETC f = Request(format, TYMED_HGLOBAL);
    STGMEDIUM m{};
    EXPECT_EQ(obj->GetData(&f, &m), S_OK) << format;
    if (m.tymed != TYMED_HGLOBAL) return {};
    EXPECT_EQ(m.pUnkForRelease, nullptr);
    std::vector<BYTE> bytes(GlobalSize(m.hGlobal));
    std::memcpy(bytes.data(), win::GlobalLockGuard<BYTE>(m.hGlobal).Get(), bytes.size());
    ReleaseStgMedium(&m);
    return bytes;
  }
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), locks_); }
  RegistrySandbox sandbox_;
  long locks_ = com::ModuleLockCount();
  STGMEDIUM m_{};
};

// Everything but a valid contents request is answered at once, and no dialog comes up.
TEST_F(DataObject, RequestsThatNeedNoTransfer) {
  auto obj = com::Make<CMarlixDLDataObject>();
  DialogDriver watch(IDCANCEL);
  // The first four are the list, in its order.
  const struct { const wchar_t* format; DWORD tymed; HRESULT query, get; std::vector<BYTE> block; } rows[] = {
      {L"FileContents", TYMED_ISTREAM, S_OK, S_FALSE, {}},
      {L"FileGroupDescriptorW", TYMED_HGLOBAL, S_OK, S_FALSE, {}},
      {L"Shell IDList Array", TYMED_HGLOBAL, S_OK, S_FALSE, {}},
      {L"Marlix Total Stations", TYMED_HGLOBAL, S_OK, S_OK, {0, 0, 0, 0}},
      {L"Preferred DropEffect", TYMED_HGLOBAL, S_OK, S_OK, {DROPEFFECT_COPY, 0, 0, 0}},
      {L"FileContents", TYMED_ISTREAM | TYMED_HGLOBAL, S_OK, S_FALSE, {}},  // the stream bit is enough
      {L"FileContents", TYMED_HGLOBAL, S_FALSE, E_INVALIDARG, {}},
      {L"FileGroupDescriptorW", TYMED_HGLOBAL | TYMED_ISTREAM, S_FALSE, E_INVALIDARG, {}},  // the others: exactly
      {L"Shell IDList Array", TYMED_ISTREAM, S_FALSE, E_INVALIDARG, {}},
      {L"Marlix Total Stations", TYMED_HGLOBAL | TYMED_FILE, S_FALSE, E_INVALIDARG, {}},
      {L"Preferred DropEffect", TYMED_HGLOBAL | TYMED_ISTREAM, S_FALSE, E_INVALIDARG, {}},
      {L"Other Format", TYMED_HGLOBAL, S_FALSE, E_INVALIDARG, {}}};
  for (auto& row : rows) {
    SCOPED_TRACE(testing::Message() << "format " << row.format << ", tymed " << row.tymed);
    FORMATETC f = Request(row.format, row.tymed, 0);
    EXPECT_EQ(obj->QueryGetData(&f), row.query);
    if (row.get == S_OK) {
      EXPECT_EQ(Fetch(obj.Get(), row.format), row.block);
      continue;
    }
    m_.tymed = 0x55;
    EXPECT_EQ(obj->GetData(&f, &m_), row.get);
    EXPECT_EQ(m_.tymed, 0x55u) << "the medium stays untouched";
  }

  com::ComPtr<IEnumFORMATETC> list, clone;
  ASSERT_EQ(obj->EnumFormatEtc(DATADIR_SET, list.Put()), S_OK);
  FORMATETC got[10]{};
  ULONG n = 0;
  EXPECT_EQ(list->Next(10, got, &n), S_OK) << "fewer than asked is still S_OK";
  ASSERT_EQ(n, 4u);
  for (int i = 0; i < 4; ++i)
    EXPECT_TRUE(got[i].cfFormat == Request(rows[i].format, 0).cfFormat && got[i].tymed == rows[i].tymed) << i;
  EXPECT_EQ(list->Next(1, got, &n), S_FALSE);
  list->Reset();
  EXPECT_EQ(list->Skip(4), S_FALSE) << "exactly the end";
  EXPECT_EQ(list->Skip(0xFFFFFFFFu), S_FALSE);
  EXPECT_EQ(list->Skip(3), S_OK) << "the position stayed";
  ASSERT_EQ(list->Clone(clone.Put()), S_OK);
  EXPECT_EQ(clone->Next(1, got, nullptr), S_OK);
  EXPECT_EQ(got[0].cfFormat, Request(rows[3].format, 0).cfFormat) << "the clone starts where its original stood";
  EXPECT_EQ(list->Next(1, got, nullptr), S_OK) << "and the original did not move";

  // A live upload dialog refuses every request too (the download dialog: below); stale handles don't.
  HWND fake = CreateWindowExW(0, L"STATIC", L"", WS_POPUP, 0, 0, 1, 1, nullptr, nullptr, nullptr, nullptr);
  FORMATETC drop = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
  UploadDialogWindow = fake;
  EXPECT_EQ(obj->QueryGetData(&drop), E_INVALIDARG);
  EXPECT_EQ(obj->GetData(&drop, &m_), E_INVALIDARG);
  DestroyWindow(fake);
  DownloadDialogWindow = fake;
  EXPECT_EQ(obj->QueryGetData(&drop), S_OK);
  DownloadDialogWindow = UploadDialogWindow = nullptr;

  // Two items: a file of North, deleted after the object was made, and South's level itself.
  auto two = Make({L"North", L"South"}, {{L"North", true}, {L"South", false}});
  CStationRecord gone;
  gone.Name = L"North";
  ASSERT_EQ(DeleteStation(gone), S_OK);
  // The name alone for every item: the receiver learns no size, time or attributes.
  std::vector<BYTE> group(4 + 2 * 592);
  group[0] = 2;
  for (size_t at : {4u, 596u}) std::memcpy(&group[at + offsetof(FILEDESCRIPTORW, cFileName)], L"file1.tkf", 20);
  EXPECT_EQ(Fetch(two.Get(), L"FileGroupDescriptorW"), group);

  // The parent of the first item, then the last id of each, at the offsets of the table.
  const std::vector<BYTE> parent = IdList({{1, L"Marlix Digital Levels"}, {2, L"North"}}),
                          file = IdList({{3, L"file1.tkf"}}), level = IdList({{2, L"South"}});
  std::vector<BYTE> cida = {2, 0, 0, 0, 16, 0, 0, 0, BYTE(16 + parent.size()), 0, 0, 0,
                            BYTE(16 + parent.size() + file.size()), 0, 0, 0};
  for (auto* part : {&parent, &file, &level}) cida.insert(cida.end(), part->begin(), part->end());
  EXPECT_EQ(Fetch(two.Get(), L"Shell IDList Array"), cida);

  FORMATETC f = Request(L"Marlix Total Stations", TYMED_HGLOBAL);
  ASSERT_EQ(two->GetData(&f, &m_), S_OK);
  std::vector<CStationRecord> records;
  UnpackStations(m_.hGlobal, records);
  ReleaseStgMedium(&m_);
  ASSERT_EQ(records.size(), 1u) << "North, deleted meanwhile, is left out";
  EXPECT_EQ(records[0].Name, L"South");

  // Index out of range, the level item (no file), and North's file: FindStation's code.
  for (auto [index, expected] : {std::pair<LONG, HRESULT>{-1, S_FALSE},
                                 {2, S_FALSE},
                                 {LONG(0x80000000), S_FALSE},
                                 {1, S_FALSE},
                                 {0, E_FAIL}}) {
    f = Request(L"FileContents", TYMED_ISTREAM, index);
    EXPECT_EQ(two->GetData(&f, &m_), expected) << "lindex " << index;
  }
  EXPECT_FALSE(watch.Finish()) << "no dialog";
}

TEST_F(DataObject, EachContentsRequestIsATransferOfItsOwn) {
  auto obj = Make({L"A", L"B"}, {{L"A", true}, {L"B", true}});
  const auto before = TransferFiles();
  DialogDriver driver(220, [&] {  // while it runs, every request is refused
    FORMATETC drop = Request(L"Preferred DropEffect", TYMED_HGLOBAL), group = Request(L"FileGroupDescriptorW", TYMED_HGLOBAL);
    STGMEDIUM m{};
    EXPECT_EQ(obj->QueryGetData(&drop), E_INVALIDARG);
    EXPECT_EQ(obj->GetData(&group, &m), E_INVALIDARG);
  });
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM | TYMED_HGLOBAL, 0);
  ASSERT_EQ(obj->GetData(&f, &m_), S_OK);
  EXPECT_TRUE(driver.Finish());
  ASSERT_EQ(m_.tymed, DWORD(TYMED_ISTREAM));
  EXPECT_EQ(m_.pUnkForRelease, nullptr);
  EXPECT_EQ(TransferFiles().size(), before.size() + 1) << "the received .txt waits";
  EXPECT_TRUE(IsStandInJob(ReadAll(m_.pstm)));
  EXPECT_EQ(TransferFiles(), before) << "the short read deleted it";
  EXPECT_EQ(m_.pstm->Release(), 0u) << "one reference for the caller";

  // No cache: the other index, then the same again, each open a dialog; a cancel leaves the medium.
  for (LONG index : {1, 0}) {
    DialogDriver cancel(IDCANCEL);
    f.lindex = index;
    m_.tymed = 0x77;
    EXPECT_EQ(obj->GetData(&f, &m_), S_FALSE) << "lindex " << index;
    EXPECT_TRUE(cancel.Finish());
    EXPECT_EQ(m_.tymed, 0x77u);
  }
  EXPECT_EQ(DownloadDialogWindow, nullptr);
}

TEST_F(DataObject, DragPictureIsCleanedOnlyWhenNothingIsHeld) {
  auto obj = com::Make<CMarlixDLDataObject>();
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_FALSE(obj->DragImageShown) << "no picture: nothing";
  HWND list = CreateWindowExW(0, L"STATIC", L"", WS_POPUP | WS_VISIBLE, 0, 0, 50, 50, nullptr, nullptr, nullptr, nullptr);
  HIMAGELIST image = ImageList_Create(16, 16, ILC_COLOR32, 1, 1);
  ImageList_ReplaceIcon(image, -1, LoadIconW(nullptr, IDI_APPLICATION));
  obj->SetDragImage(win::UniqueImageList(image), list, POINT{-3, -4});
  POINT at{}, hotSpot{};
  EXPECT_EQ(ImageList_GetDragImage(&at, &hotSpot), nullptr);
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_TRUE(obj->DragImageShown);
  EXPECT_NE(ImageList_GetDragImage(&at, &hotSpot), nullptr) << "the first feedback begins the drag picture";
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_NONE), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_LBUTTON), S_OK);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, MK_LBUTTON), DRAGDROP_S_CANCEL);
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_SHIFT), DRAGDROP_S_DROP);
  EXPECT_TRUE(obj->DragImageShown) << "neither escape nor a key still held cleans up";
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, 0), DRAGDROP_S_DROP);
  EXPECT_FALSE(obj->DragImageShown);
  EXPECT_EQ(ImageList_GetDragImage(&at, &hotSpot), nullptr) << "the drag picture has ended";
  EXPECT_FALSE(obj->DragImage);
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, 0), DRAGDROP_S_CANCEL);
  DestroyWindow(list);
}

// The read-once stream the contents come in.
using Stream2 = DataObject;

TEST_F(Stream2, ReadsOnceOnlyTheShortReadDeletesAndAMissingFileGivesTheBareCode) {
  struct Read { ULONG ask; std::string got; bool kept; };  // and whether the file is still there
  const struct { std::string text; std::vector<Read> reads; } cases[] = {
      {"0123456789", {{4, "0123", true}, {4, "4567", true}, {8, "89", false}, {8, "", false}, {8, "", false}}},
      {"abcdefgh", {{4, "abcd", true}, {4, "efgh", true}, {4, "", false}}},  // only the read of 0 bytes
      {"abcdefgh", {{4, "abcd", true}, {4, "efgh", true}}},  // released after exactly its size: it stays
      {"xyz", {{2, "xy", true}}}};                          // released early: it stays
  for (auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.text << " in " << c.reads.size() << " reads");
    wchar_t path[MAX_PATH];
    GetTempFileNameW(TempDir().c_str(), L"STT", 0, path);
    std::ofstream(path, std::ios::binary) << c.text;
    auto exists = [&] { return GetFileAttributesW(path) != INVALID_FILE_ATTRIBUTES; };
    {
      auto stream = com::Make<CStream2>();
      EXPECT_EQ(stream->AttachFile(path, L"file1.tkf", true), S_OK);
      STATSTG stat;
      std::memset(&stat, 0xAB, sizeof stat);
      EXPECT_EQ(stream->Stat(&stat, STATFLAG_NONAME), S_OK);
      EXPECT_EQ(stat.cbSize.QuadPart, 0xABABABAB00000000ull + c.text.size()) << "only the low half is written";
      for (const Read& r : c.reads) {
        ULARGE_INTEGER pos{{77, 0}};
        EXPECT_EQ(stream->Seek(LARGE_INTEGER{}, STREAM_SEEK_SET, &pos), S_OK);
        EXPECT_EQ(pos.QuadPart, 77u) << "Seek reports and moves nothing";
        char buf[8];
        ULONG got = 99;
        EXPECT_EQ(stream->Read(buf, r.ask, &got), S_OK);
        EXPECT_EQ(std::string(buf, std::min<ULONG>(got, 8)), r.got);
        EXPECT_EQ(exists(), r.kept);
      }
    }
    EXPECT_EQ(exists(), c.reads.back().kept) << "the release deletes nothing";
    DeleteFileW(path);
  }
  // A missing file: the first read gives the bare system code.
  auto stream = com::Make<CStream2>();
  EXPECT_EQ(stream->AttachFile(L"C:\\no\\such\\dir\\gone.txt", L"file1.tkf", true), S_OK);
  char buf[4];
  ULONG got = 9;
  EXPECT_EQ(stream->Read(buf, 4, &got), HRESULT(ERROR_PATH_NOT_FOUND));
  EXPECT_EQ(got, 0u);
}

using Asked = std::vector<std::wstring>;

// A source that answers queries for the formats it is given (none given: every format, with
// S_OK), and notes what it was asked.
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
  Asked asked;
};

// Files on disk, an id array, or both halves of a virtual file, asked in that order; only an
// answer of exactly S_OK counts; a level's own view takes nothing. The list target is set up
// over a real list window as a view of the folder sets it up.
using ListTarget = DataObject;

TEST_F(ListTarget, EnterAsksForFilesThenIdsThenBothHalvesOfAVirtualFile) {
  HWND list = CreateWindowExW(0, WC_LISTVIEWW, nullptr, WS_POPUP, 0, 0, 100, 100, nullptr, nullptr, nullptr, nullptr);
  auto root = com::Make<CMarlixDLShellFolder>();
  ASSERT_EQ(root->Initialize(nullptr), S_OK);
  com::ComPtr<IShellView> view;
  ASSERT_EQ(root->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()), S_OK);
  auto target = com::Make<CMarlixDLDropTargetOnListView>();
  const wchar_t *top = L"Marlix Digital Levels", *level = L"Marlix Digital Levels\\North";
  const Asked three = {L"CF_HDROP", L"Shell IDList Array", L"FileGroupDescriptorW"};
  const Asked four = {L"CF_HDROP", L"Shell IDList Array", L"FileGroupDescriptorW", L"FileContents/stream"};
  const struct {
    const char* what;
    const wchar_t* folder;
    std::map<std::wstring, HRESULT> answers;
    HRESULT hr;
    Asked asked;
  } cases[] = {
      {"contents without a descriptor", top, {{L"FileContents", S_OK}}, E_INVALIDARG, three},
      {"a descriptor alone", top, {{L"FileGroupDescriptorW", S_OK}}, E_INVALIDARG, four},
      {"both halves", top, {{L"FileGroupDescriptorW", S_OK}, {L"FileContents", S_OK}}, S_OK, four},
      {"files", top, {{L"CF_HDROP", S_OK}}, S_OK, {L"CF_HDROP"}},
      {"ids", top, {{L"Shell IDList Array", S_OK}}, S_OK, {L"CF_HDROP", L"Shell IDList Array"}},
      {"S_FALSE and failures", top,
       {{L"CF_HDROP", S_FALSE}, {L"Shell IDList Array", E_FAIL}, {L"FileGroupDescriptorW", S_FALSE}}, E_INVALIDARG, three},
      {"contents answered S_FALSE", top, {{L"FileGroupDescriptorW", S_OK}, {L"FileContents", S_FALSE}}, E_INVALIDARG, four},
      {"a level's own view", level, {}, E_INVALIDARG, {}}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    auto data = com::Make<Offers>();
    data->answers = c.answers;
    win::UniqueCoMem<ITEMIDLIST> folder(CPidlMgr().CreateListFromPath(c.folder));
    target->SetTarget(list, view.Get(), folder.Get());
    DWORD effect = DROPEFFECT_LINK;
    EXPECT_EQ(target->DragEnter(data.Get(), MK_LBUTTON, {0, 0}, &effect), c.hr);
    EXPECT_EQ(effect, DWORD(DROPEFFECT_LINK)) << "DragEnter leaves the effect alone";
    EXPECT_EQ(data->asked, c.asked);
    target->SetTarget(nullptr, nullptr, nullptr);
  }
  DestroyWindow(list);
}

// Made by its class object, the list target has no list, view or folder to read.
TEST_F(ListTarget, NobodySetUpRefusesWithoutTouchingAnything) {
  com::ComPtr<IDropTarget> target;
  ASSERT_EQ(CreateMarlixDLDropTargetOnListView(IID_IDropTarget, target.PutVoid()), S_OK);
  auto data = com::Make<Offers>();
  DWORD effect = DROPEFFECT_MOVE;
  EXPECT_EQ(target->DragEnter(data.Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->DragOver(0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->Drop(data.Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(target->DragLeave(), S_OK);
  EXPECT_EQ(effect, DWORD(DROPEFFECT_MOVE));
  EXPECT_TRUE(data->asked.empty());
}

}  // namespace
