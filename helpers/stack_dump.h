// Stack traces of a thread, resolved through the debug help library.
#pragma once
#include <windows.h>
#include <cstdint>

namespace kld::ft {

// The sink of a trace. By default frames and messages go to the log.
class CStackDumpHandler {
 public:
  virtual ~CStackDumpHandler() = default;
  virtual void OnBegin() {}
  // Logs "0x<address> <symbol> <place>", or "Symbol not found" without a symbol.
  virtual void OnFrame(std::uint64_t address, const char* symbol, const char* place);
  virtual void OnMessage(const char* text);
  virtual void OnEnd() {}
};

struct CStackDumpRequest {
  HANDLE thread = nullptr;  // needs suspend, resume and context rights; may be the caller's
  CStackDumpHandler* handler = nullptr;
};

// Suspends the thread, walks at most 256 frames and resolves each return address. The
// calling thread's own stack is walked from a helper thread while the caller waits.
// Frames are reported before the thread resumes: a handler must not wait for anything
// that thread may hold (the default one takes the log's lock).
void DumpThreadStack(const CStackDumpRequest& request);

// A listener for the module's edge (boundary::failureSink): the failure as an error entry of
// the log, then the stack of the thread that it stopped in.
void LogBoundaryFailure(const char* what, HRESULT answer, const char* file, int line) noexcept;

}  // namespace kld::ft
