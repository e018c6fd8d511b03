#include "host/linux/operation/store_fork.h"

#include <sqlite3.h>

#include <iterator>

namespace LinuxHost {
namespace {

// The locks of the engine that belong to no single connection. In the order in which the engine
// nests them itself: two threads that take locks in different orders wait for each other for ever.
constexpr int kSharedLocks[] = {SQLITE_MUTEX_STATIC_OPEN, SQLITE_MUTEX_STATIC_PRNG,
                                SQLITE_MUTEX_STATIC_MAIN, SQLITE_MUTEX_STATIC_VFS1,
                                SQLITE_MUTEX_STATIC_LRU,  SQLITE_MUTEX_STATIC_PMEM,
                                SQLITE_MUTEX_STATIC_MEM};

}  // namespace

StoresAtRest::StoresAtRest() {
  // It has a lock of its own for this, which would be left held where another thread is
  // initializing the engine; it is done with when this returns, and never taken again.
  sqlite3_initialize();
  for (const int lock : kSharedLocks) sqlite3_mutex_enter(sqlite3_mutex_alloc(lock));
}

StoresAtRest::~StoresAtRest() {
  for (auto lock = std::rbegin(kSharedLocks); lock != std::rend(kSharedLocks); ++lock) {
    sqlite3_mutex_leave(sqlite3_mutex_alloc(*lock));
  }
}

}  // namespace LinuxHost
