#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "data_test_support.h"
#include "server/com_base.h"
#include "transfer/stream2.h"

namespace {

std::wstring TempFileWith(const std::string& bytes) {
  wchar_t name[MAX_PATH];
  GetTempFileNameW(TempDir().c_str(), L"STT", 0, name);
  HANDLE f = CreateFileW(name, GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  DWORD written = 0;
  WriteFile(f, bytes.data(), DWORD(bytes.size()), &written, nullptr);
  CloseHandle(f);
  return name;
}

TEST(Stream2, ReadsOnceAndTheShortReadDeletesTheFile) {
  long locks = com::ModuleLockCount();
  std::wstring path = TempFileWith("0123456789");
  {
    auto stream = com::Make<CStream2>();
    EXPECT_EQ(stream->AttachFile(path, L"file1.tkf", true), S_OK);
    STATSTG stat;
    std::memset(&stat, 0xAB, sizeof stat);
    EXPECT_EQ(stream->Stat(&stat, STATFLAG_NONAME), S_OK);
    EXPECT_EQ(stat.cbSize.LowPart, 10u);
    EXPECT_EQ(stat.cbSize.HighPart, 0xABABABABu) << "only the low half is written";

    char buf[8];
    ULONG got = 0;
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    ULARGE_INTEGER pos{{77, 0}};
    EXPECT_EQ(stream->Seek(LARGE_INTEGER{}, STREAM_SEEK_SET, &pos), S_OK);
    EXPECT_EQ(pos.QuadPart, 77u) << "no position is reported";
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(std::string(buf, 4), "4567") << "Seek moved nothing";
    EXPECT_TRUE(FileExists(path));
    EXPECT_EQ(stream->Read(buf, 8, &got), S_OK);
    EXPECT_EQ(std::string(buf, got), "89");
    EXPECT_FALSE(FileExists(path));
    for (int i = 0; i < 2; ++i) {
      EXPECT_EQ(stream->Read(buf, 8, &got), S_OK);
      EXPECT_EQ(got, 0u);
    }
  }
  EXPECT_EQ(com::ModuleLockCount(), locks);
}

TEST(Stream2, ExactMultipleAndEarlyReleaseLeaveTheFile) {
  std::wstring path = TempFileWith("abcdefgh");
  char buf[4];
  ULONG got = 0;
  {
    auto stream = com::Make<CStream2>();
    stream->AttachFile(path, L"file1.tkf", true);
    stream->Read(buf, 4, &got);
    stream->Read(buf, 4, &got);
    EXPECT_EQ(got, 4u);
  }
  EXPECT_TRUE(FileExists(path)) << "released after exactly FileSize bytes";
  auto stream = com::Make<CStream2>();
  stream->AttachFile(path, L"file1.tkf", true);
  for (ULONG expected : {4u, 4u, 0u}) {
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(got, expected);
  }
  EXPECT_FALSE(FileExists(path)) << "only the read of 0 bytes deletes it";
}

TEST(Stream2, MissingFileGivesTheBareCodeAndOnlyIStreamIsAnswered) {
  auto stream = com::Make<CStream2>();
  EXPECT_EQ(stream->AttachFile(L"C:\\no\\such\\dir\\gone.txt", L"file1.tkf", true), S_OK);
  char buf[4];
  ULONG got = 9;
  EXPECT_EQ(stream->Read(buf, 4, &got), HRESULT(ERROR_PATH_NOT_FOUND));
  EXPECT_EQ(got, 0u);
  com::ComPtr<IStream> s;
  EXPECT_EQ(stream.As(&s), S_OK);
  com::ComPtr<ISequentialStream> seq;
  EXPECT_EQ(stream.As(&seq), E_NOINTERFACE);
}

}  // namespace
