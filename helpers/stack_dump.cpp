#include "helpers/stack_dump.h"

#include <dbghelp.h>

#include <cstdio>
#include <string>
#include <vector>

#include "base/boundary.h"
#include "base/win_handles.h"
#include "helpers/filelog.h"

namespace kld::ft {

namespace {

constexpr int kMaxFrames = 256;

std::string ModuleText(HANDLE process, DWORD64 address) {
  IMAGEHLP_MODULE64 module{};
  module.SizeOfStruct = sizeof module;
  if (!SymGetModuleInfo64(process, address, &module)) return "<no module>";
  return module.ModuleName;
}

std::string SymbolText(HANDLE process, DWORD64 address) {
  constexpr DWORD kNameLength = 1024;
  std::vector<unsigned char> storage(sizeof(IMAGEHLP_SYMBOL64) + kNameLength);
  auto* symbol = reinterpret_cast<IMAGEHLP_SYMBOL64*>(storage.data());
  symbol->SizeOfStruct = sizeof(IMAGEHLP_SYMBOL64);
  symbol->MaxNameLength = kNameLength;
  DWORD64 displacement = 0;
  if (!SymGetSymFromAddr64(process, address, &displacement, symbol)) return "<no symbol>";
  char plain[kNameLength] = {};
  std::string name = SymUnDName64(symbol, plain, kNameLength) && plain[0] ? plain : symbol->Name;
  if (displacement == 0) return name;
  char tail[48];
  std::snprintf(tail, sizeof tail, " + %lld bytes", static_cast<long long>(displacement));
  return name + tail;
}

void WalkSuspended(HANDLE thread, CStackDumpHandler& handler) {
  if (SuspendThread(thread) == static_cast<DWORD>(-1)) {
    handler.OnMessage("The thread could not be suspended");
    return;
  }
  CONTEXT context{};
  context.ContextFlags = CONTEXT_FULL;
  const bool haveContext = GetThreadContext(thread, &context);
  handler.OnBegin();
  const HANDLE process = GetCurrentProcess();
  if (!haveContext || !SymInitialize(process, nullptr, TRUE)) {
    handler.OnEnd();
    ResumeThread(thread);
    return;
  }
  SymSetOptions(SymGetOptions() & ~SYMOPT_UNDNAME);

  std::vector<DWORD64> addresses;
  STACKFRAME64 frame{};
  frame.AddrPC = {context.Rip, 0, AddrModeFlat};
  frame.AddrFrame = {context.Rbp, 0, AddrModeFlat};
  frame.AddrStack = {context.Rsp, 0, AddrModeFlat};
  for (int walked = 0; walked < kMaxFrames; ++walked) {
    if (!StackWalk64(IMAGE_FILE_MACHINE_AMD64, process, thread, &frame, &context, nullptr,
                     SymFunctionTableAccess64, SymGetModuleBase64, nullptr)) {
      break;
    }
    if (frame.AddrReturn.Offset) addresses.push_back(frame.AddrReturn.Offset);
  }
  for (DWORD64 address : addresses) {
    std::string place, symbol = "<EX: no symbol>";
    boundary::CallVoid([&] {
      place = ModuleText(process, address);
      symbol = SymbolText(process, address);
    });
    handler.OnFrame(address, symbol.c_str(), place.c_str());
  }
  SymCleanup(process);
  handler.OnEnd();
  ResumeThread(thread);
}

DWORD WINAPI WalkFromHelper(void* parameter) {
  const auto* request = static_cast<const CStackDumpRequest*>(parameter);
  WalkSuspended(request->thread, *request->handler);
  return 0;
}

}  // namespace

void CStackDumpHandler::OnFrame(std::uint64_t address, const char* symbol, const char* place) {
  if (!symbol) {
    LogTextA("Symbol not found");
    return;
  }
  LogTextA("0x%p %s %s", reinterpret_cast<void*>(address), symbol, place ? place : "");
}

void CStackDumpHandler::OnMessage(const char* text) { LogTextA("%s", text ? text : ""); }

void DumpThreadStack(const CStackDumpRequest& request) {
  if (!request.thread || !request.handler) return;
  if (GetThreadId(request.thread) != GetCurrentThreadId()) {
    WalkSuspended(request.thread, *request.handler);
    return;
  }
  // A thread can't suspend itself: a helper walks this stack while we wait here.
  CStackDumpRequest own = request;
  win::UniqueHandle self;
  if (!DuplicateHandle(GetCurrentProcess(), GetCurrentThread(), GetCurrentProcess(), self.Put(),
                       THREAD_ALL_ACCESS, FALSE, 0)) {
    return;
  }
  own.thread = self.Get();
  win::UniqueHandle helper(CreateThread(nullptr, 0, WalkFromHelper, &own, 0, nullptr));
  if (helper) WaitForSingleObject(helper.Get(), INFINITE);
}

}  // namespace kld::ft
