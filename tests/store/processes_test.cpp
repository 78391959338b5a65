// Levels added, renamed and deleted from twenty programs at once are neither lost nor doubled.
// The parent starts copies of this program, each running the Child test on the parent's
// sandbox; all start together, and all check their view once every one has finished.
#include <gtest/gtest.h>
#include <map>
#include <memory>
#include <string>
#include <vector>
#include "base/win_handles.h"
#include "store/station_record.h"
#include "support/child_process.h"
#include "support/registry_sandbox.h"
namespace {
constexpr int kProcesses = 20;
constexpr int kLevelsEach = 12;
const wchar_t kResults[] = L"Software\\Marlix store processes";
const wchar_t kChildVariable[] = L"MARLIX_STORE_CHILD";  // "<index>|<barrier prefix>|<scratch key>"
std::wstring Variable(const wchar_t* name) {
  wchar_t value[1024] = {};
  return GetEnvironmentVariableW(name, value, 1024) ? value : L"";
}
std::wstring LevelName(int process, int level, bool renamed) {
  return L"p" + std::to_wstring(process) + L"-" + std::to_wstring(level) + (renamed ? L" renamed" : L"");
}
CStationRecord Level(const std::wstring& name, int port) {
  CStationRecord record;
  record.Name = name;
  record.Port = port;
  return record;
}
TEST(StoreProcesses, Child) {
  const std::wstring setting = Variable(kChildVariable);
  if (setting.empty()) GTEST_SKIP() << "started by TwentyAtOnce only";
  const size_t bar1 = setting.find(L'|'), bar2 = setting.find(L'|', bar1 + 1);
  const int me = std::stoi(setting.substr(0, bar1));
  const std::wstring barrier = setting.substr(bar1 + 1, bar2 - bar1 - 1);
  win::UniqueHKey scratch;
  ASSERT_EQ(RegOpenKeyExW(HKEY_CURRENT_USER, setting.substr(bar2 + 1).c_str(), 0, KEY_ALL_ACCESS, scratch.Put()),
            ERROR_SUCCESS);
  ASSERT_EQ(RegOverridePredefKey(HKEY_CURRENT_USER, scratch.Get()), ERROR_SUCCESS);
  win::UniqueHandle go(OpenEventW(SYNCHRONIZE, FALSE, (barrier + L"go").c_str()));
  win::UniqueHandle check(OpenEventW(SYNCHRONIZE, FALSE, (barrier + L"check").c_str()));
  win::UniqueHandle done(OpenSemaphoreW(SEMAPHORE_MODIFY_STATE, FALSE, (barrier + L"done").c_str()));
  ASSERT_TRUE(go && check && done);
  ASSERT_EQ(WaitForSingleObject(go.Get(), 60000), WAIT_OBJECT_0);
  // What each operation answered decides what this process expects to find at the end.
  std::map<std::wstring, int> expected;  // name: port
  for (int k = 0; k < kLevelsEach; ++k) {
    CStationRecord level = Level(LevelName(me, k, false), me * 100 + k);
    if (AddStation(level) == S_OK) expected[level.Name] = level.Port;
    else ADD_FAILURE() << "add " << k;
  }
  for (int k = 0; k < kLevelsEach / 2; ++k)
    if (UpdateStation(LevelName(me, k, false), Level(LevelName(me, k, true), me * 100 + k)) == S_OK)
      expected[LevelName(me, k, true)] = expected[LevelName(me, k, false)], expected.erase(LevelName(me, k, false));
  for (int k = kLevelsEach / 2; k < kLevelsEach; ++k)
    if (DeleteStation(Level(LevelName(me, k, false), 0)) == S_OK) expected.erase(LevelName(me, k, false));
  CStationRecord shared = Level(L"shared", 0);
  AddStation(shared);
  // A find that runs while another process deletes may step over a key: that rename or
  // delete then answers "not found" and is simply not done.
  RegWriteDword(HKEY_CURRENT_USER, kResults, (L"kept " + std::to_wstring(me)).c_str(), DWORD(expected.size()));
  ReleaseSemaphore(done.Get(), 1, nullptr);
  ASSERT_EQ(WaitForSingleObject(check.Get(), 60000), WAIT_OBJECT_0);
  for (const auto& [name, port] : expected) {
    CStationRecord found = Level(name, -1);
    EXPECT_EQ(FindStation(found), S_OK) << testing::PrintToString(name);
    EXPECT_EQ(found.Port, port) << testing::PrintToString(name);
  }
  for (int k = 0; k < kLevelsEach; ++k) {
    CStationRecord gone = Level(LevelName(me, k, false), -1);
    EXPECT_TRUE(expected.count(gone.Name) || FindStation(gone) == E_FAIL) << testing::PrintToString(gone.Name);
  }
}
// Every key's Name, in enumeration order.
std::vector<std::wstring> StoredNames() {
  std::vector<std::wstring> names;
  win::UniqueHKey levels;
  RegOpenKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, KEY_READ, levels.Put());
  wchar_t key[260];
  for (DWORD index = 0, length = 260;
       RegEnumKeyExW(levels.Get(), index, key, &length, nullptr, nullptr, nullptr, nullptr) == ERROR_SUCCESS;
       ++index, length = 260)
    names.push_back(RegReadString(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\" + key, L"Name"));
  return names;
}
TEST(StoreProcesses, TwentyAtOnce) {
  if (!Variable(kChildVariable).empty()) GTEST_SKIP();
  RegistrySandbox sandbox;
  const std::wstring barrier = L"Local\\MarlixStore" + std::to_wstring(GetCurrentProcessId());
  win::UniqueHandle go(CreateEventW(nullptr, TRUE, FALSE, (barrier + L"go").c_str()));
  win::UniqueHandle check(CreateEventW(nullptr, TRUE, FALSE, (barrier + L"check").c_str()));
  win::UniqueHandle done(CreateSemaphoreW(nullptr, 0, kProcesses, (barrier + L"done").c_str()));
  std::vector<std::unique_ptr<child::Process>> children;
  for (int i = 0; i < kProcesses; ++i) {
    SetEnvironmentVariableW(kChildVariable, (std::to_wstring(i) + L"|" + barrier + L"|" +
                                             sandbox.ScratchPath(HKEY_CURRENT_USER)).c_str());
    children.push_back(std::make_unique<child::Process>(child::SelfPath(),
                                                        std::vector<std::wstring>{L"--gtest_filter=StoreProcesses.Child"}));
    ASSERT_TRUE(children.back()->Started());
  }
  SetEnvironmentVariableW(kChildVariable, nullptr);
  SetEvent(go.Get());
  int finished = 0;
  while (finished < kProcesses && WaitForSingleObject(done.Get(), 120000) == WAIT_OBJECT_0) ++finished;
  EXPECT_EQ(finished, kProcesses);
  // One name per key: no add lost a level to another, and none is left half written.
  std::map<std::wstring, int> count;
  for (const std::wstring& name : StoredNames()) ++count[name];
  const int sharedAdds = count[L"shared"];
  count.erase(L"shared");
  for (const auto& [name, times] : count) EXPECT_EQ(times, 1) << testing::PrintToString(name);
  size_t kept = 0;
  for (int i = 0; i < kProcesses; ++i)
    kept += RegReadDword(HKEY_CURRENT_USER, kResults, (L"kept " + std::to_wstring(i)).c_str(), 0);
  EXPECT_EQ(count.size(), kept) << "levels lost or left over";
  EXPECT_GE(sharedAdds, 1);
  SetEvent(check.Get());
  for (auto& process : children) {
    ASSERT_TRUE(process->Wait(120000));
    EXPECT_EQ(process->ExitCode(), 0u) << "a process's view of the store was not as its operations said";
  }
}
}  // namespace
