// Interpreter of the module's registration scripts (resources of type "REGISTRY").
//
// One statement a line; blank lines and lines starting with ';' are skipped.
//   key <ROOT>\<path>      registering creates the key; unregistering deletes it with its subtree
//   replace <ROOT>\<path>  registering deletes the key with its subtree, then creates it;
//                          unregistering deletes it with its subtree
//   open <ROOT>\<path>     a key the script does not own: registering creates it if missing,
//                          unregistering leaves it and removes only the values set below
//   @ = <text>             default value (REG_SZ) of the key of the statement before
//   <name> = <text>        named value (REG_SZ) of the key of the statement before
// ROOT is HKCR, HKLM or HKCU. "%MODULE%" anywhere stands for the module's full path.
// Registering runs the statements in order, unregistering in reverse order; keys and
// values already gone are no failure. A script with a syntax error changes nothing.
#pragma once
#include <windows.h>
#include <string>
#include <string_view>

// What a script with a syntax error answers.
inline constexpr HRESULT kScriptSyntaxError = HRESULT_FROM_WIN32(ERROR_BAD_FORMAT);

HRESULT RunRegistryScript(std::wstring_view script, const std::wstring& modulePath, bool reg);

// Runs the script resource `id` of `module`, with %MODULE% as that module's file.
HRESULT RunRegistryResource(HMODULE module, UINT id, bool reg);

// Full path of a module's file; empty on failure.
std::wstring ModuleFilePath(HMODULE module);
