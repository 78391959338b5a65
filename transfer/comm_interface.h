// The contract with the instrument's communication library, MarlixComm.dll, as it
// crosses the boundary between the two binaries.
#pragma once
#include <windows.h>
#include <cstdint>
#include <string>

// One working record of the library: two parts of 72 bytes, each with a field at
// byte 20 that the system presets to -1. Nothing else is ever written by us.
struct PointRecord {
  unsigned char Head1[20];
  int32_t Mark1;
  unsigned char Tail1[48];
  unsigned char Head2[20];
  int32_t Mark2;
  unsigned char Tail2[48];
};
static_assert(sizeof(PointRecord) == 144, "PointRecord is 144 bytes");

constexpr int kPointRecordCount = 5000;
struct PointsBlock {
  PointRecord Records[kPointRecordCount];
};
static_assert(sizeof(PointsBlock) == 720000, "PointsBlock is 720000 bytes");

// The end of a transfer, reported once with the library's result code.
using CommResultCallbackFn = void (*)(int code);

// The library's object. The table positions are fixed by the other binary's (MSVC)
// layout, so this has plain virtuals only: slot 0 stands where MSVC puts the deleting
// destructor, and a C++ virtual destructor here would add two slots under g++.
// The unnamed positions are never called but keep the later ones in place.
class IMarlixComm {
 public:
  virtual void Destroy(unsigned flags) = 0;                      // 0
  virtual void Unused1() = 0;                                    // 1
  virtual int SetCommParameters(int port, int baudRate, int parity, int stopBits,
                                int flow, int dataBits, int checkSum) = 0;  // 2
  virtual int Initialize() = 0;                                  // 3
  virtual int ReceiveFile(int wait, bool flag) = 0;              // 4
  virtual void Unused5() = 0;                                    // 5
  virtual int SetPoints(PointsBlock* block) = 0;                 // 6
  virtual void Unused7() = 0;                                    // 7
  virtual int TerminateConnection() = 0;                         // 8
  virtual int SetFilePath(const char* path) = 0;                 // 9
  virtual int SetTimeout(int timeout) = 0;                       // 10
  virtual void Unused11() = 0;                                   // 11
  virtual void Unused12() = 0;                                   // 12
  virtual int SetCallback(CommResultCallbackFn callback) = 0;    // 13

 protected:
  ~IMarlixComm() = default;
};

// The library's single export, found by this exact name.
using CreateInstanceFn = IMarlixComm* (*)();
constexpr char kCreateInstanceExport[] = "CreateInstance";
constexpr wchar_t kCommLibraryName[] = L"MarlixComm.dll";

// Result codes shared by ReceiveFile and the callback.
constexpr int kCommNoError = 0;
constexpr int kCommTimeout = -101;
constexpr int kCommInterrupted = -102;

// The open transfer dialogs of the process: the callback's only way to the download dialog.
// Nothing ever sets the upload handle.
extern HWND DownloadDialogWindow;
extern HWND UploadDialogWindow;

// Posts DownloadMessage (wParam 0, lParam the code sign-extended) to the open transfer
// dialog; does nothing when none is open. May run on any thread.
void CommResultCallback(int code) noexcept;

// A result code of ReceiveFile or of the callback as the user's sentence.
std::wstring CommResultText(int code);

// The library's full path: the folder of the module that holds this code.
std::wstring CommLibraryPath();

// Turns GetLastError's value into a failure code: positive values get the Win32 facility.
HRESULT LastErrorToFailureCode(DWORD value);

// Loads the library and creates its object. On failure returns null and sets `errorText`.
IMarlixComm* CreateCommObject(std::wstring& errorText);

// A block with its 10000 preset fields set to -1 and every other byte as allocated;
// null when memory is short.
PointsBlock* NewPointsBlock();
void DeletePointsBlock(PointsBlock* block);

// Test seam: called with the block just before DeletePointsBlock frees it.
extern void (*PointsBlockFreeHook)(const PointsBlock* block);
