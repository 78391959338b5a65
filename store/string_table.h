// The one way to a user-visible text: the module's English string table, then translation.
#pragma once
#include <windows.h>
#include <string>

// The text of string `id` in the calling thread's language; empty if the table has no such entry.
std::wstring LoadTranslatedString(UINT id);
