#include "broker.h"

#include <fcntl.h>
#include <unistd.h>

#include <exception>
#include <iostream>
#include <utility>

#include "enforce/entry.h"
#include "enforce/launcher.h"
#include "enforce/transition.h"
#include "host/enforce/broker/broker.h"
#include "host/enforce/broker/seen_file.h"
#include "host/linux/common/host_error.h"
#include "observe/watch.h"

namespace SecPolicyCli {
namespace {

using Enforce::AskedEntry;

constexpr char kVerb[] = "exec";

// Of who asked, as this process sees it.
void EnterDirectory(const Enforce::FileDescriptor& directory) {
  const Enforce::SeenFile seen =
      Enforce::SeeAgain(directory.Number(), ProcDirectory(), O_PATH | O_DIRECTORY);
  if (seen.file.IsOpen() && fchdir(seen.file.Number()) == 0) return;
  throw Braxo::Lib::BraxoException("the working directory is not to be seen from outside");
}

ExitCode EnterFor(const DomainReference& asker, const AskedEntry& asked) {
  const auto find = [&](auto& access) {
    EnterDirectory(asked.directory);
    return EntryByBroker(asked, asker, access);
  };
  return EnterDomain(kVerb, find, {});
}

}  // namespace

Enforce::FileDescriptor KeepBroker(const Enforce::Plan& plan) {
  if (!plan.keepsBroker || ProcDirectory() < 0) return {};
  const DomainReference asker = {plan.domainId, plan.domain};
  const Enforce::Brokerage brokerage = {
      .procDirectory = ProcDirectory(),
      .enter = [&](const AskedEntry& asked) { return EnterFor(asker, asked); }};
  return Enforce::StartBroker(brokerage);
}

}  // namespace SecPolicyCli
