// The thin COM layer of the module: module lock, smart pointer, object root.
#pragma once
#include <windows.h>
#include <unknwn.h>
#include <atomic>
#include <new>
#include <tuple>
#include <utility>

namespace com {

// Every living object of the module holds one lock; DllCanUnloadNow answers by the count.
void LockModule() noexcept;
void UnlockModule() noexcept;
long ModuleLockCount() noexcept;
// IClassFactory::LockServer: an unlock without a lock of its own changes nothing, so a
// client's extra LockServer(FALSE) can't take the count below zero.
void LockServer() noexcept;
void UnlockServer() noexcept;

// Owning interface pointer. Construction from a raw pointer adds a reference;
// Attach takes one over.
template <class T>
class ComPtr {
 public:
  ComPtr() noexcept = default;
  ComPtr(std::nullptr_t) noexcept {}
  explicit ComPtr(T* p) noexcept : p_(p) { if (p_) p_->AddRef(); }
  ComPtr(const ComPtr& o) noexcept : ComPtr(o.p_) {}
  ComPtr(ComPtr&& o) noexcept : p_(std::exchange(o.p_, nullptr)) {}
  template <class U>
  ComPtr(ComPtr<U>&& o) noexcept : p_(o.Detach()) {}
  ~ComPtr() { Reset(); }

  ComPtr& operator=(ComPtr o) noexcept { std::swap(p_, o.p_); return *this; }

  static ComPtr Attach(T* p) noexcept { ComPtr c; c.p_ = p; return c; }
  T* Detach() noexcept { return std::exchange(p_, nullptr); }
  void Reset() noexcept { if (T* p = std::exchange(p_, nullptr)) p->Release(); }

  T* Get() const noexcept { return p_; }
  T* operator->() const noexcept { return p_; }
  explicit operator bool() const noexcept { return p_ != nullptr; }

  // Out-parameter for calls that hand over a reference; releases what was held.
  T** Put() noexcept { Reset(); return &p_; }
  void** PutVoid() noexcept { return reinterpret_cast<void**>(Put()); }

  template <class U>
  HRESULT As(ComPtr<U>* out) const noexcept {
    return p_ ? p_->QueryInterface(__uuidof(U), out->PutVoid()) : E_POINTER;
  }
  // Hands a new reference to a caller's out-parameter.
  HRESULT CopyTo(T** out) const noexcept {
    if (!out) return E_POINTER;
    *out = p_;
    if (p_) p_->AddRef();
    return S_OK;
  }

 private:
  T* p_ = nullptr;
};

// Root of the module's COM objects. The interfaces listed are the ones that
// QueryInterface answers; the first one also stands for IUnknown. Objects are born
// with one reference, owned by whoever made them, and hold a module lock while alive.
template <class... Interfaces>
class ComObject : public Interfaces... {
  using First = std::tuple_element_t<0, std::tuple<Interfaces...>>;

 public:
  ComObject() noexcept { LockModule(); }
  ComObject(const ComObject&) = delete;
  ComObject& operator=(const ComObject&) = delete;

  STDMETHODIMP QueryInterface(REFIID riid, void** ppv) noexcept override {
    if (!ppv) return E_POINTER;
    *ppv = FindInterface(riid);
    if (!*ppv) return E_NOINTERFACE;
    AddRef();
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() noexcept override { return ++refs_; }
  STDMETHODIMP_(ULONG) Release() noexcept override {
    ULONG left = --refs_;
    if (left == 0) delete this;
    return left;
  }

 protected:
  virtual ~ComObject() { UnlockModule(); }

  // Answers the listed interfaces; a class with an extra interface (a base
  // interface reached through its own table) overrides this and calls it first.
  virtual void* FindInterface(REFIID riid) noexcept {
    if (riid == IID_IUnknown) return static_cast<First*>(this);
    void* found = nullptr;
    ((found == nullptr && riid == __uuidof(Interfaces)
          ? void(found = static_cast<Interfaces*>(this))
          : void()),
     ...);
    return found;
  }

 private:
  std::atomic<ULONG> refs_{1};
};

// new without exceptions, handing the one reference to a smart pointer; null also when
// the constructor throws.
template <class T, class... Args>
ComPtr<T> Make(Args&&... args) noexcept {
  try {
    return ComPtr<T>::Attach(new (std::nothrow) T(std::forward<Args>(args)...));
  } catch (...) {
    return {};
  }
}

// The body of a class object's creator: a new object asked for `riid`. A class whose
// constructor can fail to get what it needs reports it through IsUsable().
template <class T>
HRESULT CreateInstance(REFIID riid, void** ppv) noexcept {
  if (!ppv) return E_POINTER;
  *ppv = nullptr;
  auto object = Make<T>();
  if (!object) return E_OUTOFMEMORY;
  if constexpr (requires { object->IsUsable(); })
    if (!object->IsUsable()) return E_OUTOFMEMORY;
  return object->QueryInterface(riid, ppv);
}

}  // namespace com
