#pragma once

#include <functional>
#include <string>
#include <vector>

#include "host/linux/operation/policy_load.h"
#include "load/load_timing.h"
#include "load/load_watcher.h"
#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {

// The files of one kind, and the library call that installs them.
struct LoadStep {
  LinuxHost::LoadKind kind;
  std::string directory;
  void (*load)(const std::string& directory, SecPolicy::PolicyObserver& observer);
  std::string partnersDirectory = SecPolicy::kPartnerDomainsDir;
};

struct LoadRequest {
  std::string verb;
  std::string policyDir;  // what messages and records name
  std::vector<LoadStep> steps;
  bool keep = false;          // what no file has any more
  bool allOrNothing = false;  // installs nothing after an error
  bool timing = false;        // prints the time of each phase
  bool dryRun = false;        // who asks has put copies in place of all that a load changes

  LoadWatcher* watcher = nullptr;  // if anybody wants to be told

  // What makes a state usable that is not, if anything can.
  std::function<void()> mend;

  // What acts on files before anything is installed, and what is the first to be installed, if any.
  std::function<void(LoadTiming& timing)> prepare;
  std::function<void()> begin;

  // Takes back what `begin` did, when nothing was installed, if anything is to be taken back.
  std::function<void()> undo = nullptr;

  // The bundle whose files are in the directory for this load, if that is how it comes there, and
  // what puts them into another directory for a dry run.
  std::string bundle = {};
  std::function<void(const std::string& directory)> unpack = nullptr;
};

// Takes the steps as one load: others see what was installed before, or all of it. Ends with one
// summary line on standard error; after a load that did not end well, it is preceded by the files
// that failed and by what is installed. An error that the library reports counts as a failure even
// when its call returns normally.
//
// What no file has any more is removed when the load ends well, unless it is to be kept.
//
// When the library ends the process because a well-known domain is missing, nothing is installed,
// the summary says so, and the process exits with kStopped.
ExitCode RunLoad(const LoadRequest& request);

}  // namespace SecPolicyCli
