// A read-once stream over a received file, handed to the receiver of the virtual file.
#pragma once
#include <windows.h>
#include <objidl.h>
#include <string>

#include "server/com_base.h"

// Answers IUnknown and IStream only; ISequentialStream is deliberately not answered.
class CStream2 : public com::ComObject<IStream> {
 public:
  enum : DWORD { StateClosed = 0, StateOpen = 2, StateFinished = 3 };

  CStream2() noexcept = default;

  // Remembers the file and takes its size; a missing file is reported by the first Read.
  HRESULT AttachFile(const std::wstring& path, const std::wstring& displayName, bool deleteWhenRead);

  // ISequentialStream
  STDMETHODIMP Read(void* pv, ULONG cb, ULONG* pcbRead) override;
  STDMETHODIMP Write(const void* pv, ULONG cb, ULONG* pcbWritten) override;
  // IStream
  STDMETHODIMP Seek(LARGE_INTEGER move, DWORD origin, ULARGE_INTEGER* newPosition) override;
  STDMETHODIMP SetSize(ULARGE_INTEGER newSize) override;
  STDMETHODIMP CopyTo(IStream* target, ULARGE_INTEGER cb, ULARGE_INTEGER* read,
                      ULARGE_INTEGER* written) override;
  STDMETHODIMP Commit(DWORD flags) override;
  STDMETHODIMP Revert() override;
  STDMETHODIMP LockRegion(ULARGE_INTEGER offset, ULARGE_INTEGER cb, DWORD type) override;
  STDMETHODIMP UnlockRegion(ULARGE_INTEGER offset, ULARGE_INTEGER cb, DWORD type) override;
  STDMETHODIMP Stat(STATSTG* stat, DWORD flags) override;
  STDMETHODIMP Clone(IStream** clone) override;

 protected:
  // Closes the handle only: a file not read to its end stays on disk.
  ~CStream2() override;

 private:
  HANDLE OpenSource() const noexcept;

  HANDLE FileHandle = INVALID_HANDLE_VALUE;
  std::wstring SourceFilePath;
  std::wstring DisplayName;
  ULONG FileSize = 0;
  DWORD ReadState = StateClosed;
  BYTE DeleteWhenRead = 0;
};
