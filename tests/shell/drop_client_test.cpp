// A person dragging files from another program onto a level of the root view sees it light up and the drop refused.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <thread>

#include "config/sheet_driver.h"
#include "shell/shell_test_util.h"
#include "store/station_record.h"
#include "support/child_process.h"
#include "support/test_files.h"

namespace {

// Whether the peer's source was shown the copy effect during the drag.
bool SawCopy(const std::string& report) {
  size_t at = report.find("effects ");
  return at != std::string::npos && (std::stoul(report.substr(at + 8)) & (1u << DROPEFFECT_COPY));
}

// The second process: shell_peer, its output in a file read when it has ended.
struct Peer {
  explicit Peer(const std::vector<std::wstring>& arguments) : process(PeerPath(), arguments, output) {}
  ~Peer() { process.Kill(), DeleteFileW(output.c_str()); }
  static std::wstring PeerPath() {
    wchar_t peer[MAX_PATH] = {};
    GetEnvironmentVariableW(L"MARLIX_SHELL_PEER", peer, MAX_PATH);
    return peer;
  }
  std::string Output() const { return testfiles::ReadAll(output); }
  std::wstring output =
      (std::filesystem::temp_directory_path() / (L"drop_peer_" + std::to_wstring(GetCurrentProcessId()) + L".txt"));
  child::Process process;
};

// The root view in Wine's ExplorerBrowser, on screen at the top left, over a store of two
// levels in the prefix's own registry (the peer process must see them too).
class DropOnRootView : public testing::Test {
 protected:
  void SetUp() override {
    SeedLevel(0, L"Alpha");
    SeedLevel(1, L"Beta");
    before_ = sheet::StoredLevels();
    frame_ = CreateWindowExW(0, L"STATIC", nullptr, WS_POPUP | WS_VISIBLE, 0, 0, 400, 300, nullptr, nullptr, nullptr,
                             nullptr);
    browser_ = BrowseToFolder(frame_, {0, 0, 400, 300});
    ASSERT_TRUE(browser_);
    list_ = CurrentList(browser_.Get());
    ASSERT_EQ(ListView_GetItemCount(list_), 3);
    target_ = static_cast<IDropTarget*>(GetPropW(list_, L"OleDropTargetInterface"));
    ASSERT_TRUE(target_) << "the list is a registered target";
  }
  void TearDown() override {
    EXPECT_EQ(sheet::StoredLevels(), before_) << "no level changed";
    EXPECT_FALSE(FindWindowW(L"#32770", nullptr)) << "no dialog came up";
    if (browser_) browser_->Destroy();
    browser_.Reset();
    DestroyWindow(frame_);
    RegDeleteTreeW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str());
  }
  // The screen point at the middle of a row.
  POINT RowPoint(int row) {
    RECT rect{};
    ListView_GetItemRect(list_, row, &rect, LVIR_LABEL);
    POINT point{(rect.left + rect.right) / 2, (rect.top + rect.bottom) / 2};
    ClientToScreen(list_, &point);
    return point;
  }
  std::vector<int> Selected() {
    std::vector<int> rows;
    for (int row = -1; (row = ListView_GetNextItem(list_, row, LVNI_SELECTED)) >= 0;) rows.push_back(row);
    return rows;
  }
  // The peer drags `items` from its window onto `row` as a hand would; answers the peer's
  // report and, in `seen`, the selection once the pointer rests on the row.
  std::string DragOnto(int row, const std::wstring& items, std::vector<int>& seen) {
    Peer peer({L"drag", L"500", L"20", L"30", items});
    if (!ui::PumpFor([&] { return peer.Output().find("ready") != std::string::npos; }, 20000)) return "peer not ready";
    std::atomic<bool> resting{false}, release{false};
    POINT to = RowPoint(row);
    std::thread hand([&] {
      // A hand's pace: the drag starts only after a pause and a move of some steps.
      ui::Mouse(0, {600, 90});
      Sleep(200);
      ui::Mouse(MOUSEEVENTF_LEFTDOWN, {600, 90});
      for (int step = 1; step <= 10; ++step) {
        Sleep(60);
        ui::Mouse(0, {600 + (to.x - 600) * step / 10, 90 + (to.y - 90) * step / 10});
      }
      resting = true;
      ui::WaitFor([&] { return release.load(); });
      ui::Mouse(MOUSEEVENTF_LEFTUP, to);
    });
    ui::PumpFor([&] { return resting && Selected() == std::vector<int>{row}; }, 5000);
    seen = Selected();
    release = true;
    ui::PumpFor([&] { return peer.process.ExitCode() != child::Process::kNotEnded; }, 20000);
    hand.join();
    return peer.Output();
  }

