#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "server/com_base.h"
#include "transfer/stream2.h"

namespace {

std::wstring TempFileWith(const std::string& bytes) {
  wchar_t dir[MAX_PATH], name[MAX_PATH];
  GetTempPathW(MAX_PATH, dir);
  GetTempFileNameW(dir, L"STT", 0, name);
  HANDLE f = CreateFileW(name, GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  DWORD written = 0;
  WriteFile(f, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
  CloseHandle(f);
  return name;
}

bool Exists(const std::wstring& path) { return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

TEST(Stream2, ReadsOnceToTheEndAndDeletesTheFile) {
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
    EXPECT_EQ(stat.type, 0xABABABABu);

    char buf[8];
    ULONG got = 99;
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(got, 4u);
    EXPECT_EQ(std::string(buf, 4), "0123");

    // Seek answers without moving.
    ULARGE_INTEGER pos{};
    pos.QuadPart = 77;
    EXPECT_EQ(stream->Seek(LARGE_INTEGER{}, STREAM_SEEK_SET, &pos), S_OK);
    EXPECT_EQ(pos.QuadPart, 77u);

    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(std::string(buf, 4), "4567");
    EXPECT_TRUE(Exists(path));
    EXPECT_EQ(stream->Read(buf, 8, &got), S_OK);
    EXPECT_EQ(got, 2u);
    EXPECT_EQ(std::string(buf, 2), "89");
    EXPECT_FALSE(Exists(path)) << "the short read deletes the file";

    for (int i = 0; i < 3; ++i) {
      got = 5;
      EXPECT_EQ(stream->Read(buf, 8, &got), S_OK);
      EXPECT_EQ(got, 0u);
    }
  }
  EXPECT_EQ(com::ModuleLockCount(), locks);
}

TEST(Stream2, ExactMultipleNeedsOneMoreReadAndEarlyReleaseKeepsTheFile) {
  std::wstring path = TempFileWith("abcdefgh");
  {
    auto stream = com::Make<CStream2>();
    stream->AttachFile(path, L"file1.tkf", true);
    char buf[4];
    ULONG got = 0;
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(got, 4u);
    EXPECT_TRUE(Exists(path)) << "exactly FileSize bytes read: not yet deleted";
  }
  EXPECT_TRUE(Exists(path)) << "release before the end keeps the file";
  {
    auto stream = com::Make<CStream2>();
    stream->AttachFile(path, L"file1.tkf", true);
    char buf[4];
    ULONG got = 0;
    stream->Read(buf, 4, &got);
    stream->Read(buf, 4, &got);
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(got, 0u);
    EXPECT_FALSE(Exists(path));
  }

  // Without the flag the file stays after the end.
  std::wstring kept = TempFileWith("xy");
  {
    auto stream = com::Make<CStream2>();
    stream->AttachFile(kept, L"file1.tkf", false);
    char buf[4];
    ULONG got = 0;
    EXPECT_EQ(stream->Read(buf, 4, &got), S_OK);
    EXPECT_EQ(got, 2u);
  }
  EXPECT_TRUE(Exists(kept));
  DeleteFileW(kept.c_str());
}

TEST(Stream2, MissingFileGivesTheBareSystemCode) {
  auto stream = com::Make<CStream2>();
  EXPECT_EQ(stream->AttachFile(L"C:\\no\\such\\dir\\gone.txt", L"file1.tkf", true), S_OK);
  STATSTG stat{};
  stream->Stat(&stat, STATFLAG_NONAME);
  EXPECT_EQ(stat.cbSize.LowPart, 0u);
  char buf[4];
  ULONG got = 9;
  HRESULT hr = stream->Read(buf, 4, &got);
  EXPECT_EQ(hr, static_cast<HRESULT>(ERROR_PATH_NOT_FOUND));
  EXPECT_EQ(got, 0u);
}

TEST(Stream2, AnswersOnlyIStreamAndRefusesTheRest) {
  auto stream = com::Make<CStream2>();
  com::ComPtr<IStream> s;
  EXPECT_EQ(stream.As(&s), S_OK);
  com::ComPtr<IUnknown> unk;
  EXPECT_EQ(stream.As(&unk), S_OK);
  com::ComPtr<ISequentialStream> seq;
  EXPECT_EQ(stream.As(&seq), E_NOINTERFACE);

  ULARGE_INTEGER n{};
  ULONG written = 0;
  EXPECT_EQ(s->Write("x", 1, &written), E_NOTIMPL);
  EXPECT_EQ(s->SetSize(n), E_NOTIMPL);
  EXPECT_EQ(s->CopyTo(nullptr, n, nullptr, nullptr), E_NOTIMPL);
  EXPECT_EQ(s->Commit(0), E_NOTIMPL);
  EXPECT_EQ(s->Revert(), E_NOTIMPL);
  EXPECT_EQ(s->LockRegion(n, n, 0), E_NOTIMPL);
  EXPECT_EQ(s->UnlockRegion(n, n, 0), E_NOTIMPL);
  IStream* clone = nullptr;
  EXPECT_EQ(s->Clone(&clone), E_NOTIMPL);
}

}  // namespace
