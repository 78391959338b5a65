// The one owner of everything the module must give back: registry keys, kernel handles and
// files, global memory, icons, image lists, menus, libraries, mapped views and memory from
// the COM task allocator (the shell's IMalloc). A kind is a traits type naming its handle,
// its empty value and how it is let go; nothing of these is freed by hand.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <objbase.h>
#include <oleauto.h>
#include <type_traits>
#include <utility>

namespace win {

template <class Traits>
class Unique {
 public:
  using Type = typename Traits::Type;

  Unique() noexcept = default;
  explicit Unique(Type h) noexcept : h_(h) {}
  Unique(Unique&& o) noexcept : h_(std::exchange(o.h_, Traits::Empty())) {}
  Unique& operator=(Unique&& o) noexcept {
    if (this != &o) Reset(std::exchange(o.h_, Traits::Empty()));
    return *this;
  }
  ~Unique() { Reset(); }

  Type Get() const noexcept { return h_; }
  Type Release() noexcept { return std::exchange(h_, Traits::Empty()); }
  void Reset(Type h = Traits::Empty()) noexcept {
    if (*this) Traits::Close(h_);
    h_ = h;
  }
  // Out-parameter for APIs that create the resource.
  Type* Put() noexcept {
    Reset();
    return &h_;
  }
  // A null handle is never one to give back, whatever a kind's empty value.
  explicit operator bool() const noexcept { return h_ != Traits::Empty() && h_ != Type{}; }

 private:
  Type h_ = Traits::Empty();
};

// A kind whose empty value is null, let go by `Free`.
template <class T, auto Free>
struct Null {
  using Type = T;
  static T Empty() noexcept { return nullptr; }
  static void Close(T h) noexcept { Free(h); }
};
// Files and searches: their empty value is INVALID_HANDLE_VALUE, which is no constant expression.
template <auto Free>
struct Invalid {
  using Type = HANDLE;
  static HANDLE Empty() noexcept { return INVALID_HANDLE_VALUE; }
  static void Close(HANDLE h) noexcept { Free(h); }
};
template <class T>
struct CoMem {
  using Type = T*;
  static T* Empty() noexcept { return nullptr; }
  static void Close(T* p) noexcept { CoTaskMemFree(const_cast<std::remove_const_t<T>*>(p)); }
};

using UniqueHKey = Unique<Null<HKEY, &RegCloseKey>>;
using UniqueHandle = Unique<Null<HANDLE, &CloseHandle>>;  // events, threads, mappings
using UniqueFile = Unique<Invalid<&CloseHandle>>;
using UniqueFind = Unique<Invalid<&FindClose>>;  // a FindFirstFileW search
using UniqueHGlobal = Unique<Null<HGLOBAL, &GlobalFree>>;
using UniqueLocal = Unique<Null<HLOCAL, &LocalFree>>;  // what FormatMessageW allocates
using UniqueBstr = Unique<Null<BSTR, &SysFreeString>>;
using UniqueIcon = Unique<Null<HICON, &DestroyIcon>>;
using UniqueImageList = Unique<Null<HIMAGELIST, &ImageList_Destroy>>;
using UniqueLibrary = Unique<Null<HMODULE, &FreeLibrary>>;
using UniqueMenu = Unique<Null<HMENU, &DestroyMenu>>;
using UniqueView = Unique<Null<const void*, &UnmapViewOfFile>>;  // a mapped view of a file
// Item identifier lists, STRRET texts, target devices.
template <class T>
using UniqueCoMem = Unique<CoMem<T>>;

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

// Holds a slim reader/writer lock exclusively for the life of the guard; a null lock is none.
class ExclusiveLock {
 public:
  explicit ExclusiveLock(SRWLOCK* lock) noexcept : lock_(lock) {
    if (lock_) AcquireSRWLockExclusive(lock_);
  }
  ~ExclusiveLock() {
    if (lock_) ReleaseSRWLockExclusive(lock_);
  }
  ExclusiveLock(const ExclusiveLock&) = delete;
  ExclusiveLock& operator=(const ExclusiveLock&) = delete;

 private:
  SRWLOCK* lock_;
};

// Locks global memory for the life of the guard.
template <class T>
class GlobalLockGuard {
 public:
  explicit GlobalLockGuard(HGLOBAL h) noexcept : h_(h), p_(h ? static_cast<T*>(GlobalLock(h)) : nullptr) {}
  GlobalLockGuard(const GlobalLockGuard&) = delete;
  GlobalLockGuard& operator=(const GlobalLockGuard&) = delete;
  ~GlobalLockGuard() {
    if (p_) GlobalUnlock(h_);
  }
  T* Get() const noexcept { return p_; }
  SIZE_T Size() const noexcept { return p_ ? GlobalSize(h_) : 0; }

 private:
  HGLOBAL h_;
  T* p_;
};

}  // namespace win
