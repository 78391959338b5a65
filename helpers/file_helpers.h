// Small file name operations shared by the module. Paths are read with `\` and `/`
// as separators and built with `\`.
#pragma once
#include <windows.h>
#include <string>

namespace kld::ft {

// Up to and including the last separator; empty without one or for a null path.
std::wstring GetDirectoryPart(const wchar_t* path);
// Behind the last separator; the whole path without one; empty for a null path.
std::wstring GetNamePart(const wchar_t* path);
// The name cut before its last dot; the whole path if that leaves nothing.
std::wstring GetTitlePart(const wchar_t* path);
// Appends `\` unless the path is empty or already ends in a separator.
std::wstring AddTrailingSeparator(const wchar_t* path);

// With openForReading the file must open for shared reading (a locked file answers
// false); otherwise anything FindFirstFileW matches counts, folders and wildcards too.
bool FileExists(const wchar_t* path, bool openForReading);
// Creates the folder and every missing parent. Needs an existing ancestor to start from.
bool CreateDirectoryPath(const wchar_t* path, LPSECURITY_ATTRIBUTES securityAttributes);

// Index of the later of the last `\` and the last `/`, or npos.
size_t FindLastSeparator(const std::wstring& path);

}  // namespace kld::ft
