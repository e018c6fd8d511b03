#include "state_directory.h"

#include <cstdlib>
#include <fstream>

namespace LinuxHostTest {

StateDirectory::StateDirectory() { setenv("SECPOLICY_HOST_STATE", Database().c_str(), 1); }

StateDirectory::~StateDirectory() { unsetenv("SECPOLICY_HOST_STATE"); }

void StateDirectory::Write(const std::string& name, const std::string& content) const {
  std::ofstream(directory / name) << content;
}

}  // namespace LinuxHostTest
