#include "server/registrar.h"

#include <cstdint>
#include <vector>

#include "base/win_handles.h"

namespace {

enum class Op { Key, Replace, Open, Value };

struct Statement {
  Op op;
  HKEY root;
  std::wstring path;   // key of the statement, or of the value's key
  std::wstring name;   // value name, empty for the default value
  std::wstring data;
  bool ownedKey;       // the value's key goes with its subtree on unregistering
};

std::wstring_view Trim(std::wstring_view s) {
  const wchar_t* blanks = L" \t\r";
  size_t first = s.find_first_not_of(blanks);
  if (first == std::wstring_view::npos) return {};
  return s.substr(first, s.find_last_not_of(blanks) - first + 1);
}

std::wstring Expand(std::wstring_view text, const std::wstring& modulePath) {
  static constexpr std::wstring_view kModule = L"%MODULE%";
  std::wstring out;
  size_t pos = 0;
  for (size_t hit; (hit = text.find(kModule, pos)) != std::wstring_view::npos; pos = hit + kModule.size())
    out.append(text.substr(pos, hit - pos)).append(modulePath);
  out.append(text.substr(pos));
  return out;
}

bool SplitRoot(std::wstring_view full, HKEY* root, std::wstring* path) {
  size_t slash = full.find(L'\\');
  if (slash == std::wstring_view::npos || slash + 1 == full.size()) return false;
  std::wstring_view name = full.substr(0, slash);
  if (name == L"HKCR")
    *root = HKEY_CLASSES_ROOT;
  else if (name == L"HKLM")
    *root = HKEY_LOCAL_MACHINE;
  else if (name == L"HKCU")
    *root = HKEY_CURRENT_USER;
  else
    return false;
  *path = full.substr(slash + 1);
  return true;
}

bool Parse(std::wstring_view script, const std::wstring& modulePath, std::vector<Statement>* out) {
  size_t lastKey = SIZE_MAX;  // index of the key that values belong to
  while (!script.empty()) {
    size_t end = script.find(L'\n');
    std::wstring_view line = Trim(script.substr(0, end));
    script = end == std::wstring_view::npos ? std::wstring_view{} : script.substr(end + 1);
    if (line.empty() || line.front() == L';') continue;

    std::wstring expanded = Expand(line, modulePath);
    std::wstring_view text = expanded;
    size_t space = text.find_first_of(L" \t");
    std::wstring_view verb = text.substr(0, space);
    Statement st{};
    if (verb == L"key" || verb == L"replace" || verb == L"open") {
      if (space == std::wstring_view::npos) return false;
      st.op = verb == L"key" ? Op::Key : verb == L"replace" ? Op::Replace : Op::Open;
      if (!SplitRoot(Trim(text.substr(space)), &st.root, &st.path)) return false;
      out->push_back(std::move(st));
      lastKey = out->size() - 1;
      continue;
    }
    size_t eq = text.find(L'=');
    if (eq == std::wstring_view::npos || lastKey == SIZE_MAX) return false;
    std::wstring_view name = Trim(text.substr(0, eq));
    if (name.empty()) return false;
    const Statement& key = (*out)[lastKey];
    st.op = Op::Value;
    st.root = key.root;
    st.path = key.path;
    st.ownedKey = key.op != Op::Open;
    st.name = name == L"@" ? std::wstring() : std::wstring(name);
    st.data = Trim(text.substr(eq + 1));
    out->push_back(std::move(st));
  }
  return true;
}

bool Gone(LSTATUS status) { return status == ERROR_FILE_NOT_FOUND || status == ERROR_PATH_NOT_FOUND; }

LSTATUS CreateKey(HKEY root, const std::wstring& path) {
  win::UniqueHKey key;
  return RegCreateKeyExW(root, path.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr);
}

LSTATUS DeleteTree(HKEY root, const std::wstring& path) {
  LSTATUS status = RegDeleteTreeW(root, path.c_str());
  return Gone(status) ? ERROR_SUCCESS : status;
}

LSTATUS Register(const Statement& st) {
  switch (st.op) {
    case Op::Replace:
      if (LSTATUS status = DeleteTree(st.root, st.path); status != ERROR_SUCCESS) return status;
      [[fallthrough]];
    case Op::Key:
    case Op::Open:
      return CreateKey(st.root, st.path);
    case Op::Value:
      return RegSetKeyValueW(st.root, st.path.c_str(), st.name.empty() ? nullptr : st.name.c_str(), REG_SZ,
                             st.data.c_str(), DWORD((st.data.size() + 1) * sizeof(wchar_t)));
  }
  return ERROR_INVALID_FUNCTION;
}

LSTATUS Unregister(const Statement& st) {
  switch (st.op) {
    case Op::Key:
    case Op::Replace:
      return DeleteTree(st.root, st.path);
    case Op::Open:
      return ERROR_SUCCESS;
    case Op::Value: {
      if (st.ownedKey) return ERROR_SUCCESS;
      win::UniqueHKey key;
      LSTATUS status = RegOpenKeyExW(st.root, st.path.c_str(), 0, KEY_SET_VALUE, key.Put());
      if (status == ERROR_SUCCESS) status = RegDeleteValueW(key.Get(), st.name.c_str());
      return Gone(status) ? ERROR_SUCCESS : status;
    }
  }
  return ERROR_INVALID_FUNCTION;
}

}  // namespace

