// A read-once stream over a received file, handed to the receiver of the virtual file.
#pragma once
#include <windows.h>
#include <objidl.h>
#include <string>

#include "base/com_base.h"
#include "base/win_handles.h"

// Answers IUnknown and IStream only; ISequentialStream is deliberately not answered.
class CStream2 : public com::ComObject<IStream> {
 public:
  enum : DWORD { StateClosed = 0, StateOpen = 2, StateFinished = 3 };

  CStream2() noexcept = default;

  // Remembers the file and takes its size; a missing file is reported by the first Read.
  HRESULT AttachFile(const std::wstring& path, const std::wstring& displayName, bool deleteWhenRead);

  // ISequentialStream
  STDMETHODIMP Read(void* pv, ULONG cb, ULONG* pcbRead) noexcept override;
  STDMETHODIMP Write(const void* pv, ULONG cb, ULONG* pcbWritten) noexcept override;
  // IStream
  STDMETHODIMP Seek(LARGE_INTEGER move, DWORD origin, ULARGE_INTEGER* newPosition) noexcept override;
  STDMETHODIMP SetSize(ULARGE_INTEGER newSize) noexcept override;
  STDMETHODIMP CopyTo(IStream* target, ULARGE_INTEGER cb, ULARGE_INTEGER* read,
                      ULARGE_INTEGER* written) noexcept override;
  STDMETHODIMP Commit(DWORD flags) noexcept override;
  STDMETHODIMP Revert() noexcept override;
  STDMETHODIMP LockRegion(ULARGE_INTEGER offset, ULARGE_INTEGER cb, DWORD type) noexcept override;
  STDMETHODIMP UnlockRegion(ULARGE_INTEGER offset, ULARGE_INTEGER cb, DWORD type) noexcept override;
  STDMETHODIMP Stat(STATSTG* stat, DWORD flags) noexcept override;
  STDMETHODIMP Clone(IStream** clone) noexcept override;

 private:
  HANDLE OpenSource() const noexcept;

  // Closed with the object: a file not read to its end stays on disk.
  win::UniqueFile FileHandle;
  std::wstring SourceFilePath;
  std::wstring DisplayName;
  ULONG FileSize = 0;
  DWORD ReadState = StateClosed;
  BYTE DeleteWhenRead = 0;
};
