// The edge between the host and this module. Explorer, an Open dialog or the
// instrument library call into us through COM methods, window and dialog procedures,
// callbacks and exports; a C++ exception that crosses one of them ends the host. Each
// such entry runs its body through one of these wrappers.
#pragma once
#include <windows.h>

#include <new>
#include <utility>

namespace boundary {

// For a method that answers an HRESULT: E_OUTOFMEMORY when memory ran out, `other`
// for any other exception.
template <class Body>
HRESULT Call(Body&& body, HRESULT other = E_UNEXPECTED) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (const std::bad_alloc&) {
    return E_OUTOFMEMORY;
  } catch (...) {
    return other;
  }
}

// For any other answer: `failure` whatever was thrown. A body returning void needs none.
template <class Result, class Body>
Result CallOr(Result failure, Body&& body) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (...) {
    return failure;
  }
}

template <class Body>
void CallVoid(Body&& body) noexcept {
  try {
    std::forward<Body>(body)();
  } catch (...) {
  }
}

// For a window procedure: the default handling when the body throws.
template <class Body>
LRESULT CallWindow(HWND window, UINT message, WPARAM wParam, LPARAM lParam, Body&& body) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (...) {
    return DefWindowProcW(window, message, wParam, lParam);
  }
}

}  // namespace boundary
