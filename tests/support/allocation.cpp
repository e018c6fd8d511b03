// Allocations that change errno, as they may. While a scripted host exists each one does, so that
// a late read of errno shows.

#include <cerrno>
#include <cstdlib>
#include <new>

namespace SecPolicyTest {
extern bool overwriteErrno;
namespace {

void OverwriteErrno() {
  if (overwriteErrno) errno = EXFULL;
}

}  // namespace
}  // namespace SecPolicyTest

#ifdef SECPOLICY_SANITIZE

// The sanitizer's own allocation functions stay, for what they find.
extern "C" __attribute__((visibility("default"))) void __sanitizer_malloc_hook(const volatile void*,
                                                                               std::size_t) {
  SecPolicyTest::OverwriteErrno();
}
extern "C" __attribute__((visibility("default"))) void __sanitizer_free_hook(const volatile void*) {
}

#else

void* operator new(std::size_t size) {
  void* memory = std::malloc(size == 0 ? 1 : size);
  if (memory == nullptr) throw std::bad_alloc();
  SecPolicyTest::OverwriteErrno();
  return memory;
}
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }

#endif
