#include "program_file.h"

#include <unistd.h>

#include <filesystem>
#include <string_view>
#include <system_error>

#include "host/enforce/broker/seen_file.h"
#include "host/enforce/kernel.h"
#include "host/linux/common/host_error.h"
#include "observe/watch.h"

namespace SecPolicyCli {

using Braxo::Lib::BraxoException;
using LinuxHost::Descriptor;
namespace Kernel = Enforce::Kernel;

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

bool IsScript(const ProgramFile& program) {
  char beginning[2] = {};
  return pread(program.file.Number(), beginning, sizeof beginning, 0) == sizeof beginning &&
         std::string_view(beginning, sizeof beginning) == "#!";
}

}  // namespace SecPolicyCli
