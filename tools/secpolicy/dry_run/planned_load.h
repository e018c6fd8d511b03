#pragma once

#include <string>

#include "json.h"
#include "load/load_run.h"
#include "verb.h"

namespace SecPolicyCli {

struct PlanOptions {
  std::string format;    // "text" or "json"
  bool showAll = false;  // every file whose label would change, however many
  Json bundle;           // what programs are told of the bundle that would be loaded, if it is one
};

// Prints to standard output what the load would change, and changes nothing. The
// problems that the load would report are reported too. Returns how the load would end.
ExitCode PlanLoad(const LoadRequest& load, const PlanOptions& options);

}  // namespace SecPolicyCli
