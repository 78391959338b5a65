#include "transfer/stream2.h"

CStream2::~CStream2() {
  if (FileHandle != INVALID_HANDLE_VALUE) CloseHandle(FileHandle);
}

HANDLE CStream2::OpenSource() const noexcept {
  return CreateFileW(SourceFilePath.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                     FILE_ATTRIBUTE_NORMAL, nullptr);
}

HRESULT CStream2::AttachFile(const std::wstring& path, const std::wstring& displayName,
                             bool deleteWhenRead) {
  SourceFilePath = path;
  DisplayName = displayName;
  DeleteWhenRead = deleteWhenRead ? 1 : 0;
  HANDLE file = OpenSource();
  if (file != INVALID_HANDLE_VALUE) {
    FileSize = GetFileSize(file, nullptr);
    CloseHandle(file);
  }
  return S_OK;
}

STDMETHODIMP CStream2::Read(void* pv, ULONG cb, ULONG* pcbRead) {
  ULONG scratch = 0;
  ULONG* count = pcbRead ? pcbRead : &scratch;
  *count = 0;
  if (ReadState == StateClosed) {
    FileHandle = OpenSource();
    // The bare system code is the answer: a positive value that reads as no failure.
    if (FileHandle == INVALID_HANDLE_VALUE) return static_cast<HRESULT>(GetLastError());
    ReadState = StateOpen;
  }
  if (ReadState == StateOpen) {
    DWORD got = 0;
    if (!ReadFile(FileHandle, pv, cb, &got, nullptr)) return static_cast<HRESULT>(GetLastError());
    *count = got;
    if (got < cb) {
      CloseHandle(FileHandle);
      FileHandle = INVALID_HANDLE_VALUE;
      ReadState = StateFinished;
      if (DeleteWhenRead) DeleteFileW(SourceFilePath.c_str());
    }
  }
  return S_OK;
}

STDMETHODIMP CStream2::Write(const void*, ULONG, ULONG*) { return E_NOTIMPL; }
STDMETHODIMP CStream2::Seek(LARGE_INTEGER, DWORD, ULARGE_INTEGER*) { return S_OK; }
STDMETHODIMP CStream2::SetSize(ULARGE_INTEGER) { return E_NOTIMPL; }
STDMETHODIMP CStream2::CopyTo(IStream*, ULARGE_INTEGER, ULARGE_INTEGER*, ULARGE_INTEGER*) {
  return E_NOTIMPL;
}
STDMETHODIMP CStream2::Commit(DWORD) { return E_NOTIMPL; }
STDMETHODIMP CStream2::Revert() { return E_NOTIMPL; }
STDMETHODIMP CStream2::LockRegion(ULARGE_INTEGER, ULARGE_INTEGER, DWORD) { return E_NOTIMPL; }
STDMETHODIMP CStream2::UnlockRegion(ULARGE_INTEGER, ULARGE_INTEGER, DWORD) { return E_NOTIMPL; }

STDMETHODIMP CStream2::Stat(STATSTG* stat, DWORD) {
  if (!stat) return STG_E_INVALIDPOINTER;
  stat->cbSize.LowPart = FileSize;
  return S_OK;
}

STDMETHODIMP CStream2::Clone(IStream**) { return E_NOTIMPL; }
