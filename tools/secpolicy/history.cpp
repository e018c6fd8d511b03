#include <algorithm>
#include <exception>
#include <iomanip>
#include <iostream>

#include "ending.h"
#include "saved/saved_state.h"
#include "scratch/scratch_state.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

std::string Describe(const Policy::InstalledPolicy& policy) {
  std::size_t rules = 0;
  for (const Policy::InstalledDomain& domain : policy.domains) rules += domain.rules.size();
  return CountOf(policy.domains.size(), "domain") + ", " + CountOf(rules, "rule");
}

// What is saved, or why it cannot be used; `isUsable` becomes false then.
std::string DescribeSaved(const std::string& name, bool& isUsable) {
  try {
    return Describe(ReadStateAt(SavedStatePath(name), LinuxHost::CopyOf::kSavedState));
  } catch (const std::exception& failure) {
    isUsable = false;
    return failure.what();
  }
}

ExitCode ShowHistory() {
  const std::vector<SavedState> states = ListSavedStates();
  std::size_t width = 0;
  for (const SavedState& state : states) width = std::max(width, state.name.size());
  bool allUsable = true;
  for (const SavedState& state : states) {
    std::cout << std::left << std::setw(static_cast<int>(width)) << state.name << "  "
              << UtcTime(state.time) << "  " << Visible(DescribeSaved(state.name, allUsable))
              << '\n';
  }
  Summarize("history", states.empty() ? "nothing is saved" : CountOf(states.size(), "saved state"));
  return allUsable ? kWell : kFailed;
}

Action Define(Syntax&) {
  return [] { return RunOrRefuse("history", ShowHistory); };
}

}  // namespace

const Verb kHistory = {
    "history", "List the saved states",
    "Prints the saved states, the oldest first: name, when it was saved (UTC), and how many "
    "domains\n"
    "and rules it holds. One that can no longer be used says why, and the exit status is 1.\n"
    "They lie in /var/lib/secpolicy/saved: to be rid of one, remove its file.\n"
    "\n"
    "Examples:\n"
    "  secpolicy history\n"
    "  secpolicy diff nightly installed     what happened since that one?",
    Define};

}  // namespace SecPolicyCli
