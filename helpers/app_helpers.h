// What the host application is called, which version folder it uses, where it lives
// and where its language files lie. "Application" is always the host process.
#pragma once
#include <string>

namespace kld::ft {

std::wstring GetAppNameW();
std::wstring GetAppVersionW();
// The application's folder, ending in a separator. Kept for the process after the first call.
std::wstring GetAppPathW();
// The suite's machine-wide data folder, created on each call.
std::wstring GetCommonDataDirW();
// Where translation files lie, ending in a backslash.
std::wstring GetLanguagesRootDirW(const wchar_t* appName);

// The host executable's full path, read into a buffer that grows as needed.
std::wstring GetExecutablePath();
// The name an executable gives the application: its "040904B0" ProductName, or the
// file name cut at the first dot.
std::wstring AppNameOfExecutable(const std::wstring& executablePath);
// The version folder that goes with an application name.
std::wstring AppVersionFor(const std::wstring& appName);

namespace test_only {
// Forgets the kept application path, so that a test can watch a first call again.
void ForgetAppPath();
}  // namespace test_only

}  // namespace kld::ft
