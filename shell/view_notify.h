// Change notification among views: the hidden top-level window through which a view
// (a child window) hears broadcasts.
#pragma once
#include <windows.h>

#include "base/window_messages.h"

constexpr wchar_t kNotifyWindowClass[] = L"KLD Net Shell Extension - Notify";

// Tells every view of every process that levels changed: posts GlobalNotifyMessage
// (1, the type of the last id of the sender's folder) to HWND_BROADCAST. Never waits.
void BroadcastChange(UINT lastIdType);

// The hidden window and the view window it forwards to.
struct NotifyWindowPair {
  HWND Hidden = nullptr;
  HWND ViewWindow = nullptr;
};

// Makes the hidden window for `viewWindow`. The pair must outlive the window.
// S_OK or E_FAIL.
HRESULT CreateNotifyWindow(NotifyWindowPair& pair, HWND viewWindow);
void DestroyNotifyWindow(NotifyWindowPair& pair);
