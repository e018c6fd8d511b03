#include "state_directory.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace LinuxHostTest {

StateDirectory::StateDirectory()
    : directory(std::filesystem::temp_directory_path() / "secpolicy-state-XXXXXX") {
  if (mkdtemp(directory.data()) == nullptr) ADD_FAILURE() << "no directory for a state";
  setenv("SECPOLICY_HOST_STATE", Database().c_str(), 1);
}

StateDirectory::~StateDirectory() {
  unsetenv("SECPOLICY_HOST_STATE");
  std::filesystem::remove_all(directory);
}

void StateDirectory::Write(const std::string& name, const std::string& content) const {
  std::ofstream(directory + "/" + name) << content;
}

}  // namespace LinuxHostTest
