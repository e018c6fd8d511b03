// module_enter DOMAIN PROGRAM [ARGUMENT...]: the program, in the domain with this number.
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <iostream>

#include "braxo/lib/exception.h"
#include "host/enforce/module/module.h"

namespace {

void Enter(unsigned int domain) {
  auto module = Enforce::Module::FindRunning();
  if (!module) throw Braxo::Lib::BraxoException("the module does not run");
  module->Place(getpid(), domain);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) return 2;
  try {
    Enter(static_cast<unsigned int>(std::strtoul(argv[1], nullptr, 10)));
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 126;
  }
  execv(argv[2], argv + 2);
  perror(argv[2]);
  return 127;
}
