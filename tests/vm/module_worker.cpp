// module_worker [--by-host] DOMAIN [all-the-time]: a process in the domain with this number, where
// the module puts it, or the host for who calls its kernel, into an enforcing one. For each line
// that it reads it uses a capability, and writes "may" or "refused". Or it tries what takes rules
// all the time, and for each line that it reads writes how many times that was refused, and how
// often it passed.
#include <fcntl.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
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

void Enter(bool isByHost, char** argv) {
  if (isByHost) {
    EnterByHost(argv[2]);
  } else {
    EnforceTest::EnterDomain(argv[1]);
  }
}

const char* UseCapability() {
  if (chroot("/") == 0) return "may";
  return errno == EPERM ? "refused" : "failed otherwise";
}

bool IsRefused(int made) {
  if (made < 0) return errno == EPERM;
  close(made);
  return false;
}

bool IsLineThere() {
  pollfd input = {STDIN_FILENO, POLLIN, 0};
  return poll(&input, 1, 0) != 0;
}

void TryAllTheTime() {
  std::string line;
  while (true) {
    unsigned long tries = 0;
    unsigned long refused = 0;
    while (!IsLineThere()) {
      refused += static_cast<unsigned long>(chroot("/") < 0 && errno == EPERM);
      refused += static_cast<unsigned long>(IsRefused(open("/etc/passwd", O_RDONLY | O_CLOEXEC)));
      refused += static_cast<unsigned long>(IsRefused(socket(AF_INET, SOCK_STREAM, 0)));
      tries += 3;
    }
    if (!std::getline(std::cin, line)) return;
    std::cout << refused << " refused, " << tries - refused << " passed" << std::endl;
  }
}

}  // namespace

int main(int argc, char** argv) {
  const bool isByHost = argc == 3 && argv[1] == std::string("--by-host");
  const bool isAllTheTime = argc == 3 && argv[2] == std::string("all-the-time");
  if (argc != 2 && !isByHost && !isAllTheTime) return 2;
  try {
    Enter(isByHost, argv);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 1;
  }
  if (isAllTheTime) {
    // So that there is time for the others.
    setpriority(PRIO_PROCESS, 0, 19);
    TryAllTheTime();
    return 0;
  }
  std::string line;
  while (std::getline(std::cin, line)) std::cout << UseCapability() << std::endl;
}
