#include "transfer/comm_interface.h"

#include <cstdlib>

#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "base/window_messages.h"
#include "helpers/error_reporter.h"
#include "helpers/file_helpers.h"
#include "helpers/filelog.h"
#include "store/string_table.h"

HWND DownloadDialogWindow = nullptr;
HWND UploadDialogWindow = nullptr;
void (*PointsBlockFreeHook)(const PointsBlock* block) = nullptr;

void CommResultCallback(int code) noexcept {
  // Runs on the library's thread: touch nothing but the handle and the message number.
  HWND dialog = DownloadDialogWindow;
  if (!dialog) return;
  PostMessageW(dialog, DownloadMessage, 0, static_cast<LPARAM>(code));
}

std::wstring CommResultText(int code) {
  UINT id = IDS_ERR_UNKNOWN;
  switch (code) {
    case 0: id = IDS_NO_ERROR; break;
    case -101: id = IDS_ERR_TIMEOUT; break;
    case -102: id = IDS_ERR_INTERRUPTED; break;
    case -201: case -202: case -203: id = IDS_ERR_CREATE_FILE; break;
    case -204: id = IDS_ERR_CHECKSUM; break;
    case -301: id = IDS_ERR_TEMP_FILE_OPEN; break;
    case -302: id = IDS_ERR_POINT_NAME; break;
    default: break;
  }
  return LoadTranslatedString(id);
}

std::wstring CommLibraryPath() {
  wchar_t module[MAX_PATH] = {};
  GetModuleFileNameW(ModuleInstance(), module, MAX_PATH);
  std::wstring folder = kld::ft::AddTrailingSeparator(kld::ft::GetDirectoryPart(module).c_str());
  return folder + kCommLibraryName;
}

HRESULT LastErrorToFailureCode(DWORD value) {
  if (static_cast<LONG>(value) > 0) return static_cast<HRESULT>((value & 0xFFFF) | 0x80070000);
  return static_cast<HRESULT>(value);
}

IMarlixComm* CreateCommObject(std::wstring& errorText) {
  std::wstring path = CommLibraryPath();
  kld::ft::LogTextA("Download: loading the instrument library '%ls'", path.c_str());
  // Never freed: the object may run threads of the library until the process ends.
  HMODULE library = LoadLibraryW(path.c_str());
  if (!library) {
    HRESULT code = LastErrorToFailureCode(GetLastError());
    errorText = kld::ft::BuildErrorText(code, path.c_str(), nullptr, nullptr);
    return nullptr;
  }
  auto create = reinterpret_cast<CreateInstanceFn>(
      reinterpret_cast<void*>(GetProcAddress(library, kCreateInstanceExport)));
  if (!create) {
    HRESULT code = LastErrorToFailureCode(GetLastError());
    errorText = kld::ft::BuildErrorText(code, nullptr, nullptr, nullptr);
    return nullptr;
  }
  return create();
}

PointsBlock* NewPointsBlock() {
  auto* block = static_cast<PointsBlock*>(std::malloc(sizeof(PointsBlock)));
  if (!block) return nullptr;
  for (PointRecord& record : block->Records) {
    record.Mark1 = -1;
    record.Mark2 = -1;
  }
  return block;
}

void DeletePointsBlock(PointsBlock* block) {
  if (!block) return;
  if (PointsBlockFreeHook) PointsBlockFreeHook(block);
  std::free(block);
}
