#pragma once

#include <map>
#include <memory>
#include <string>

// Plans of domains as files in the directory `plans` beside the state, which everybody may read and
// only who may write the state writes: so that those enter domains who may not read the state. They
// count until the state changes; placing a world in a domain is no change.
namespace LinuxHost {

class HostState;

// New plans, of the state in use as it is from here on. Those that were published before count no
// more, and of several that are in the making only the latest is published.
class PlansInTheMaking {
 public:
  // Makes their directory. Throws HostError when it cannot be written.
  PlansInTheMaking();

  // A number that no other plans have, which the maker has to put into these.
  const std::string& Serial() const { return serial; }

  // Writes `plans`, by the names of their domains, in place of all that were published before, and
  // a copy of the state beside them. Makes the directory that world_records.h is about. Returns
  // false, and publishes nothing, when the state was changed meanwhile, or others are in the
  // making. Throws HostError when they cannot be written: none count then.
  bool Publish(const std::map<std::string, std::string>& plans);

 private:
  bool IsLatest() const;

  const std::shared_ptr<HostState> state;
  const std::string serial;
};

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
