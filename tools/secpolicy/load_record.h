#pragma once

#include <string>
#include <vector>

namespace SecPolicyCli {

// Keeps in the host's state, for the verbs that explain it, how a load ended and where the rules
// and the file labels of its policy are written. `ending` is "done", "failed" or "stopped";
// `errors` are the messages of the load. That it cannot be kept, for whatever reason, is said on
// standard error, unless the load did not end well either; nothing is thrown.
void RecordLoad(const std::string& verb, const std::string& policyDir, const std::string& ending,
                const std::vector<std::string>& errors);

// Keeps, for `status`, that the saved state `name` was put back. That it cannot be kept is said on
// standard error; nothing is thrown.
void RecordRollback(const std::string& name);

}  // namespace SecPolicyCli
