#include "base/com_base.h"

namespace com {
namespace {
std::atomic<long> moduleLocks{0};
std::atomic<long> serverLocks{0};
}

void LockModule() noexcept { ++moduleLocks; }
void UnlockModule() noexcept { --moduleLocks; }
long ModuleLockCount() noexcept { return moduleLocks.load(); }

void LockServer() noexcept {
  ++serverLocks;
  LockModule();
}

void UnlockServer() noexcept {
  for (long held = serverLocks.load(); held > 0;) {
    if (serverLocks.compare_exchange_weak(held, held - 1)) {
      UnlockModule();
      return;
    }
  }
}

}  // namespace com
