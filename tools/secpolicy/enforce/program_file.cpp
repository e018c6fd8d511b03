#include "program_file.h"

#include <unistd.h>

#include <filesystem>
#include <string_view>
#include <system_error>

#include "host/enforce/kernel.h"
#include "host/linux/common/host_error.h"

namespace SecPolicyCli {

using Braxo::Lib::BraxoException;
using LinuxHost::Descriptor;

ProgramFile OpenProgram(const std::string& path) {
  std::error_code error;
  const std::string real = std::filesystem::canonical(path, error);
  if (error) throw BraxoException("there is no program " + path + ": " + error.message());
  if (!std::filesystem::is_regular_file(real, error)) throw BraxoException(real + " is no program");
  // Whoever puts a link in its way from here on stops it.
  Descriptor file(Enforce::Kernel::OpenForReading(real.c_str()));
  if (!file.IsOpen()) LinuxHost::ThrowErrno("cannot open the program ", real);
  return {.file = std::move(file), .path = real};
}

bool IsScript(const ProgramFile& program) {
  char beginning[2] = {};
  return pread(program.file.Number(), beginning, sizeof beginning, 0) == sizeof beginning &&
         std::string_view(beginning, sizeof beginning) == "#!";
}

}  // namespace SecPolicyCli
