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

[[noreturn]] void RefuseUnfound(const std::string& path, const std::error_code& error) {
  const std::string text = "there is no program " + path + ": " + error.message();
  const bool isMissing =
      error == std::errc::no_such_file_or_directory || error == std::errc::not_a_directory;
  if (isMissing) throw NoSuchProgram(text);
  throw BraxoException(text);
}

void RequireProgram(const std::string& path) {
  using std::filesystem::perms;
  constexpr perms kExecutable = perms::owner_exec | perms::group_exec | perms::others_exec;
  std::error_code error;
  const std::filesystem::file_status status = std::filesystem::status(path, error);
  if (!std::filesystem::is_regular_file(status)) throw BraxoException(path + " is no program");
  if ((status.permissions() & kExecutable) != perms::none) return;
  throw BraxoException("cannot execute " + path + ": it is not executable; 'chmod +x' makes it so");
}

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
  if (error) RefuseUnfound(path, error);
  RequireProgram(real);
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