HRESULT RunRegistryScript(std::wstring_view script, const std::wstring& modulePath, bool reg) {
  std::vector<Statement> statements;
  if (!Parse(script, modulePath, &statements)) return kScriptSyntaxError;
  if (reg) {
    for (const auto& st : statements)
      if (LSTATUS status = Register(st); status != ERROR_SUCCESS) return HRESULT_FROM_WIN32(status);
  } else {
    for (auto it = statements.rbegin(); it != statements.rend(); ++it)
      if (LSTATUS status = Unregister(*it); status != ERROR_SUCCESS) return HRESULT_FROM_WIN32(status);
  }
  return S_OK;
}

HRESULT RunRegistryResource(HMODULE module, UINT id, bool reg) {
  HRSRC found = FindResourceW(module, MAKEINTRESOURCEW(id), L"REGISTRY");
  if (!found) return HRESULT_FROM_WIN32(GetLastError());
  HGLOBAL loaded = LoadResource(module, found);
  const char* bytes = loaded ? static_cast<const char*>(LockResource(loaded)) : nullptr;
  DWORD size = SizeofResource(module, found);
  if (!bytes) return HRESULT_FROM_WIN32(GetLastError());
  // Scripts are UTF-8, with or without a byte order mark.
  if (size >= 3 && static_cast<unsigned char>(bytes[0]) == 0xEF && static_cast<unsigned char>(bytes[1]) == 0xBB &&
      static_cast<unsigned char>(bytes[2]) == 0xBF) {
    bytes += 3;
    size -= 3;
  }
  std::wstring script;
  if (size) {
    int chars = MultiByteToWideChar(CP_UTF8, MB_ERR_INVALID_CHARS, bytes, int(size), nullptr, 0);
    if (chars <= 0) return kScriptSyntaxError;
    script.resize(chars);
    MultiByteToWideChar(CP_UTF8, MB_ERR_INVALID_CHARS, bytes, int(size), script.data(), chars);
  }
  std::wstring path = ModuleFilePath(module);
  if (path.empty()) return HRESULT_FROM_WIN32(GetLastError());
  return RunRegistryScript(script, path, reg);
}

std::wstring ModuleFilePath(HMODULE module) {
  std::wstring path(MAX_PATH, L'\0');
  for (;;) {
    DWORD n = GetModuleFileNameW(module, path.data(), DWORD(path.size()));
    if (n == 0) return {};
    if (n < path.size()) {
      path.resize(n);
      return path;
    }
    if (path.size() >= 32768) return {};
    path.resize(path.size() * 2);
  }
}
