// RAII owners for the system resources the module holds: registry keys, kernel
// handles, global memory, GDI objects, icons, image lists, libraries, views and
// memory from the COM task allocator (which is the shell's IMalloc), storage media.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <objbase.h>
#include <type_traits>
#include <utility>

namespace win {

template <class T, T Invalid, class Close>
class Unique {
 public:
  Unique() noexcept = default;
  explicit Unique(T h) noexcept : h_(h) {}
  Unique(Unique&& o) noexcept : h_(std::exchange(o.h_, Invalid)) {}
  Unique& operator=(Unique&& o) noexcept {
    if (this != &o) { Reset(); h_ = std::exchange(o.h_, Invalid); }
    return *this;
  }
  ~Unique() { Reset(); }

  T Get() const noexcept { return h_; }
  T Release() noexcept { return std::exchange(h_, Invalid); }
  void Reset(T h = Invalid) noexcept {
    if (h_ != Invalid) Close{}(h_);
    h_ = h;
  }
  // Out-parameter for APIs that create the resource.
  T* Put() noexcept { Reset(); return &h_; }
  explicit operator bool() const noexcept { return h_ != Invalid; }

 private:
  T h_ = Invalid;
};

struct CloseKey { void operator()(HKEY h) const noexcept { RegCloseKey(h); } };
struct CloseKernel { void operator()(HANDLE h) const noexcept { CloseHandle(h); } };
struct FreeGlobal { void operator()(HGLOBAL h) const noexcept { GlobalFree(h); } };
struct DeleteGdi { void operator()(HGDIOBJ h) const noexcept { DeleteObject(h); } };
struct DestroyIconHandle { void operator()(HICON h) const noexcept { DestroyIcon(h); } };
struct DestroyImageList { void operator()(HIMAGELIST h) const noexcept { ImageList_Destroy(h); } };
struct FreeLib { void operator()(HMODULE h) const noexcept { FreeLibrary(h); } };
struct DestroyMenuHandle { void operator()(HMENU h) const noexcept { DestroyMenu(h); } };

using UniqueHKey = Unique<HKEY, nullptr, CloseKey>;
using UniqueHandle = Unique<HANDLE, nullptr, CloseKernel>;  // events, threads, mappings
using UniqueHGlobal = Unique<HGLOBAL, nullptr, FreeGlobal>;
using UniqueGdi = Unique<HGDIOBJ, nullptr, DeleteGdi>;
using UniqueIcon = Unique<HICON, nullptr, DestroyIconHandle>;
using UniqueImageList = Unique<HIMAGELIST, nullptr, DestroyImageList>;
using UniqueLibrary = Unique<HMODULE, nullptr, FreeLib>;
using UniqueMenu = Unique<HMENU, nullptr, DestroyMenuHandle>;

// Files use INVALID_HANDLE_VALUE, which is no constant expression, so they get their own owner.
class UniqueFile {
 public:
  UniqueFile() noexcept = default;
  explicit UniqueFile(HANDLE h) noexcept : h_(h) {}
  UniqueFile(UniqueFile&& o) noexcept : h_(std::exchange(o.h_, INVALID_HANDLE_VALUE)) {}
  UniqueFile& operator=(UniqueFile&& o) noexcept {
    if (this != &o) { Reset(); h_ = std::exchange(o.h_, INVALID_HANDLE_VALUE); }
    return *this;
  }
  ~UniqueFile() { Reset(); }
  HANDLE Get() const noexcept { return h_; }
  HANDLE Release() noexcept { return std::exchange(h_, INVALID_HANDLE_VALUE); }
  void Reset(HANDLE h = INVALID_HANDLE_VALUE) noexcept {
    if (h_ != INVALID_HANDLE_VALUE && h_ != nullptr) CloseHandle(h_);
    h_ = h;
  }
  explicit operator bool() const noexcept { return h_ != INVALID_HANDLE_VALUE && h_ != nullptr; }

 private:
  HANDLE h_ = INVALID_HANDLE_VALUE;
};

// A mapped view of a file.
class UniqueView {
 public:
  UniqueView() noexcept = default;
  explicit UniqueView(const void* p) noexcept : p_(p) {}
  UniqueView(UniqueView&& o) noexcept : p_(std::exchange(o.p_, nullptr)) {}
  UniqueView& operator=(UniqueView&& o) noexcept {
    if (this != &o) { Reset(); p_ = std::exchange(o.p_, nullptr); }
    return *this;
  }
  ~UniqueView() { Reset(); }
  const void* Get() const noexcept { return p_; }
  void Reset(const void* p = nullptr) noexcept {
    if (p_) UnmapViewOfFile(p_);
    p_ = p;
  }
  explicit operator bool() const noexcept { return p_ != nullptr; }

 private:
  const void* p_ = nullptr;
};

// Memory from the COM task allocator: item identifier lists, STRRET texts.
template <class T>
class UniqueCoMem {
 public:
  UniqueCoMem() noexcept = default;
  explicit UniqueCoMem(T* p) noexcept : p_(p) {}
  UniqueCoMem(UniqueCoMem&& o) noexcept : p_(std::exchange(o.p_, nullptr)) {}
  UniqueCoMem& operator=(UniqueCoMem&& o) noexcept {
    if (this != &o) { Reset(); p_ = std::exchange(o.p_, nullptr); }
    return *this;
  }
  ~UniqueCoMem() { Reset(); }
  T* Get() const noexcept { return p_; }
  T* Release() noexcept { return std::exchange(p_, nullptr); }
  void Reset(T* p = nullptr) noexcept {
    if (p_) CoTaskMemFree(const_cast<std::remove_const_t<T>*>(p_));
    p_ = p;
  }
  T** Put() noexcept { Reset(); return &p_; }
  explicit operator bool() const noexcept { return p_ != nullptr; }

 private:
  T* p_ = nullptr;
};

// A medium that IDataObject::GetData filled in: released once, whatever happens after.
class UniqueMedium {
 public:
  UniqueMedium() noexcept = default;
  UniqueMedium(const UniqueMedium&) = delete;
  UniqueMedium& operator=(const UniqueMedium&) = delete;
  ~UniqueMedium() { ReleaseStgMedium(&medium_); }  // an empty one (TYMED_NULL) holds nothing
  void Reset() noexcept {
    ReleaseStgMedium(&medium_);
    medium_ = {};
  }
  STGMEDIUM* Put() noexcept {
    Reset();
    return &medium_;
  }
  const STGMEDIUM& Get() const noexcept { return medium_; }

 private:
  STGMEDIUM medium_{};
};

// Locks global memory for the life of the guard.
template <class T>
class GlobalLockGuard {
 public:
  explicit GlobalLockGuard(HGLOBAL h) noexcept : h_(h), p_(h ? static_cast<T*>(GlobalLock(h)) : nullptr) {}
  GlobalLockGuard(const GlobalLockGuard&) = delete;
  GlobalLockGuard& operator=(const GlobalLockGuard&) = delete;
  ~GlobalLockGuard() { if (p_) GlobalUnlock(h_); }
  T* Get() const noexcept { return p_; }
  SIZE_T Size() const noexcept { return p_ ? GlobalSize(h_) : 0; }

 private:
  HGLOBAL h_;
  T* p_;
};

}  // namespace win
