#include "base/window_messages.h"

UINT GlobalNotifyMessage = RegisterWindowMessageW(L"TSShell Extension - Global Notify");
UINT DownloadMessage =
    RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Download Message");
UINT UploadMessage =
    RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Upload Message");
UINT GetEnumIDListMessage = RegisterWindowMessageW(L"KLD Shell Extension - Get EnumIDList");
