#include "server/com_base.h"

namespace com {
namespace {
std::atomic<long> g_locks{0};
}

void LockModule() noexcept { ++g_locks; }
void UnlockModule() noexcept { --g_locks; }
long ModuleLockCount() noexcept { return g_locks.load(); }

}  // namespace com
