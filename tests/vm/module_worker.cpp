// module_worker [--by-host] DOMAIN: a process in the domain with this number, where the module puts
// it, or the host for who calls its kernel, into an enforcing one. For each line that it reads it
// uses a capability, and writes "may" or "refused".
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <string>

#include "secpolicyhost/values.h"
#include "vm/enter_domain.h"
#include "zorvan/kernel.h"

namespace {

// Who may not ask the module is told so as by any kernel, and nothing is thrown.
void RequireNoAnswer(std::uint64_t process) {
  constexpr std::uint32_t kDomainOfWorld = 0x4065;
  std::uint32_t domain = 0;
  const auto result =
      Zorvan::Kernel::Call(kDomainOfWorld, {process, reinterpret_cast<std::uintptr_t>(&domain)});
  if (result.status == 0)
    throw Braxo::Lib::BraxoException("the domain of who may not ask was told");
}

void EnterByHost(const char* number) {
  const auto process = static_cast<std::uint64_t>(getpid());
  const auto result = Zorvan::Kernel::Call(LinuxHost::kCallPlaceWorld,
                                           {process, std::strtoul(number, nullptr, 10)});
  if (result.status != 0) throw Braxo::Lib::BraxoException(std::strerror(-result.error));
  RequireNoAnswer(process);
}

void Enter(int argc, char** argv) {
  if (argc == 2) return EnforceTest::EnterDomain(argv[1]);
  EnterByHost(argv[2]);
}

const char* UseCapability() {
  if (chroot("/") == 0) return "may";
  return errno == EPERM ? "refused" : "failed otherwise";
}

}  // namespace

int main(int argc, char** argv) {
  const bool isByHost = argc == 3 && argv[1] == std::string("--by-host");
  if (argc != 2 && !isByHost) return 2;
  try {
    Enter(argc, argv);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 1;
  }
  std::string line;
  while (std::getline(std::cin, line)) std::cout << UseCapability() << std::endl;
}
