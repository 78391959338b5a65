// What a program dropping or pasting a level's file gets from our data object, and what drops a folder view takes.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>

#include "data_test_support.h"
#include "base/resource_ids.h"
#include "base/win_handles.h"
#include "shell/shell_folder.h"
#include "store/station_record.h"
#include "support/child_process.h"
#include "support/modal_user.h"
#include "support/registry_sandbox.h"
#include "transfer/data_object.h"
#include "transfer/drop_target.h"

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
  // The bytes of a block handed over to the caller.
  static std::vector<BYTE> Fetch(IDataObject* obj, const wchar_t* format) {
    FORMATETC f = Request(format, TYMED_HGLOBAL);
    STGMEDIUM m{};
    EXPECT_EQ(obj->GetData(&f, &m), S_OK) << format;
    if (m.tymed != TYMED_HGLOBAL) return {};
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
  auto two = Make({L"North", L"South"}, {{L"North", true}, {L"South", false}});
  user::RunModal([&] {
    const struct { const wchar_t* format; DWORD tymed; HRESULT query; } rows[] = {
        {L"FileContents", TYMED_ISTREAM, S_OK},
        {L"FileGroupDescriptorW", TYMED_HGLOBAL, S_OK},
        {L"Shell IDList Array", TYMED_HGLOBAL, S_OK},
        {L"Marlix Total Stations", TYMED_HGLOBAL, S_OK},
        {L"Preferred DropEffect", TYMED_HGLOBAL, S_OK},
        {L"FileContents", TYMED_ISTREAM | TYMED_HGLOBAL, S_OK},  // the stream bit is enough
        {L"FileContents", TYMED_HGLOBAL, S_FALSE},
        {L"FileGroupDescriptorW", TYMED_HGLOBAL | TYMED_ISTREAM, S_FALSE},  // the others: exactly
        {L"Other Format", TYMED_HGLOBAL, S_FALSE}};
    for (auto& row : rows) {
      FORMATETC f = Request(row.format, row.tymed, 0);
      EXPECT_EQ(two->QueryGetData(&f), row.query) << row.format << ", tymed " << row.tymed;
    }
    // What a program that lists the formats before it asks (the clipboard's paste command) sees.
    com::ComPtr<IEnumFORMATETC> list;
    EXPECT_EQ(two->EnumFormatEtc(DATADIR_GET, list.Put()), S_OK);
    FORMATETC got[10]{};
    ULONG n = 0;
    EXPECT_EQ(list->Next(10, got, &n), S_OK) << "fewer than asked is still S_OK";
    EXPECT_EQ(n, 4u);
    for (ULONG i = 0; i < n; ++i)
      EXPECT_TRUE(got[i].cfFormat == Request(rows[i].format, 0).cfFormat && got[i].tymed == rows[i].tymed) << i;
    EXPECT_EQ(Fetch(two.Get(), L"Preferred DropEffect"), (std::vector<BYTE>{DROPEFFECT_COPY, 0, 0, 0}));
    // The parent of the first item, then the last id of each, at the offsets of the table.
    const std::vector<BYTE> parent = IdBytes({{1, L"Marlix Digital Levels"}, {2, L"North"}}),
                            file = IdBytes({{3, L"file1.tkf"}}), level = IdBytes({{2, L"South"}});
    std::vector<BYTE> cida = {2, 0, 0, 0, 16, 0, 0, 0, BYTE(16 + parent.size()), 0, 0, 0,
                              BYTE(16 + parent.size() + file.size()), 0, 0, 0};
    for (auto* part : {&parent, &file, &level}) cida.insert(cida.end(), part->begin(), part->end());
    EXPECT_EQ(Fetch(two.Get(), L"Shell IDList Array"), cida);

    CStationRecord gone;
    gone.Name = L"North";
    EXPECT_EQ(DeleteStation(gone), S_OK);
    FORMATETC f = Request(L"Marlix Total Stations", TYMED_HGLOBAL);
    EXPECT_EQ(two->GetData(&f, &m_), S_OK);
    std::vector<CStationRecord> records;
    UnpackStations(m_.hGlobal, records);
    ReleaseStgMedium(&m_);
    EXPECT_EQ(records.size() == 1 ? records[0].Name : L"", L"South") << "North, deleted meanwhile, is left out";

    // Index out of range, the level item (no file), and North's file, gone: the store's code.
    const std::pair<LONG, HRESULT> contents[] = {{-1, S_FALSE}, {2, S_FALSE}, {1, S_FALSE}, {0, E_FAIL}};
    for (auto [index, expected] : contents) {
      f = Request(L"FileContents", TYMED_ISTREAM, index);
      EXPECT_EQ(two->GetData(&f, &m_), expected) << "lindex " << index;
    }
    return 0;
  }, nullptr);
}

