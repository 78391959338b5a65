// A path split into its fields, and a path as a list of components.
#pragma once
#include <string>
#include <vector>

namespace kld::ft {

class CPathParts {
 public:
  enum Field : unsigned { Server = 1, Drive = 2, Directory = 4, Title = 8, Extension = 16 };

  explicit CPathParts(const wchar_t* path);
  // Builds a path again from the fields named by the bits of `fields`.
  std::wstring Compose(unsigned fields) const;

  unsigned char network = 0;  // 1 if the path began with a backslash
  std::wstring server;
  std::wstring drive;      // share of a network path, else the text before the first ':'
  std::wstring directory;  // without its last separator
  std::wstring title;
  std::wstring extension;  // from the last dot on, dot included
};

class CPathComponents {
 public:
  CPathComponents() = default;
  // Runs of delimiters count as one; leading ones vanish.
  explicit CPathComponents(const wchar_t* path, std::wstring delimiters = L"\\/");

  // The components with the first delimiter between them, none in front or behind.
  std::wstring Join() const;
  // `count` components from `first`; empty if the range passes the end.
  CPathComponents SubPath(size_t first, size_t count) const;

  size_t Size() const noexcept { return components.size(); }
  const std::wstring& operator[](size_t index) const { return components[index]; }

  std::vector<std::wstring> components;
  std::wstring delimiters = L"\\/";
};

}  // namespace kld::ft
