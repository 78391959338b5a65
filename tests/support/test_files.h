// Scratch files for the tests of logs, folders and translation files, and what other programs wrote.
#pragma once
#include <windows.h>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
namespace testfiles {
inline void WriteBytes(const std::wstring& path, const std::string& bytes) {
  std::ofstream(std::filesystem::path(path), std::ios::binary) << bytes;
}
// The whole file, or "<none>" when it can't be opened; others may hold it open for writing.
inline std::string ReadAll(const std::wstring& path) {
  std::ifstream in(std::filesystem::path(path), std::ios::binary);
  return in ? std::string(std::istreambuf_iterator<char>(in), {}) : "<none>";
}
// UTF-16LE with byte order mark, the only form translation files take.
inline std::string Utf16File(const std::wstring& text) {
  return std::string("\xFF\xFE", 2) + std::string(reinterpret_cast<const char*>(text.data()), text.size() * 2);
}
inline void WriteTranslation(const std::wstring& path, const std::wstring& text) { WriteBytes(path, Utf16File(text)); }
// Makes the application count as not installed, which puts its languages root beside it.
inline void MarkNotInstalled(const std::wstring& app) {
  std::filesystem::create_directories(app + L"components");
  WriteBytes(app + L"components\\NotInstalledApp.txt", "");
}
inline std::wstring TempDirectory() {
  wchar_t path[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, path);
  return path;
}
}  // namespace testfiles
