#pragma once

#include <string>

#include "support/temporary_directory.h"

namespace LinuxHostTest {

// A host state of a test's own: SECPOLICY_HOST_STATE names a file in a directory that only this
// user may write, and that is removed with the object.
class StateDirectory {
 public:
  StateDirectory();
  StateDirectory(const StateDirectory&) = delete;
  StateDirectory& operator=(const StateDirectory&) = delete;
  ~StateDirectory();

  // The directory, and the database in it, which is not there before its first use.
  const std::string& Path() const { return directory.Path(); }
  std::string Database() const { return directory / "host.db"; }

  // Writes a file in the directory.
  void Write(const std::string& name, const std::string& content) const;

 private:
  SecPolicyTest::TemporaryDirectory directory;
};

}  // namespace LinuxHostTest
