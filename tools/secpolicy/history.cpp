#include <algorithm>
#include <exception>
#include <iomanip>
#include <iostream>

#include "command_line.h"
#include "ending.h"
#include "json.h"
#include "saved/saved_state.h"
#include "scratch/scratch_state.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// A saved state, and what is in it.
struct Entry {
  SavedState state;
  std::size_t domains = 0;
  std::size_t rules = 0;
  std::string problem;  // why it cannot be used; empty when it can
};

Entry ReadEntry(const SavedState& state) {
  Entry entry;
  entry.state = state;
  try {
    const auto policy = ReadStateAt(SavedStatePath(state.name), LinuxHost::CopyOf::kSavedState);
    entry.domains = policy.domains.size();
    for (const Policy::InstalledDomain& domain : policy.domains) entry.rules += domain.rules.size();
  } catch (const std::exception& failure) {
    entry.problem = failure.what();
  }
  return entry;
}

void WriteText(const std::vector<Entry>& entries) {
  std::size_t width = 0;
  for (const Entry& entry : entries) width = std::max(width, entry.state.name.size());
  for (const auto& [state, domains, rules, problem] : entries) {
    std::cout << std::left << std::setw(static_cast<int>(width)) << state.name << "  "
              << UtcTime(state.time) << "  "
              << (problem.empty() ? CountOf(domains, "domain") + ", " + CountOf(rules, "rule")
                                  : Visible(problem))
              << '\n';
  }
}

void WriteJson(const std::vector<Entry>& entries) {
  Json states = Json::Array();
  for (const auto& [state, domains, rules, problem] : entries) {
    Json json = {{"name", state.name}, {"time", IsoTime(state.time)}};
    if (problem.empty()) {
      json.Add({{"domains", domains}, {"rules", rules}});
    } else {
      json["problem"] = problem;
    }
    states.Append(json);
  }
  std::cout << Json{{"schema", "secpolicy.history/1"}, {"states", states}}.Text();
}

ExitCode ShowHistory(const std::string& format) {
  std::vector<Entry> entries;
  for (const SavedState& state : ListSavedStates()) entries.push_back(ReadEntry(state));
  (format == "json" ? WriteJson : WriteText)(entries);
  Summarize("history",
            entries.empty() ? "nothing is saved" : CountOf(entries.size(), "saved state"));
  const bool allUsable = std::ranges::all_of(entries, &std::string::empty, &Entry::problem);
  return allUsable ? kWell : kFailed;
}

Action Define(Syntax& syntax) {
  const auto format = std::make_shared<std::string>();
  syntax.AddFormat(*format, "the list", {"text", "json"});
  return [format] { return ShowHistory(*format); };
}

}  // namespace

const Verb kHistory = {
    "history",
    "List the saved states",
    "Prints the saved states, the oldest first: name, when it was saved (UTC), and how many "
    "domains\n"
    "and rules it holds. One that can no longer be used says why, and the exit status is 1.\n"
    "'saved' shows what one holds, and deletes it.\n"
    "\n"
    "Examples:\n"
    "  secpolicy history\n"
    "  secpolicy history --format json | jq -r '.states[-1].name'\n"
    "  secpolicy diff nightly installed     what happened since that one?",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
