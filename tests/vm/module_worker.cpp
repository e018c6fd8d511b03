// module_worker DOMAIN: a process in the domain with this number. For each line that it reads it
// uses a capability, and writes "may" or "refused".
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <iostream>
#include <string>

#include "braxo/lib/exception.h"
#include "host/enforce/module/module.h"

namespace {

const char* UseCapability() {
  if (chroot("/") == 0) return "may";
  return errno == EPERM ? "refused" : "failed otherwise";
}

void Enter(unsigned int domain) {
  auto module = Enforce::Module::FindRunning();
  if (!module) throw Braxo::Lib::BraxoException("the module does not run");
  module->Place(getpid(), domain);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) return 2;
  try {
    Enter(static_cast<unsigned int>(std::strtoul(argv[1], nullptr, 10)));
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 1;
  }
  std::string line;
  while (std::getline(std::cin, line)) std::cout << UseCapability() << std::endl;
}