TEST_F(DataObject, EachContentsRequestIsATransferOfItsOwn) {
  auto obj = Make({L"A", L"B"}, {{L"A", true}, {L"B", true}});
  const auto before = TransferFiles();
  FORMATETC f = Request(L"FileContents", TYMED_ISTREAM | TYMED_HGLOBAL, 0);
  auto get = [&] { return INT_PTR(obj->GetData(&f, &m_)); };
  EXPECT_EQ(user::RunModal(get, [&](HWND dialog) {
    // While it runs, every request is refused, even from the program that asked.
    FORMATETC drop = Request(L"Preferred DropEffect", TYMED_HGLOBAL);
    EXPECT_EQ(obj->QueryGetData(&drop), E_INVALIDARG);
    user::Click(dialog, IDC_TRANSFER_START);
  }), S_OK);
  ASSERT_EQ(m_.tymed, DWORD(TYMED_ISTREAM));
  EXPECT_EQ(TransferFiles().size(), before.size() + 1) << "the received .txt waits";
  EXPECT_TRUE(IsStandInJob(ReadAll(m_.pstm)));
  EXPECT_EQ(TransferFiles(), before) << "the short read deleted it";
  EXPECT_EQ(m_.pstm->Release(), 0u) << "one reference for the caller";

  // No cache: the other index, then the same again, each open a dialog; a cancel leaves the medium.
  for (LONG index : {1, 0}) {
    f.lindex = index;
    m_.tymed = 0x77;
    EXPECT_EQ(user::RunModal(get, [](HWND dialog) { user::Click(dialog, IDCANCEL); }), S_FALSE) << index;
    EXPECT_EQ(m_.tymed, 0x77u);
  }
}

// Copied at the longest name a level can have, the clipboard holding the only reference, the file
// pastes whole in another process, as Explorer pastes it, and leaves no temporary file behind.
TEST_F(DataObject, ACopiedFilePastesWholeInAnotherProcess) {
  const std::wstring name(kMaxStationNameLength, L'c');
  ASSERT_EQ(OleSetClipboard(Make({name.c_str()}, {{name.c_str(), true}}).Get()), S_OK);
  const auto before = TransferFiles();
  const std::wstring folder = TempDir() + L"pasted";
  CreateDirectoryW(folder.c_str(), nullptr);
  wchar_t peer[MAX_PATH] = {};
  ASSERT_TRUE(GetEnvironmentVariableW(L"MARLIX_SHELL_PEER", peer, MAX_PATH));
  child::Process receiver(peer, {L"paste", folder});
  HANDLE ended = receiver.Handle();
  ASSERT_TRUE(ended);
  const DWORD serve = COWAIT_DISPATCH_WINDOW_MESSAGES | COWAIT_DISPATCH_CALLS;
  EXPECT_EQ(user::RunModal([&] {  // the apartment serves the receiver's calls until it ends
    DWORD index;
    return INT_PTR(CoWaitForMultipleHandles(serve, 60000, 1, &ended, &index));
  }, [](HWND dialog) { user::Click(dialog, IDC_TRANSFER_START); }, nullptr, 60000), S_OK);
  OleSetClipboard(nullptr);
  EXPECT_EQ(receiver.ExitCode(), 0u);
  EXPECT_EQ(TransferFiles(), before) << "the received .txt is gone";
  std::ifstream pasted(std::filesystem::path(folder + L"\\file1.tkf"), std::ios::binary);
  EXPECT_TRUE(IsStandInJob({std::istreambuf_iterator<char>(pasted), {}}));
}

