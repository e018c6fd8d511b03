#include "state_reader.h"

#include <stdexcept>

#include "braxo/lib/exception.h"
#include "host/linux/operation/state_use.h"
#include "scratch_directory.h"

namespace SecPolicyCli {
namespace {

// The message as it is about the original.
std::string About(const std::string& path, const std::string& copy, std::string message) {
  const std::size_t found = message.find(copy);
  return found == std::string::npos ? message : message.replace(found, copy.size(), path);
}

}  // namespace

Policy::InstalledPolicy ReadStateAt(const std::string& path, LinuxHost::CopyOf what) {
  const ScratchDirectory scratch;
  const std::string copy = scratch.File("host.db");
  LinuxHost::CopyDatabase(path, what, copy);
  try {
    const LinuxHost::UsedCopy used(copy);
    SecPolicy::TeskAccessInterfaceImpl access;
    return ReadInstalledPolicy(access);
  } catch (const Braxo::Lib::BraxoException& problem) {
    throw std::runtime_error(About(path, copy, problem.what()));
  }
}

}  // namespace SecPolicyCli
