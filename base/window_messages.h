// The module's registered window messages: a protocol between every loaded copy of the
// module in the session, so their texts never change.
#pragma once
#include <windows.h>

// Registered when the module loads; equal in every process of the session.
extern UINT GlobalNotifyMessage;   // "TSShell Extension - Global Notify"
extern UINT DownloadMessage;       // "Marlix Total Stations Shell Extension - Download Message"
extern UINT UploadMessage;         // "Marlix Total Stations Shell Extension - Upload Message"
extern UINT GetEnumIDListMessage;  // "KLD Shell Extension - Get EnumIDList"
