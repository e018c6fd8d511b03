#include "host/linux/kernel/module_publication.h"

#include <sys/random.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdint>
#include <fstream>
#include <memory>
#include <string>

#include "braxo/misc/strcat.h"
#include "host/linux/common/errno_guard.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/module_library.h"
#include "host/linux/common/private_file.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/kernel/tardisk_files.h"
#include "host/linux/services/system_log.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/module_place.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;
using Enforce::RunningModule;

// Of the calling thread: how many do not want to be followed yet.
thread_local int holders = 0;

// No generation of a module that was told nothing.
constexpr std::uint64_t kNothingPublished = 0;

// Never one that was there before: an old mark stands for nothing.
std::uint64_t NewGeneration() {
  std::uint64_t generation = kNothingPublished;
  while (generation == kNothingPublished) {
    if (getrandom(&generation, sizeof generation, 0) != sizeof generation) {
      ThrowErrno("Unable to number what the module is told");
    }
  }
  return generation;
}

std::uint64_t PublishedGeneration() {
  std::ifstream file(PublishedMarkOf(StatePath()));
  std::uint64_t generation = kNothingPublished;
  return file >> generation ? generation : kNothingPublished;
}

void Remove(const std::string& path) {
  if (unlink(path.c_str()) != 0 && errno != ENOENT) ThrowErrno("Unable to remove ", path);
}

Policy::InstalledPolicy ReadInstalled() {
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  return Policy::ReadPolicy(access);
}

void Publish(RunningModule& running) {
  const HeldPublication held;
  HostState& state = HostState::Current();
  // Only as a lock, which ends without a commit.
  const Transaction others(state.Database());
  const std::uint64_t generation = NewGeneration();
  const Policy::InstalledPolicy policy = ReadInstalled();
  running.Publish(policy, ReadTardiskFiles(state, policy), generation);
  ReplacePrivateFile(PublishedMarkOf(StatePath()), StrCat(generation, "\n"));
}

// Whoever has committed can be told nothing else: its own work is done.
void LogFailure(const std::string& failure) noexcept {
  try {
    LogInformation(StrCat("The module was not told what was installed: ", failure));
  } catch (const Braxo::Lib::BraxoException&) {
    return;
  }
}

// Where it has ended otherwise than by a stop, that is told once.
void PublishToRunning() {
  const auto running = ModuleLibrary().find();
  if (running) return Publish(*running);
  EndPublishing();
  throw HostError(ESRCH,
                  "The module does not run any more, so the kernel keeps nothing of the policy. "
                  "\"secpolicy module start\" starts it");
}

}  // namespace

bool IsStateOfModule() { return access(ModuleMarkOf(StatePath()).c_str(), F_OK) == 0; }

bool IsPublishedTo(const RunningModule& running) {
  const std::uint64_t generation = PublishedGeneration();
  return IsStateOfModule() && generation != kNothingPublished && generation == running.Generation();
}

void BeginPublishing(RunningModule& running) {
  Remove(PublishedMarkOf(StatePath()));
  ReplacePrivateFile(ModuleMarkOf(StatePath()), "");
  Publish(running);
}

void EndPublishing() {
  Remove(ModuleMarkOf(StatePath()));
  Remove(PublishedMarkOf(StatePath()));
}

void PublishCommitted() {
  if (!StateBase::TakeCommitForModule()) return;
  if (IsStateOfModule()) PublishToRunning();
}

CommitFollower::CommitFollower() noexcept { ++holders; }

CommitFollower::~CommitFollower() {
  if (--holders != 0) return;
  const ErrnoGuard guard;
  try {
    PublishCommitted();
  } catch (const Braxo::Lib::BraxoException& failure) {
    LogFailure(failure.what());
  }
}

HeldPublication::HeldPublication() noexcept { ++holders; }

HeldPublication::~HeldPublication() { --holders; }

}  // namespace LinuxHost
