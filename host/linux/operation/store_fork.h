#pragma once

namespace LinuxHost {

// As long as it lives, no other thread is inside the parts of the database engine that all threads
// share. A process that forks meanwhile leaves its child none of their locks held by a thread that
// the child does not have. To be destroyed by both, each in the thread that has forked.
class StoresAtRest {
 public:
  StoresAtRest();
  StoresAtRest(const StoresAtRest&) = delete;
  StoresAtRest& operator=(const StoresAtRest&) = delete;
  ~StoresAtRest();
};

}  // namespace LinuxHost