TEST_F(DataObject, DragPictureIsCleanedOnlyWhenNothingIsHeld) {
  auto obj = com::Make<CMarlixDLDataObject>();
  HWND list = CreateWindowExW(0, L"STATIC", L"", WS_POPUP | WS_VISIBLE, 0, 0, 50, 50, nullptr, nullptr, nullptr, nullptr);
  HIMAGELIST image = ImageList_Create(16, 16, ILC_COLOR32, 1, 1);
  ImageList_ReplaceIcon(image, -1, LoadIconW(nullptr, IDI_APPLICATION));
  obj->SetDragImage(win::UniqueImageList(image), list, POINT{-3, -4});
  POINT at{}, hotSpot{};
  EXPECT_EQ(obj->GiveFeedback(DROPEFFECT_COPY), DRAGDROP_S_USEDEFAULTCURSORS);
  EXPECT_NE(ImageList_GetDragImage(&at, &hotSpot), nullptr) << "the first feedback begins the drag picture";
  EXPECT_EQ(obj->QueryContinueDrag(TRUE, MK_LBUTTON), DRAGDROP_S_CANCEL);
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, MK_SHIFT), DRAGDROP_S_DROP);
  EXPECT_NE(ImageList_GetDragImage(&at, &hotSpot), nullptr) << "neither escape nor a key still held cleans up";
  EXPECT_EQ(obj->QueryContinueDrag(FALSE, 0), DRAGDROP_S_DROP);
  EXPECT_EQ(ImageList_GetDragImage(&at, &hotSpot), nullptr) << "the drag picture has ended";
  DestroyWindow(list);
}

using Asked = std::vector<std::wstring>;

// A source that answers queries for the formats it is given, and notes what it was asked.
struct Offers : com::ComObject<IDataObject> {
  STDMETHODIMP GetData(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP GetDataHere(FORMATETC*, STGMEDIUM*) override { return E_NOTIMPL; }
  STDMETHODIMP QueryGetData(FORMATETC* f) override {
    wchar_t name[64] = L"CF_HDROP";
    if (f->cfFormat != CF_HDROP) GetClipboardFormatNameW(f->cfFormat, name, 64);
    asked.push_back(std::wstring(name) + (f->tymed == TYMED_ISTREAM ? L"/stream" : L""));
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
TEST_F(DataObject, ListViewTargetTakesFilesIdsOrBothHalvesOfAVirtualFile) {
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
      {"S_FALSE answers", top, {{L"CF_HDROP", S_FALSE}, {L"FileGroupDescriptorW", S_FALSE}}, E_INVALIDARG, three},
      {"contents answered S_FALSE", top, {{L"FileGroupDescriptorW", S_OK}, {L"FileContents", S_FALSE}}, E_INVALIDARG, four},
      {"a level's own view", level, {{L"CF_HDROP", S_OK}}, E_INVALIDARG, {}}};
  for (const auto& c : cases) {
    auto data = com::Make<Offers>();
    data->answers = c.answers;
    win::UniqueCoMem<ITEMIDLIST> folder(CPidlMgr().CreateListFromPath(c.folder));
    target->SetTarget(list, view.Get(), folder.Get());
    DWORD effect = DROPEFFECT_LINK;
    EXPECT_EQ(target->DragEnter(data.Get(), MK_LBUTTON, {0, 0}, &effect), c.hr) << c.what;
    EXPECT_EQ(data->asked, c.asked) << c.what;
  }
  // Made by its class object, it has no list, view or folder to read.
  com::ComPtr<IDropTarget> bare;
  ASSERT_EQ(CreateMarlixDLDropTargetOnListView(IID_IDropTarget, bare.PutVoid()), S_OK);
  DWORD effect = DROPEFFECT_MOVE;
  EXPECT_EQ(bare->DragEnter(com::Make<Offers>().Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(bare->DragOver(0, {0, 0}, &effect), E_INVALIDARG);
  EXPECT_EQ(bare->Drop(com::Make<Offers>().Get(), 0, {0, 0}, &effect), E_INVALIDARG);
  target->SetTarget(nullptr, nullptr, nullptr);
  DestroyWindow(list);
}

}  // namespace
