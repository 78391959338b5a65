// The edge between the host and this module. Explorer, an Open dialog or the
// instrument library call into us through COM methods, window and dialog procedures,
// callbacks and exports; a C++ exception that crosses one of them ends the host. Each
// such entry runs its body through one of these wrappers.
#pragma once
#include <windows.h>

#include <atomic>
#include <exception>
#include <new>
#include <utility>

namespace boundary {

// Told of every exception stopped here, while someone listens (the module's diagnostic log):
// what was thrown, the answer the host gets, and the file and line of the entry.
using FailureSink = void (*)(const char* what, HRESULT answer, const char* file, int line) noexcept;
inline std::atomic<FailureSink> failureSink{nullptr};

// Called inside a handler: tells the sink of the exception in flight.
inline void Report(HRESULT answer, const char* file, int line) noexcept {
  const FailureSink sink = failureSink.load(std::memory_order_relaxed);
  if (!sink) return;
  try {
    throw;
  } catch (const std::bad_alloc&) {
    sink("out of memory", E_OUTOFMEMORY, file, line);
  } catch (const std::exception& e) {
    sink(e.what(), answer, file, line);
  } catch (...) {
    sink("an exception of no known type", answer, file, line);
  }
}

// For a method that answers an HRESULT: E_OUTOFMEMORY when memory ran out, `other`
// for any other exception.
template <class Body>
HRESULT Call(Body&& body, HRESULT other = E_UNEXPECTED, const char* file = __builtin_FILE(),
             int line = __builtin_LINE()) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (const std::bad_alloc&) {
    Report(E_OUTOFMEMORY, file, line);
    return E_OUTOFMEMORY;
  } catch (...) {
    Report(other, file, line);
    return other;
  }
}

// For any other answer: `failure` whatever was thrown. A body returning void needs none.
template <class Result, class Body>
Result CallOr(Result failure, Body&& body, const char* file = __builtin_FILE(), int line = __builtin_LINE()) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (...) {
    Report(E_UNEXPECTED, file, line);
    return failure;
  }
}

template <class Body>
void CallVoid(Body&& body, const char* file = __builtin_FILE(), int line = __builtin_LINE()) noexcept {
  try {
    std::forward<Body>(body)();
  } catch (...) {
    Report(E_UNEXPECTED, file, line);
  }
}

// For a window procedure: the default handling when the body throws.
template <class Body>
LRESULT CallWindow(HWND window, UINT message, WPARAM wParam, LPARAM lParam, Body&& body,
                   const char* file = __builtin_FILE(), int line = __builtin_LINE()) noexcept {
  try {
    return std::forward<Body>(body)();
  } catch (...) {
    Report(E_UNEXPECTED, file, line);
    return DefWindowProcW(window, message, wParam, lParam);
  }
}

}  // namespace boundary
