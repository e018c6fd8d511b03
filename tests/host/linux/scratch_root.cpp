#include "scratch_root.h"

#include <sched.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "braxo/lib/exception.h"

namespace LinuxHostTest {
namespace {

void WriteFile(const std::filesystem::path& path, const std::string& content) {
  std::ofstream file(path, std::ios::binary);
  file << content << std::flush;
  if (!file) throw std::runtime_error("unable to write " + path.string());
}

// The user and the group keep their numbers, so that files belong to who runs the test.
bool EnterUserNamespace() {
  const std::string user = std::to_string(geteuid());
  const std::string group = std::to_string(getegid());
  if (unshare(CLONE_NEWUSER) != 0) return false;
  WriteFile("/proc/self/setgroups", "deny");
  WriteFile("/proc/self/uid_map", user + " " + user + " 1");
  WriteFile("/proc/self/gid_map", group + " " + group + " 1");
  return true;
}

bool ChangeRoot(const std::filesystem::path& root) {
  if (geteuid() != 0 && !EnterUserNamespace()) return false;
  return chroot(root.c_str()) == 0 && chdir("/") == 0;
}

std::string Answer(const std::function<std::string()>& body) {
  try {
    return body();
  } catch (const Braxo::Lib::BraxoException& error) {
    return error.what();
  }
}

// What a body changes for its whole process, it changes in a process that ends with it.
std::string RunInChild(const std::function<std::string()>& body) {
  int ends[2];
  if (pipe(ends) != 0) throw std::runtime_error("unable to make a pipe");
  const pid_t child = fork();
  if (child == 0) {
    close(ends[0]);
    const std::string answer = Answer(body);
    const bool told =
        write(ends[1], answer.data(), answer.size()) == static_cast<ssize_t>(answer.size());
    _exit(told ? EXIT_SUCCESS : EXIT_FAILURE);
  }
  close(ends[1]);
  std::string answer;
  char buffer[4096];
  for (ssize_t size = 0; (size = read(ends[0], buffer, sizeof buffer)) > 0;) {
    answer.append(buffer, static_cast<std::size_t>(size));
  }
  close(ends[0]);
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == EXIT_SUCCESS ? answer
                                                                  : "(the process died) " + answer;
}

}  // namespace

ScratchRoot::ScratchRoot() {
  std::filesystem::create_directories(Root() / "run");
  std::filesystem::create_directories(Root() / "tardisks");
}

void ScratchRoot::Write(const std::string& path, const std::string& content) const {
  std::filesystem::create_directories((Root() / path).parent_path());
  WriteFile(Root() / path, content);
}

std::string ScratchRoot::RunInside(const std::function<std::string()>& body) const {
  return RunInChild([&]() -> std::string {
    unsetenv("SECPOLICY_HOST_STATE");
    unsetenv("SECPOLICY_HOST_CONFIG");
    if (!ChangeRoot(Root())) return "(the root cannot be changed here)";
    return body();
  });
}

std::string ScratchRoot::RunBeneath(const std::function<std::string()>& body) const {
  return RunInChild([&]() -> std::string {
    setenv("SECPOLICY_HOST_STATE", (directory / "state/host.db").c_str(), 1);
    setenv("SECPOLICY_HOST_CONFIG", (directory / "config/config.db").c_str(), 1);
    if (chdir(Root().c_str()) != 0) return "(the root cannot be entered)";
    return body();
  });
}

std::string Content(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

bool MayChangeRoot() {
  return RunInChild([] { return std::string(ChangeRoot("/") ? "yes" : "no"); }) == "yes";
}

}  // namespace LinuxHostTest