  HWND frame_ = nullptr;
  HWND list_ = nullptr;
  IDropTarget* target_ = nullptr;
  com::ComPtr<IExplorerBrowser> browser_;
  std::vector<std::wstring> before_;
};

// Copy is offered while real files, or the virtual file of a level, are over a level row,
// which alone is selected; the drop itself is refused with E_INVALIDARG and nothing happens.
TEST_F(DropOnRootView, FilesFromAnotherProcessLightUpALevelAndAreRefused) {
  wchar_t temp[MAX_PATH];
  GetTempPathW(MAX_PATH, temp);
  const std::wstring file = std::wstring(temp) + L"survey.txt";
  std::ofstream(std::filesystem::path(file)) << "points";
  const std::pair<int, std::wstring> drags[] = {{1, file},
                                                {2, std::wstring(kFolderPath) + L"\\Alpha\\file1.tkf"}};
  for (const auto& [row, items] : drags) {
    ListView_SetItemState(list_, 0, LVIS_SELECTED, LVIS_SELECTED);
    ListView_SetItemState(list_, 3 - row, LVIS_SELECTED, LVIS_SELECTED);
    std::vector<int> seen;
    std::string report = DragOnto(row, items, seen);
    EXPECT_EQ(seen, std::vector<int>{row}) << "the row under the pointer alone";
    EXPECT_TRUE(SawCopy(report)) << report;
    // DragEnter and the refused drop write no effect, so the source keeps what it allowed.
    EXPECT_NE(report.find("result 0x80070057 7"), std::string::npos) << report;
    EXPECT_EQ(Selected(), std::vector<int>{row}) << "the refused row stays selected";
  }
  DeleteFileW(file.c_str());
}

// What a mouse can't make: a drop on the add row or on empty space, no effect pointer,
// and a target whose view has gone.
TEST_F(DropOnRootView, TheRegisteredTargetRefusesTheAddRowEmptySpaceAndAGoneView) {
  com::ComPtr<IShellFolder> desktop;
  ASSERT_EQ(SHGetDesktopFolder(desktop.Put()), S_OK);
  com::ComPtr<IDataObject> data;
  UniqueList folder;
  ASSERT_EQ(SHParseDisplayName(kFolderPath, nullptr, folder.Put(), 0, nullptr), S_OK);
  LPCITEMIDLIST items[] = {folder.Get()};
  ASSERT_EQ(desktop->GetUIObjectOf(nullptr, 1, items, IID_IDataObject, nullptr, data.PutVoid()), S_OK);
  ASSERT_EQ(target_->DragEnter(data.Get(), MK_LBUTTON, POINTL{RowPoint(1).x, RowPoint(1).y}, nullptr), S_OK)
      << "an id array is taken";
  ListView_SetItemState(list_, 2, LVIS_SELECTED, LVIS_SELECTED);
  DWORD effect = DROPEFFECT_NONE;
  POINT add = RowPoint(0);
  EXPECT_EQ(target_->DragOver(0, {add.x, add.y}, &effect), E_INVALIDARG) << "the add row";
  EXPECT_EQ(target_->DragOver(0, {200, 280}, &effect), E_INVALIDARG) << "empty space";
  EXPECT_EQ(target_->Drop(data.Get(), 0, {add.x, add.y}, &effect), E_INVALIDARG);
  EXPECT_EQ(effect, DWORD(DROPEFFECT_NONE)) << "a refusal writes no effect";
  EXPECT_EQ(Selected(), std::vector<int>{2}) << "and moves no selection";
  POINT level = RowPoint(1);
  EXPECT_EQ(target_->DragOver(0, {level.x, level.y}, nullptr), S_OK) << "no effect pointer";
  EXPECT_EQ(target_->DragOver(0, {level.x, level.y}, &effect), S_OK);
  EXPECT_EQ(effect, DWORD(DROPEFFECT_COPY)) << "copy, though the source allowed nothing";
  target_->AddRef();  // as a drag in progress holds it
  browser_->Destroy();
  browser_.Reset();
  EXPECT_EQ(target_->DragOver(0, {level.x, level.y}, &effect), E_INVALIDARG) << "the view has gone";
  EXPECT_EQ(target_->Drop(data.Get(), 0, {level.x, level.y}, &effect), E_INVALIDARG);
  target_->Release();
}

}  // namespace
