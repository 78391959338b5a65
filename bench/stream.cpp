// Read rate of the received-file stream against bare ReadFile, side by side in one run.
#include <windows.h>
#include <ole2.h>

#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "server/com_base.h"
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

}  // namespace

int main() {
  if (FAILED(OleInitialize(nullptr))) return 3;
  ReadRate();
  OleUninitialize();
  return 0;
}
