#pragma once

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <system_error>

namespace SecPolicyTest {

// A new and empty directory that nobody else may enter, removed at the end with all that is in it.
class TemporaryDirectory {
 public:
  TemporaryDirectory() {
    if (mkdtemp(path.data()) == nullptr) throw std::runtime_error("unable to make " + path);
  }
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
  ~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
  }

  const std::string& Path() const { return path; }
  std::string operator/(const std::string& name) const { return path + "/" + name; }

 private:
  std::string path = std::filesystem::temp_directory_path() / "secpolicy-test-XXXXXX";
};

}  // namespace SecPolicyTest
