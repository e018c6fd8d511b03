#pragma once

#include <map>
#include <string>

#include "host/linux/operation/change_mark.h"

// Plans of domains as files in the directory `plans` beside the state, which everybody may read and
// only who may write the state writes: so that those enter domains who may not read the state. They
// count until the state changes; placing a world in a domain is no change.
namespace LinuxHost {

// Writes `plans`, by the names of their domains, in place of all that were published before, and a
// copy of the state beside them. Those count that carry the number `serial`, which is the maker's
// to put into them. Makes their directory, and the one that world_records.h is about. Returns
// false, and publishes nothing, when the state was changed since `since`. Throws HostError when
// they cannot be written: none count then.
bool PublishPlans(const ChangeMark& since, const std::string& serial,
                  const std::map<std::string, std::string>& plans);

// A number that no other published plans have.
std::string NewPlanSerial();

// True while those that were published count.
bool ArePlansPublished();

// The number that plans carry which are of the state as it is. Throws HostError, with what to do,
// where there are none.
std::string PublishedSerial();

// The file of the plan of a domain, whatever letters its name has.
std::string PlanFileOf(const std::string& domain);

// What the file holds. Throws HostError, with what to do, when there is none, it cannot be read, or
// others than its owner, who is the superuser or this user, may have written it.
std::string ReadPublishedPlan(const std::string& domain);

// Throws HostError for a published plan of which its reader finds that it is not to be used.
[[noreturn]] void RefusePublishedPlan(const std::string& domain, const std::string& reason);

// Copies the state as of the published plans to the new file `to`. Throws HostError.
void CopyPublishedState(const std::string& to);

}  // namespace LinuxHost
