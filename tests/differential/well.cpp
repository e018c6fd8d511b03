// A program that needs no system call but its end, which says that it ran.
extern "C" [[noreturn]] void _start() {
#if defined(__x86_64__)
  asm volatile("mov $60, %eax\n mov $7, %edi\n syscall");
#elif defined(__aarch64__)
  asm volatile("mov x8, #93\n mov x0, #7\n svc #0");
#else
#error "the system call that ends a program is not known here"
#endif
  __builtin_unreachable();
}
