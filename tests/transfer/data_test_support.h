// What the data object tests, the clipboard driver and the download road share: requests, item ids, the stand-in's job.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <set>
#include <string>
#include <vector>

FORMATETC Request(const wchar_t* format, DWORD tymed, LONG index = -1);
// Item ids built byte by byte (size, type, text from byte 14), with the list's terminator.
std::vector<BYTE> IdBytes(std::initializer_list<std::pair<DWORD, std::wstring>> ids);
// A full list of root, level and (optionally) the virtual file, from the task allocator.
LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile);

// Reads up to the first short read; whether the bytes are the stand-in library's job.
std::vector<char> ReadAll(IStream* stream);
bool IsStandInJob(const std::vector<char>& bytes);

// The temporary folder: one of this process's own, made at start and removed at exit, so
// test programs running side by side never see each other's downloads.
std::wstring TempDir();
std::set<std::wstring> TransferFiles();  // the TKF*.txt files downloads leave there
