// What the hostile tests have done by a process of its own: one with its own memory to measure, or
// one of another user.
//
//   hostile_child parse FILE [MIB]        reads a policy file, in at most MIB of address space;
//                                         prints the number of lines with words and the most memory
//                                         that was in use, in kB
//   hostile_child label UID HOST DIR      labels DIR and its tree as the user UID, with the host's
//                                         files in the directory HOST; prints what that threw
//   hostile_child read UID DIR            reads every policy file of DIR likewise
#include <grp.h>
#include <sys/resource.h>
#include <unistd.h>

#include <fstream>
#include <iostream>
#include <new>
#include <span>
#include <string>

#include "secpolicy/secpolicy.h"

namespace {

using TeskCtl::Security::TeskAccessInterfaceImpl;

// getrusage would count what the parent had in use before it became this program.
std::string PeakMemory() {
  std::ifstream status("/proc/self/status");
  std::string word;
  while (status >> word) {
    if (word == "VmHWM:" && status >> word) return word;
  }
  return "unknown";
}

void Parse(std::span<char*> arguments) {
  if (arguments.size() > 1) {
    const rlim_t limit = std::stoul(arguments[1]) << 20;
    const rlimit limits = {limit, limit};
    setrlimit(RLIMIT_AS, &limits);
  }
  std::map<unsigned int, std::queue<std::string>> parsed;
  SecPolicy::ParseFile(arguments[0], parsed);
  std::cout << parsed.size() << ' ' << PeakMemory() << std::endl;
}

void Become(const char* user) {
  const auto id = static_cast<unsigned int>(std::stoul(user));
  if (setgroups(0, nullptr) != 0 || setgid(id) != 0 || setuid(id) != 0) {
    throw Braxo::Lib::BraxoException("cannot become another user");
  }
}

void Label(std::span<char*> arguments) {
  Become(arguments[0]);
  const std::string directory = arguments[1];
  setenv("SECPOLICY_HOST_STATE", (directory + "/host.db").c_str(), 1);
  setenv("SECPOLICY_HOST_CONFIG", (directory + "/config.db").c_str(), 1);
  TeskAccessInterfaceImpl access;
  access.AddLabels({"toolLabel"}, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  SecPolicy::SetDirLabelRecursive(arguments[2], "toolLabel", access);
}

void Read(std::span<char*> arguments) {
  Become(arguments[0]);
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(arguments[1], files);
  std::map<unsigned int, std::queue<std::string>> parsed;
  for (const auto& [path, name] : files) SecPolicy::ParseFile(path, parsed);
}

void Run(const std::string& verb, std::span<char*> arguments) {
  if (verb == "parse" && !arguments.empty()) return Parse(arguments);
  if (verb == "label" && arguments.size() == 3) return Label(arguments);
  if (verb == "read" && arguments.size() == 2) return Read(arguments);
  throw Braxo::Lib::BraxoException("usage");
}

}  // namespace

int main(int argc, char** argv) {
  try {
    const std::span arguments(argv, static_cast<std::size_t>(argc));
    Run(argc > 1 ? arguments[1] : "", arguments.subspan(argc > 1 ? 2 : 1));
    return 0;
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cout << failure.what() << std::endl;
    return 1;
  } catch (const std::bad_alloc&) {
    std::cout << "out of memory" << std::endl;
    return 2;
  }
}
