#pragma once

#include <string>

#include "host/linux/common/used_paths.h"
#include "support/temporary_directory.h"

namespace LinuxHostTest {

// A host state of a test's own, which this process uses as long as the object lives, in a directory
// that only this user may write, and that is removed with the object.
class StateDirectory {
 public:
  StateDirectory();
  StateDirectory(const StateDirectory&) = delete;
  StateDirectory& operator=(const StateDirectory&) = delete;

  // The directory, and the database in it, which is not there before its first use.
  const std::string& Path() const { return directory.Path(); }
  std::string Database() const { return directory / "host.db"; }

  // Writes a file in the directory.
  void Write(const std::string& name, const std::string& content) const;

 private:
  const SecPolicyTest::TemporaryDirectory directory;
  const LinuxHost::UsedState used;
};

}  // namespace LinuxHostTest
