#pragma once

#include <string>
#include <vector>

#include "host/linux/operation/policy_load.h"
#include "load/load_listener.h"

namespace SecPolicyCli {

// How a load ended: "done", "failed" or "stopped", with the messages of its errors.
struct RecordedLoad {
  std::string verb;
  std::string policyDir;
  std::string ending;
  std::vector<std::string> errors;

  // Files get their labels next: until that is recorded, this is a load that died meanwhile.
  bool labelsFollow = false;
};

// The directory under a name that means the same from everywhere and does not vary with the way it
// was typed.
std::string CanonicalName(const std::string& dir);

// Keeps in the host's state, for the verbs that explain it, how a load that installed something
// ended, and where those rules and file labels are written that are in no file of a domain. That it
// cannot be kept, for whatever reason, is said on standard error, unless the load did not end well
// either; nothing is thrown.
void RecordLoad(const RecordedLoad& load, const LinuxHost::LoadEnding& ending,
                const LoadListener& listener);

// Keeps that the labels, which were to follow, are given, unless another load was recorded since.
// What fails is said as by RecordLoad.
void RecordLabelled(const RecordedLoad& load, const LinuxHost::LoadEnding& ending);

// Keeps, for `status`, that the full policy in `dir` is what is installed, all of it or not.
// Nothing is thrown: what cannot be kept is not claimed.
void RecordInstalledPolicy(const std::string& dir, bool isWhole);

// Keeps how a load ended that installed nothing. Throws what the host throws.
void RecordEnding(const RecordedLoad& load);

// Keeps, for `status`, that the saved state `name` was put back. That it cannot be kept is said on
// standard error; nothing is thrown.
void RecordRollback(const std::string& name);

}  // namespace SecPolicyCli
