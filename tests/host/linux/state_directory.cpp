#include "state_directory.h"

#include <cstdlib>
#include <fstream>

namespace LinuxHostTest {

StateDirectory::StateDirectory() : used(Database()) {}

void StateDirectory::Write(const std::string& name, const std::string& content) const {
  std::ofstream(directory / name) << content;
}

}  // namespace LinuxHostTest
