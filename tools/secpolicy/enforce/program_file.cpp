#include "program_file.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string_view>
#include <system_error>

#include "host/enforce/broker/seen_file.h"
#include "host/enforce/kernel.h"
#include "host/linux/common/host_error.h"
#include "observe/watch.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using LinuxHost::Descriptor;
namespace Kernel = Enforce::Kernel;

}  // namespace

bool IsProgram(const std::string& path) {
  std::error_code error;
  return std::filesystem::is_regular_file(path, error) && access(path.c_str(), X_OK) == 0;
}

std::optional<std::string> FindProgram(const std::string& program) {
  if (program.find('/') != std::string::npos) return program;
  const char* const variable = std::getenv("PATH");
  std::string_view path = variable == nullptr ? "/bin:/usr/bin" : variable;
  while (!path.empty()) {
    const std::string_view directory = path.substr(0, path.find(':'));
    path.remove_prefix(std::min(directory.size() + 1, path.size()));
    const std::string candidate =
        std::filesystem::path(directory.empty() ? "." : directory) / program;
    if (IsProgram(candidate)) return candidate;
  }
  return std::nullopt;
}

ProgramFile OpenProgram(const std::string& path) {
  std::error_code error;
  const std::string real = std::filesystem::canonical(path, error);
  if (error) throw BraxoException("there is no program " + path + ": " + error.message());
  if (!std::filesystem::is_regular_file(real, error)) throw BraxoException(real + " is no program");
  // Whoever puts a link in its way from here on stops it.
  Descriptor file(Kernel::OpenWithoutLinks(real.c_str(), Kernel::kForReading));
  if (!file.IsOpen()) LinuxHost::ThrowErrno("cannot open the program ", real);
  return {.file = std::move(file), .path = real};
}

ProgramFile SeeProgram(int received) {
  Enforce::SeenFile seen = Enforce::SeeAgain(received, ProcDirectory(), Kernel::kForReading);
  if (!seen.file.IsOpen()) {
    throw BraxoException("there is no program " + seen.path + ", or it may not be read");
  }
  return {.file = Descriptor(seen.file.Release()), .path = std::move(seen.path)};
}

}  // namespace SecPolicyCli
