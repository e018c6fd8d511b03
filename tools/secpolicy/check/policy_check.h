#pragma once

#include <istream>
#include <string>
#include <vector>

#include "diagnostic.h"

namespace SecPolicyCli {

// What is to be checked, and how.
struct CheckRequest {
  std::string path;                   // a policy directory, or a file in one
  bool fresh = false;                 // as after a boot, whatever is installed
  std::istream* content = nullptr;    // what the file holds, if not what it holds
  std::vector<std::string> unwanted;  // the names of the warnings to leave out
};

struct CheckReport {
  DiagnosticList diagnostics;  // in their order; none of them is shown yet
  std::string whyFresh;        // why it was checked as after a boot although nobody asked; or empty
};

// Reads the policy as a load would, against a copy of what is installed, and finds its problems.
// Of a file, only its own are told. Throws NoSuchPolicy where there is nothing
// to check, and what the host throws.
CheckReport CheckPolicy(const CheckRequest& request);

}  // namespace SecPolicyCli
