// The standard log streams into the diagnostic log: for programs that write to std::clog.
#include <iostream>

#include "helpers/filelog.h"

namespace kld::ft {

namespace {

CFilelogStreamBufferT<char> clogBuffer;
CFilelogStreamBufferT<wchar_t> wclogBuffer;
std::streambuf* savedClog = nullptr;
std::wstreambuf* savedWclog = nullptr;

// The streams outlive these buffers: give them back before those go.
struct StreamGuard {
  ~StreamGuard() { RestoreLogStreams(); }
} streamGuard;

}  // namespace

void RedirectLogStreams() {
  test_only::RestoreStreams = &RestoreLogStreams;
  if (!savedClog) savedClog = std::clog.rdbuf(&clogBuffer);
  if (!savedWclog) savedWclog = std::wclog.rdbuf(&wclogBuffer);
}

void RestoreLogStreams() {
  if (savedClog) std::clog.rdbuf(savedClog);
  if (savedWclog) std::wclog.rdbuf(savedWclog);
  savedClog = nullptr;
  savedWclog = nullptr;
}

}  // namespace kld::ft
