#include "host/enforce/launcher/startable.h"

#include <fcntl.h>
#include <unistd.h>

#include <optional>
#include <string>

#include "host/enforce/interpreter.h"
#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

int OpenForReading(const Program& program) {
  if (program.descriptor >= 0) return dup(program.descriptor);
  return open(program.path.c_str(), Kernel::kForReading | O_CLOEXEC);
}

// The loader that is started for the program or the interpreter of a script; empty where there is
// none, or nobody can tell.
std::string LoaderOf(const Program& program) {
  int file = OpenForReading(program);
  for (int count = 0; count < kMostInterpreters && file >= 0; ++count) {
    const std::optional<Interpreter> interpreter = InterpreterOf(file);
    close(file);
    if (!interpreter) return "";
    if (interpreter->isLoader) return interpreter->path;
    file = open(interpreter->path.c_str(), Kernel::kForReading | O_CLOEXEC);
  }
  return "";
}

// Others have been seen to start without mapping a file.
bool IsOfGnu(const std::string& loader) {
  return loader.substr(loader.rfind('/') + 1).starts_with("ld-linux");
}

}  // namespace

void RequireStartable(const Plan& plan, const Program& program) {
  if (!plan.mayEnd) {
    Refuse("no program can end in the domain " + plan.domain +
           ", which may call neither exit nor exit_group; '-s @start grant' grants both where no "
           "rule revokes them");
  }
  if (plan.mayMap) return;
  const std::string loader = LoaderOf(program);
  if (!IsOfGnu(loader)) return;
  Refuse(program.path + " cannot start in the domain " + plan.domain + ", as its loader " + loader +
         " needs mmap, which the domain may not call; '-s @start grant' grants it where no rule "
         "revokes it");
}

}  // namespace Enforce
