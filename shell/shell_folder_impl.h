// The slots of a folder that create objects, for any set of concrete classes.
#pragma once
#include <windows.h>
#include <shlobj.h>


#include "base/boundary.h"
#include "shell/shell_folder_base.h"

// What the classes must offer (all are com::ComObject classes, made by com::Make):
//   TFolder       the folder itself, positioned by Init(parent, list)
//   TView         Init(IShellFolder* folder, LPCITEMIDLIST folderList)
//   TEnum         Create(path, SHCONTF flags, HRESULT* result), which releases itself on failure
//   TContextMenu  nothing beyond its interface
//   TExtractIcon, TQueryInfo, TDropTarget   SetItem(LPCITEMIDLIST fullList), which copies it
//   TDataObject   AddItem(LPCITEMIDLIST fullList), which copies it
// SetItem and AddItem answer false when they could not take the list; such an object
// is never handed out, nor one whose IsUsable() is false.
template <class TFolder, class TView, class TEnum, class TContextMenu, class TExtractIcon, class TQueryInfo,
          class TDataObject, class TDropTarget>
class CGravonShellFolderImpl : public CGravonShellFolderBase {
 public:
  using CGravonShellFolderBase::CGravonShellFolderBase;

  STDMETHODIMP EnumObjects(HWND, SHCONTF flags, IEnumIDList** result) noexcept override {
    if (!result) return E_INVALIDARG;
    *result = nullptr;
    return boundary::Call([&] {
      // A level whose address doesn't fit would read as the root and list every level.
      wchar_t path[MAX_PATH];
      if (!GetFolderPath(path, MAX_PATH, false)) return E_FAIL;
      auto* list = new (std::nothrow) TEnum();
      if (!list) return E_OUTOFMEMORY;
      HRESULT hr = E_OUTOFMEMORY;
      list->Create(path, flags, &hr);
      if (FAILED(hr)) return hr;
      *result = list;
      return S_OK;
    });
  }

  STDMETHODIMP BindToObject(PCUIDLIST_RELATIVE list, IBindCtx*, REFIID riid, void** result) noexcept override {
    if (!result) return E_INVALIDARG;
    *result = nullptr;
    if (!list || pidlMgr_->IsFile(list)) return E_INVALIDARG;
    return boundary::Call([&] {
      auto folder = com::Make<TFolder>();
      if (!folder) return E_OUTOFMEMORY;
      HRESULT hr = folder->Init(this, list);
      if (FAILED(hr)) return hr;
      return folder->QueryInterface(riid, result);
    });
  }

  STDMETHODIMP CreateViewObject(HWND, REFIID riid, void** result) noexcept override {
    if (!result) return E_INVALIDARG;
    *result = nullptr;
    return boundary::Call([&] { return CreateViewObjectOf(riid, result); });
  }

  // One object for one item, handed the item's full list; no multiple selections here.
  STDMETHODIMP GetUIObjectOf(HWND, UINT count, PCUITEMID_CHILD_ARRAY items, REFIID riid, UINT*,
                             void** result) noexcept override {
    if (!result) return E_INVALIDARG;
    *result = nullptr;
    if (count != 1) return E_FAIL;
    if (!items || !items[0]) return E_INVALIDARG;
    return boundary::Call([&] { return UIObjectOf(items[0], riid, result); });
  }

 private:
  HRESULT CreateViewObjectOf(REFIID riid, void** result) {
    if (riid == IID_IShellView) {
      auto view = com::Make<TView>();
      if (!view) return E_OUTOFMEMORY;
      HRESULT hr = view->Init(static_cast<IShellFolder*>(this), list_.Get());
      if (FAILED(hr)) return hr;
      return view->QueryInterface(riid, result);
    }
    if (riid == IID_IContextMenu) {
      auto menu = com::Make<TContextMenu>();
      if (!menu) return E_OUTOFMEMORY;
      return menu->QueryInterface(riid, result);
    }
    return E_NOINTERFACE;
  }

  HRESULT UIObjectOf(LPCITEMIDLIST item, REFIID riid, void** result) {
    const auto setItem = [](auto& object, LPCITEMIDLIST full) { return object.SetItem(full); };
    if (riid == IID_IExtractIconW) return MakeItemObject<TExtractIcon>(item, riid, result, setItem);
    if (riid == IID_IQueryInfo) return MakeItemObject<TQueryInfo>(item, riid, result, setItem);
    if (riid == IID_IDataObject)
      return MakeItemObject<TDataObject>(item, riid, result,
                                         [](auto& object, LPCITEMIDLIST full) { return object.AddItem(full); });
    if (riid == IID_IDropTarget) return MakeItemObject<TDropTarget>(item, riid, result, setItem);
    return E_NOINTERFACE;
  }

  template <class T, class Attach>
  HRESULT MakeItemObject(LPCITEMIDLIST item, REFIID riid, void** result, Attach attach) {
    wchar_t path[MAX_PATH];
    if (!GetFolderPath(path, MAX_PATH, false)) return E_FAIL;
    UniqueIdList full(pidlMgr_->Concatenate(UniqueIdList(pidlMgr_->CreateListFromPath(path)).Get(), item));
    auto object = com::Make<T>();
    // An object without its list or its item manager would answer for nothing.
    if (!object || !full || !attach(*object.Get(), full.Get())) return E_OUTOFMEMORY;
    if constexpr (requires { object->IsUsable(); })
      if (!object->IsUsable()) return E_OUTOFMEMORY;
    return object->QueryInterface(riid, result);
  }
};
