// Named sources of error texts, found by name. The module itself defines none.
#pragma once
#include <windows.h>
#include <string>

namespace kld::ft {

class CErrorsSourceBase {
 public:
  // Registers under `name`; a name already taken keeps its first source.
  explicit CErrorsSourceBase(std::wstring name);
  virtual ~CErrorsSourceBase();
  CErrorsSourceBase(const CErrorsSourceBase&) = delete;
  CErrorsSourceBase& operator=(const CErrorsSourceBase&) = delete;

  const std::wstring& Name() const noexcept { return name_; }
  virtual std::wstring GetErrorText(HRESULT code) const = 0;

  // The source registered under `name`, or null.
  static CErrorsSourceBase* Find(const std::wstring& name);

 private:
  std::wstring name_;
};

}  // namespace kld::ft
