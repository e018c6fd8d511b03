#include <sys/auxv.h>
#include <unistd.h>

#include "host/enforce/launcher/ask.h"
#include "host/enforce/launcher/enter.h"
#include "host/enforce/launcher/plan_source.h"
#include "host/enforce/launcher/refuse.h"
#include "options.h"

namespace SecPolicyRun {
namespace {

[[noreturn]] void Ask(const Options& options) {
  if (Enforce::IsKernelAsked()) {
    Enforce::AskKernel(Enforce::FindProgram(options.command, environ));
  }
  Enforce::AskBroker(Enforce::FindProgram(options.command, environ, Enforce::Executed::kOutside));
}

[[noreturn]] void Run(char** arguments) {
  // All that the caller says would count as if somebody with these rights had said it.
  if (getauxval(AT_SECURE) != 0) {
    Enforce::Refuse(
        "this program gives rights up and may not be installed so that it gets some (chmod "
        "u-s,g-s)");
  }
  const Options options = ReadOptions(arguments);
  if (options.asks) Ask(options);
  Enforce::Plan plan = Enforce::ReadPlan(options.plan);
  const Enforce::Program program =
      options.program ? Enforce::ProgramOf(*options.program, options.command, environ)
                      : Enforce::FindProgram(options.command, environ);
  if (options.module) {
    Enforce::EnterInModule(std::move(plan), program, *options.module);
  } else {
    Enforce::Enter(std::move(plan), program, options.keptDescriptors);
  }
}

}  // namespace
}  // namespace SecPolicyRun

int main(int, char** arguments) { SecPolicyRun::Run(arguments); }
