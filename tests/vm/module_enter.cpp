// module_enter DOMAIN PROGRAM [ARGUMENT...]: the program, in the domain with this number.
#include <unistd.h>

#include <cstdio>
#include <iostream>

#include "vm/enter_domain.h"

int main(int argc, char** argv) {
  if (argc < 3) return 2;
  try {
    EnforceTest::EnterDomain(argv[1]);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << std::endl;
    return 126;
  }
  execv(argv[2], argv + 2);
  perror(argv[2]);
  return 127;
}
