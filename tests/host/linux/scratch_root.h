#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <string>

#include "support/temporary_directory.h"

namespace LinuxHostTest {

// A directory of its own for a test, removed afterwards. `Root()` is made to be a root file system;
// what lies beside it must never be touched from within.
class ScratchRoot {
 public:
  ScratchRoot();

  std::filesystem::path Directory() const { return directory.Path(); }
  std::filesystem::path Root() const { return directory / "root"; }

  // Writes `content` to the file `path` below Root(), and makes the directories on the way.
  void Write(const std::string& path, const std::string& content) const;

  // Runs `body` in a process of its own, with Root() as its root directory (an ordinary user enters
  // it in a user namespace), and returns what it returns; for a BraxoException its message.
  std::string RunInside(const std::function<std::string()>& body) const;

  // The same, but with Root() only as the working directory, and a host state beside it.
  std::string RunBeneath(const std::function<std::string()>& body) const;

 private:
  SecPolicyTest::TemporaryDirectory directory;
};

// A test with a scratch root of its own.
class ScratchRootTest : public ::testing::Test {
 protected:
  // Runs `body` as ScratchRoot::RunBeneath.
  std::string Run(const std::function<std::string()>& body) const {
    return scratch.RunBeneath(body);
  }

  ScratchRoot scratch;
};

// The whole content of the file at `path`; empty when there is none.
std::string Content(const std::filesystem::path& path);

// True when this user may change the root directory; a test that needs it is skipped elsewhere.
bool MayChangeRoot();

}  // namespace LinuxHostTest
