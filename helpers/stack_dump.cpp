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

// The debug help library is mapped for a trace only: a host that never traces never loads it.
class CDebugHelp {
  // First: every entry point below is looked up in it as it is initialised.
  win::UniqueLibrary library_{LoadLibraryW(L"dbghelp.dll")};

 public:
  bool IsLoaded() const noexcept {
    return Initialize && SetOptions && GetOptions && Walk && FunctionTableAccess && GetModuleBase &&
           GetModuleInfo && GetSymFromAddr && UnDName && Cleanup;
  }

  decltype(&SymInitialize) Initialize = Find<decltype(&SymInitialize)>("SymInitialize");
  decltype(&SymSetOptions) SetOptions = Find<decltype(&SymSetOptions)>("SymSetOptions");
  decltype(&SymGetOptions) GetOptions = Find<decltype(&SymGetOptions)>("SymGetOptions");
  decltype(&StackWalk64) Walk = Find<decltype(&StackWalk64)>("StackWalk64");
  decltype(&SymFunctionTableAccess64) FunctionTableAccess =
      Find<decltype(&SymFunctionTableAccess64)>("SymFunctionTableAccess64");
  decltype(&SymGetModuleBase64) GetModuleBase = Find<decltype(&SymGetModuleBase64)>("SymGetModuleBase64");
  decltype(&SymGetModuleInfo64) GetModuleInfo = Find<decltype(&SymGetModuleInfo64)>("SymGetModuleInfo64");
  decltype(&SymGetSymFromAddr64) GetSymFromAddr = Find<decltype(&SymGetSymFromAddr64)>("SymGetSymFromAddr64");
  decltype(&SymUnDName64) UnDName = Find<decltype(&SymUnDName64)>("SymUnDName64");
  decltype(&SymCleanup) Cleanup = Find<decltype(&SymCleanup)>("SymCleanup");

 private:
  template <class Function>
  Function Find(const char* name) const noexcept {
    return library_ ? reinterpret_cast<Function>(reinterpret_cast<void*>(GetProcAddress(library_.Get(), name)))
                    : nullptr;
  }
};

std::string ModuleText(const CDebugHelp& help, HANDLE process, DWORD64 address) {
  IMAGEHLP_MODULE64 module{};
  module.SizeOfStruct = sizeof module;
  if (!help.GetModuleInfo(process, address, &module)) return "<no module>";
  return module.ModuleName;
}

std::string SymbolText(const CDebugHelp& help, HANDLE process, DWORD64 address) {
  constexpr DWORD kNameLength = 1024;
  std::vector<unsigned char> storage(sizeof(IMAGEHLP_SYMBOL64) + kNameLength);
  auto* symbol = reinterpret_cast<IMAGEHLP_SYMBOL64*>(storage.data());
  symbol->SizeOfStruct = sizeof(IMAGEHLP_SYMBOL64);
  symbol->MaxNameLength = kNameLength;
  DWORD64 displacement = 0;
  if (!help.GetSymFromAddr(process, address, &displacement, symbol)) return "<no symbol>";
  char plain[kNameLength] = {};
  std::string name = help.UnDName(symbol, plain, kNameLength) && plain[0] ? plain : symbol->Name;
  if (displacement == 0) return name;
  return name + FormatText(" + %I64d bytes", static_cast<long long>(displacement));
}

void WalkSuspended(HANDLE thread, CStackDumpHandler& handler) {
  const CDebugHelp help;
  // Reserved before the thread stops: it may hold the heap's lock while suspended.
  std::vector<DWORD64> addresses;
  addresses.reserve(kMaxFrames);
  if (SuspendThread(thread) == static_cast<DWORD>(-1)) {
    handler.OnMessage("The thread could not be suspended");
    return;
  }
  // Resumed however the walk ends, a handler that throws included: a thread of ours may be
  // waiting on it.
  const struct Resume {
    HANDLE thread;
    ~Resume() { ResumeThread(thread); }
  } resume{thread};
  CONTEXT context{};
  context.ContextFlags = CONTEXT_FULL;
  const bool haveContext = GetThreadContext(thread, &context);
  handler.OnBegin();
  const HANDLE process = GetCurrentProcess();
  if (!haveContext || !help.IsLoaded() || !help.Initialize(process, nullptr, TRUE)) {
    handler.OnEnd();
    return;
  }
  help.SetOptions(help.GetOptions() & ~SYMOPT_UNDNAME);

  STACKFRAME64 frame{};
  frame.AddrPC = {context.Rip, 0, AddrModeFlat};
  frame.AddrFrame = {context.Rbp, 0, AddrModeFlat};
  frame.AddrStack = {context.Rsp, 0, AddrModeFlat};
  for (int walked = 0; walked < kMaxFrames; ++walked) {
    if (!help.Walk(IMAGE_FILE_MACHINE_AMD64, process, thread, &frame, &context, nullptr, help.FunctionTableAccess,
                   help.GetModuleBase, nullptr)) {
      break;
    }
    if (frame.AddrReturn.Offset) addresses.push_back(frame.AddrReturn.Offset);
  }
  for (DWORD64 address : addresses) {
    std::string place, symbol = "<EX: no symbol>";
    boundary::CallVoid([&] {
      place = ModuleText(help, process, address);
      symbol = SymbolText(help, process, address);
    });
    handler.OnFrame(address, symbol.c_str(), place.c_str());
  }
  help.Cleanup(process);
  handler.OnEnd();
}

DWORD WINAPI WalkFromHelper(void* parameter) noexcept {
  const auto* request = static_cast<const CStackDumpRequest*>(parameter);
  boundary::CallVoid([&] { WalkSuspended(request->thread, *request->handler); });
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

void LogBoundaryFailure(const char* what, HRESULT answer, const char* file, int line) noexcept {
  // A failure while telling of one is not told again.
  static thread_local bool telling = false;
  if (telling) return;
  telling = true;
  LogTextA("Stopped at the module's edge (%s, %i): %s; the host was answered 0x%08lX", file ? file : "", line,
           what ? what : "", static_cast<unsigned long>(answer));
  CStackDumpHandler handler;
  DumpThreadStack({GetCurrentThread(), &handler});
  telling = false;
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
