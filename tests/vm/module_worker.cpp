// module_worker DOMAIN: a process in the domain with this number. For each line that it reads it
// uses a capability, and writes "may" or "refused".
#include <unistd.h>

#include <cerrno>
#include <iostream>
#include <string>

#include "vm/enter_domain.h"

namespace {

const char* UseCapability() {
  if (chroot("/") == 0) return "may";
  return errno == EPERM ? "refused" : "failed otherwise";
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) return 2;
  try {
    EnforceTest::EnterDomain(argv[1]);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 1;
  }
  std::string line;
  while (std::getline(std::cin, line)) std::cout << UseCapability() << std::endl;
}
