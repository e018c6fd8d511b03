#include "launcher.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <utility>

#include "environment.h"
#include "host/enforce/broker/message.h"
#include "host/enforce/kernel.h"
#include "host/enforce/plan_file.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {
namespace {

namespace Kernel = Enforce::Kernel;
using LinuxHost::Descriptor;
using LinuxHost::ThrowErrno;

constexpr char kName[] = "secpolicy-run";

int launcher = -1;

// Beside this program, as it is built, or where it is installed.
std::vector<std::filesystem::path> Places() {
  std::error_code error;
  const auto directory = std::filesystem::read_symlink("/proc/self/exe", error).parent_path();
  if (error) return {};
  return {directory / kName, directory.parent_path() / SECPOLICY_LIBEXECDIR / kName};
}

// The plan as a file that has no name and that nobody can change.
Descriptor SealedFile(const std::string& bytes) {
  Descriptor file(memfd_create("secpolicy plan", MFD_ALLOW_SEALING));
  if (file.Number() < 0) ThrowErrno("cannot make a plan");
  if (!LinuxHost::WriteAll(file.Number(), bytes)) ThrowErrno("cannot write a plan");
  constexpr int kSeals = F_SEAL_SEAL | F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE;
  const bool isSealed = fchmod(file.Number(), 0400) == 0 &&
                        fcntl(file.Number(), F_ADD_SEALS, kSeals) == 0 &&
                        lseek(file.Number(), 0, SEEK_SET) == 0;
  if (!isSealed) ThrowErrno("cannot seal a plan");
  return file;
}

// Whoever is not root loses what a user namespace has given to it with the next execve, unless it
// is told to be ambient. The launcher drops what the domain is not to have.
void HandOnCapabilities() {
  Kernel::Capabilities own;
  if (Kernel::GetCapabilities(&own) != 0) ThrowErrno("cannot read capabilities");
  own.inheritable = own.permitted;
  if (Kernel::SetCapabilities(own) != 0) ThrowErrno("cannot keep capabilities");
  const int last = Kernel::LastCapability();
  for (int number = 0; number <= last; ++number) {
    if (!Kernel::HasCapability(own.permitted, number)) continue;
    prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_RAISE, number, 0, 0);
  }
}

[[noreturn]] void ThrowNoLauncher() {
  throw Braxo::Lib::BraxoException(
      "secpolicy-run, which confines programs, is neither beside this command nor where it is "
      "installed: install secpolicy again");
}

// What the launcher is told of by an option.
struct HandedOn {
  const char* option = nullptr;
  int descriptor = -1;  // none where it is not open
};

// Stays open when another program is executed.
void HandOn(const HandedOn& handed, std::vector<std::string>* words) {
  if (handed.descriptor < 0) return;
  if (fcntl(handed.descriptor, F_SETFD, 0) != 0) ThrowErrno("cannot hand on a descriptor");
  words->insert(words->end(), {handed.option, std::to_string(handed.descriptor)});
}

std::vector<std::string> EnvironmentWithBroker(const Entry& entry, const std::string& broker) {
  std::vector<std::string> variables = EnvironmentOf(entry);
  variables.push_back(std::string(Enforce::kBrokerVariable) + "=" + broker);
  return variables;
}

[[noreturn]] void Start(const Enforce::Plan& plan, const Entry& entry, const HandedOn& other,
                        std::vector<std::string> variables) {
  const Descriptor file = SealedFile(Enforce::Serialize(plan));
  std::vector<std::string> words = {kName, "--plan", std::to_string(file.Number())};
  HandOn({"--program", entry.program.Number()}, &words);
  HandOn(other, &words);
  words.emplace_back("--");
  words.insert(words.end(), entry.command.begin(), entry.command.end());
  execveat(launcher, "", PointersTo(words).data(), PointersTo(variables).data(), AT_EMPTY_PATH);
  ThrowErrno("cannot start secpolicy-run");
}

// A descriptor leads past what is put over its path.
void RefuseMaskedProgram(const Enforce::Plan& plan, const Entry& entry) {
  if (plan.level != Policy::Level::kEnforcing) return;
  for (const Enforce::Mask& mask : plan.masks) {
    const bool isBelow = entry.programPath.starts_with(mask.path + "/");
    if (!isBelow && entry.programPath != mask.path) continue;
    throw Braxo::Lib::BraxoException("cannot execute " + entry.programPath + " in the domain " +
                                     plan.domain + ": " + std::strerror(EACCES));
  }
}

// Where neither a program nor a shell is likely to put another.
int MoveAway(int descriptor) {
  constexpr int kLowest = 100;
  const int number = fcntl(descriptor, F_DUPFD, kLowest);
  if (number < 0) ThrowErrno("cannot hand on a descriptor");
  return number;
}

}  // namespace

void OpenLauncher() {
  for (const auto& place : Places()) {
    launcher = open(place.c_str(), O_PATH | O_CLOEXEC);
    if (launcher >= 0) return;
  }
}

void StartConfined(const Enforce::Plan& plan, const Entry& entry,
                   const Enforce::FileDescriptor& broker) {
  if (launcher < 0) ThrowNoLauncher();
  RefuseMaskedProgram(plan, entry);
  if (geteuid() != 0) HandOnCapabilities();
  if (!broker.IsOpen()) Start(plan, entry, {}, EnvironmentOf(entry));
  const int number = MoveAway(broker.Number());
  Start(plan, entry, {"--keep-fd", number}, EnvironmentWithBroker(entry, std::to_string(number)));
}

void StartKept(const Enforce::Plan& plan, const Entry& entry, int module) {
  if (launcher < 0) ThrowNoLauncher();
  Start(plan, entry, {"--module", module},
        EnvironmentWithBroker(entry, std::string(Enforce::kKernelAsBroker)));
}

bool HasBroker() { return std::getenv(Enforce::kBrokerVariable) != nullptr; }

// By its path: not every domain that executes programs does so by descriptors.
void AskBroker(const std::vector<std::string>& command) {
  if (launcher < 0) ThrowNoLauncher();
  std::vector<std::string> words = {kName, "--ask", "--"};
  words.insert(words.end(), command.begin(), command.end());
  for (const auto& place : Places()) execv(place.c_str(), PointersTo(words).data());
  ThrowErrno("cannot start secpolicy-run");
}

}  // namespace SecPolicyCli
