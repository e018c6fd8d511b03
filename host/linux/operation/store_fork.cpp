#include "host/linux/operation/store_fork.h"

#include <sqlite3.h>

#include <iterator>

namespace LinuxHost {
namespace {

// In the order in which the engine itself takes one while it has another.
constexpr int kSharedLocks[] = {SQLITE_MUTEX_STATIC_OPEN, SQLITE_MUTEX_STATIC_PRNG,
                                SQLITE_MUTEX_STATIC_MAIN, SQLITE_MUTEX_STATIC_VFS1,
                                SQLITE_MUTEX_STATIC_LRU,  SQLITE_MUTEX_STATIC_PMEM,
                                SQLITE_MUTEX_STATIC_MEM};

}  // namespace

StoresAtRest::StoresAtRest() {
  // Nobody is at it any more when this returns.
  sqlite3_initialize();
  for (const int lock : kSharedLocks) sqlite3_mutex_enter(sqlite3_mutex_alloc(lock));
}

StoresAtRest::~StoresAtRest() {
  for (auto lock = std::rbegin(kSharedLocks); lock != std::rend(kSharedLocks); ++lock) {
    sqlite3_mutex_leave(sqlite3_mutex_alloc(*lock));
  }
}

}  // namespace LinuxHost
