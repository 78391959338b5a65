#include "server/com_base.h"

namespace com {
namespace {
std::atomic<long> g_locks{0};
std::atomic<long> g_serverLocks{0};
}

void LockModule() noexcept { ++g_locks; }
void UnlockModule() noexcept { --g_locks; }
long ModuleLockCount() noexcept { return g_locks.load(); }

void LockServer() noexcept {
  ++g_serverLocks;
  LockModule();
}

void UnlockServer() noexcept {
  for (long held = g_serverLocks.load(); held > 0;) {
    if (g_serverLocks.compare_exchange_weak(held, held - 1)) {
      UnlockModule();
      return;
    }
  }
}

}  // namespace com
