#pragma once

#include <string>
#include <vector>

#include "host/enforce/module/map_entries.h"
#include "policy/decision.h"

namespace Enforce {

// What numbers of an event stand for, as far as there is somebody who knows.
struct EventNames {
  std::string label = {};               // of the file; empty when it has none
  bool labelIsBuiltIn = false;          // as in Policy::FileQuestion
  std::string domain = {};              // that was to be entered
  std::vector<Policy::Rule> ways = {};  // into it
};

// True for what no rule grants: what is refused in any domain, and sockets past the checks of
// ports.
bool IsOfNoRule(const ModuleEvent& event);

// What the rules were asked, of the file at `path`, which is empty where it is not known: of a file
// a question for each use, any of which may be the refused one. None for what is of no rule, and
// for what there is no word for.
std::vector<Policy::Question> QuestionsOf(const ModuleEvent& event, const std::string& path,
                                          const EventNames& names);

}  // namespace Enforce
