// How much the enumerator costs over the bare registry walk it is built on: EnumObjects
// plus a full Next walk, against RegEnumKeyExW + open + "Name" read over the same keys.
// Runs on a scratch copy of HKEY_CURRENT_USER and removes it afterwards.
#include <windows.h>
#include <shlobj.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <string>
#include <vector>

#include "bench/bench_support.h"
#include "shell/shell_folder.h"
#include "store/station_record.h"

namespace {

using Clock = std::chrono::steady_clock;

size_t FolderWalk(IShellFolder* folder) {
  IEnumIDList* list = nullptr;
  if (folder->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &list) != S_OK) return 0;
  size_t count = 0;
  LPITEMIDLIST item = nullptr;
  while (list->Next(1, &item, nullptr) == S_OK) {
    CoTaskMemFree(item);
    ++count;
  }
  list->Release();
  return count;
}


template <class F>
double Seconds(F&& run) {
  auto start = Clock::now();
  run();
  return std::chrono::duration<double>(Clock::now() - start).count();
}

// Median of `rounds` paired runs, the two sides alternating so that both see the same machine.
void Measure(IShellFolder* folder, int levels, int rounds) {
  std::vector<double> ours, bare;
  size_t seenOurs = 0, seenBare = 0;
  for (int i = 0; i < rounds; ++i) {
    ours.push_back(Seconds([&] { seenOurs = FolderWalk(folder); }));
    bare.push_back(Seconds([&] { seenBare = bench::BareWalk(); }));
  }
  std::sort(ours.begin(), ours.end());
  std::sort(bare.begin(), bare.end());
  double a = ours[ours.size() / 2], b = bare[bare.size() / 2];
  std::printf("%6d levels: enumerator %9.3f ms, bare registry %9.3f ms, ratio %.2f (items %zu/%zu)\n", levels,
              a * 1e3, b * 1e3, a / b, seenOurs, seenBare);
}

}  // namespace

int main() {
  CoInitialize(nullptr);
  bench::ScratchStore store(L"MarlixBenchEnum");
  {
    auto folder = com::Make<CMarlixDLShellFolder>();
    folder->Initialize(nullptr);
    for (auto [levels, rounds] : {std::pair{10, 2001}, std::pair{10000, 7}}) {
      bench::SeedLevels(levels);  // the first keys are rewritten, the rest added
      Measure(folder.Get(), levels, rounds);
    }
  }
  CoUninitialize();
  return 0;
}
