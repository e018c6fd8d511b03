#include "host/enforce/launcher/ruleset.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

Kernel::RulesetAttributes AttributesOf(const Plan& plan) {
  Kernel::RulesetAttributes attributes;
  attributes.handledFiles = plan.handledFiles;
  if (plan.bindsChecked) attributes.handledPorts |= Kernel::kBindPort;
  if (plan.connectsChecked) attributes.handledPorts |= Kernel::kConnectPort;
  if (plan.isScoped) attributes.scopes = Kernel::kScopeAbstractSockets | Kernel::kScopeSignals;
  return attributes;
}

bool IsEmpty(const Kernel::RulesetAttributes& attributes) {
  return (attributes.handledFiles | attributes.handledPorts | attributes.scopes) == 0;
}

void RequireVersion(const Kernel::RulesetAttributes& attributes) {
  const int version = Kernel::LandlockVersion();
  const bool knowsAll = (attributes.handledFiles & ~Landlock::AllRights(version)) == 0 &&
                        (attributes.handledPorts == 0 || version >= Kernel::kPortsVersion) &&
                        (attributes.scopes == 0 || version >= Kernel::kScopesVersion);
  if (knowsAll) return;
  Refuse("the plan needs more of Landlock than version " + std::to_string(version) +
         ", which this kernel has. 'secpolicy run' makes one for this kernel");
}

bool IsAway(int error) {
  return error == ENOENT || error == ENOTDIR || error == ELOOP || error == EACCES;
}

// The descriptor of the place; -1 where there is nothing and need not be anything.
int OpenPlaceOf(const PathRight& right) {
  const int place = Kernel::OpenPlace(right.path.c_str());
  if (place >= 0) return place;
  if (right.mayBeMissing && IsAway(errno)) return -1;
  if (errno == ENOENT) {
    Refuse("the plan is stale: " + right.path + " is gone. 'secpolicy run' makes a new one");
  }
  if (errno == ELOOP) {
    Refuse("the plan is stale: " + right.path +
           " leads through a link. 'secpolicy run' makes a new one");
  }
  RefuseForErrno("cannot use the path " + right.path + " of the plan");
}

void AddPath(int ruleset, const PathRight& right) {
  const int place = OpenPlaceOf(right);
  if (place < 0) return;
  struct stat status = {};
  const bool isKnown = fstat(place, &status) == 0;
  const bool isDirectory = isKnown && S_ISDIR(status.st_mode);
  const std::uint64_t rights = isDirectory ? right.rights : right.rights & Landlock::kOfFiles;
  if (!isKnown || (rights != 0 && Kernel::AddPath(ruleset, place, rights) != 0)) {
    RefuseForErrno("cannot use the path " + right.path + " of the plan");
  }
  close(place);
}

void AddPorts(int ruleset, const std::vector<std::uint16_t>& ports, std::uint64_t right) {
  for (const std::uint16_t port : ports) {
    if (Kernel::AddPort(ruleset, port, right) != 0) {
      RefuseForErrno("cannot use the port " + std::to_string(port) + " of the plan");
    }
  }
}

}  // namespace

int PrepareRuleset(const Plan& plan) {
  const Kernel::RulesetAttributes attributes = AttributesOf(plan);
  if (IsEmpty(attributes)) return -1;
  RequireVersion(attributes);
  const int ruleset = Kernel::CreateRuleset(attributes);
  if (ruleset < 0) RefuseForErrno("cannot use Landlock");
  for (const PathRight& right : plan.paths) AddPath(ruleset, right);
  AddPorts(ruleset, plan.bindPorts, Kernel::kBindPort);
  AddPorts(ruleset, plan.connectPorts, Kernel::kConnectPort);
  return ruleset;
}

}  // namespace Enforce
