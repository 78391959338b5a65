// Read rate of the received-file stream against bare ReadFile, side by side in one run;
// and the time from a contents request to the first paint of the download dialog.
#include <windows.h>
#include <ole2.h>

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include "base/com_base.h"
#include "store/pidl_manager.h"
#include "store/station_record.h"
#include "transfer/data_object.h"
#include "transfer/download_dialog.h"
#include "transfer/stream2.h"

namespace {

constexpr ULONG kFileBytes = 256u << 20;
constexpr ULONG kBlock = 64u << 10;

double Seconds(LARGE_INTEGER a, LARGE_INTEGER b) {
  static LARGE_INTEGER freq = [] { LARGE_INTEGER f; QueryPerformanceFrequency(&f); return f; }();
  return double(b.QuadPart - a.QuadPart) / double(freq.QuadPart);
}

std::wstring MakeBigFile() {
  wchar_t dir[MAX_PATH], name[MAX_PATH];
  GetTempPathW(MAX_PATH, dir);
  GetTempFileNameW(dir, L"BNC", 0, name);
  HANDLE f = CreateFileW(name, GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  std::vector<char> block(1 << 20);
  for (size_t i = 0; i < block.size(); ++i) block[i] = char(i * 31);
  for (ULONG done = 0; done < kFileBytes; done += ULONG(block.size())) {
    DWORD w = 0;
    WriteFile(f, block.data(), DWORD(block.size()), &w, nullptr);
  }
  CloseHandle(f);
  return name;
}

double ReadBare(const std::wstring& path, std::vector<char>& buf, ULONGLONG& total) {
  LARGE_INTEGER a, b;
  QueryPerformanceCounter(&a);
  HANDLE f = CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                         FILE_ATTRIBUTE_NORMAL, nullptr);
  DWORD got = 0;
  total = 0;
  do {
    if (!ReadFile(f, buf.data(), kBlock, &got, nullptr)) break;
    total += got;
  } while (got == kBlock);
  CloseHandle(f);
  QueryPerformanceCounter(&b);
  return Seconds(a, b);
}

double ReadStream(const std::wstring& path, std::vector<char>& buf, ULONGLONG& total) {
  LARGE_INTEGER a, b;
  QueryPerformanceCounter(&a);
  auto stream = com::Make<CStream2>();
  stream->AttachFile(path, L"file1.tkf", false);
  ULONG got = 0;
  total = 0;
  do {
    if (stream->Read(buf.data(), kBlock, &got) != S_OK) break;
    total += got;
  } while (got == kBlock);
  stream.Reset();
  QueryPerformanceCounter(&b);
  return Seconds(a, b);
}

void ReadRate() {
  std::wstring path = MakeBigFile();
  std::vector<char> buf(kBlock);
  ULONGLONG total = 0;
  ReadBare(path, buf, total);  // warm the cache for both
  double bare = 1e9, stream = 1e9;
  for (int round = 0; round < 5; ++round) {
    ULONGLONG t1 = 0, t2 = 0;
    bare = std::min(bare, ReadBare(path, buf, t1));
    stream = std::min(stream, ReadStream(path, buf, t2));
    if (t1 != kFileBytes || t2 != kFileBytes) std::printf("short read: %llu %llu\n", t1, t2);
  }
  DeleteFileW(path.c_str());
  double mib = double(kFileBytes) / (1 << 20);
  std::printf("read 256 MiB in %u KiB blocks, best of 5:\n", unsigned(kBlock >> 10));
  std::printf("  ReadFile       %8.1f MiB/s\n", mib / bare);
  std::printf("  CStream2::Read %8.1f MiB/s\n", mib / stream);
  std::printf("  ratio stream/bare rate: %.3f\n", bare / stream);
}

LARGE_INTEGER g_painted;
std::atomic<int> g_paint{0};  // 0 waiting, 1 first WM_PAINT taken, 2 it has been handled

// The next message taken after the dialog's first WM_PAINT marks the end of that paint;
// a posted WM_NULL makes sure one comes at once.
LRESULT CALLBACK MessageTaken(int code, WPARAM w, LPARAM l) {
  auto* msg = reinterpret_cast<MSG*>(l);
  if (code == HC_ACTION && w == PM_REMOVE) {
    if (g_paint == 1) {
      QueryPerformanceCounter(&g_painted);
      g_paint = 2;
    } else if (g_paint == 0 && msg->message == WM_PAINT && msg->hwnd && msg->hwnd == DownloadDialogWindow) {
      g_paint = 1;
      PostMessageW(msg->hwnd, WM_NULL, 0, 0);
    }
  }
  return CallNextHookEx(nullptr, code, w, l);
}

void DialogFirstPaint() {
  CStationRecord level;
  level.Name = MakeUniqueStationName(L"Bench level");
  if (AddStation(level) != S_OK) {
    std::printf("cannot add a level\n");
    return;
  }
  CPidlMgr pidl;
  std::wstring path = L"Marlix Digital Levels\\" + level.Name + L"\\file1.tkf";
  LPITEMIDLIST list = pidl.CreateListFromPath(path.c_str());
  auto data = com::Make<CMarlixDLDataObject>();
  data->AddItem(list);
  pidl.Free(list);

  HHOOK hook = SetWindowsHookExW(WH_GETMESSAGE, MessageTaken, nullptr, GetCurrentThreadId());
  std::vector<double> times;
  for (int round = 0; round < 5; ++round) {
    g_paint = 0;
    std::thread cancel([] {
      for (int i = 0; i < 2000 && g_paint != 2; ++i) Sleep(5);
      if (HWND dialog = DownloadDialogWindow) SendMessageW(GetDlgItem(dialog, IDCANCEL), BM_CLICK, 0, 0);
    });
    FORMATETC f{static_cast<CLIPFORMAT>(RegisterClipboardFormatW(L"FileContents")), nullptr, DVASPECT_CONTENT,
                0, TYMED_ISTREAM};
    STGMEDIUM m{};
    LARGE_INTEGER start;
    QueryPerformanceCounter(&start);
    HRESULT hr = data->GetData(&f, &m);
    cancel.join();
    if (hr != S_FALSE || g_paint != 2) {
      std::printf("round %d: no painted dialog (0x%08lx)\n", round, static_cast<unsigned long>(hr));
      continue;
    }
    times.push_back(Seconds(start, g_painted) * 1000);
  }
  UnhookWindowsHookEx(hook);
  DeleteStation(level);
  if (times.empty()) return;
  const double first = times.front();
  std::sort(times.begin(), times.end());
  std::printf("GetData(\"FileContents\") to the dialog's first WM_PAINT, %zu rounds:\n", times.size());
  std::printf("  first round %.1f ms, median %.1f ms, best %.1f ms\n", first, times[times.size() / 2],
              times.front());
}

}  // namespace

int main() {
  if (FAILED(OleInitialize(nullptr))) return 3;
  ReadRate();
  DialogFirstPaint();
  OleUninitialize();
  return 0;
}
