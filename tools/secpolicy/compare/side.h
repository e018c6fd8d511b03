#pragma once

#include <map>
#include <optional>
#include <stdexcept>
#include <string>

#include "installed/installed_policy.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

// What the user names is not there.
class NoSuchPolicy : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// There is no installed state.
class NothingInstalled : public NoSuchPolicy {
 public:
  using NoSuchPolicy::NoSuchPolicy;
};

// The files of a policy directory have errors.
class BadPolicy : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// One of two policies that are compared.
struct Side {
  std::string name;  // as the user gave it
  Policy::InstalledPolicy policy;

  // Of a policy directory, what its lines label; nothing for a state, which keeps no such lines.
  std::optional<std::map<std::string, std::string>> labels;
};

// Reads what `name` means: a policy directory, when it has a slash; "installed"; or a saved state
// or, where there is none of that name, a policy directory. Nothing is changed, and nothing logged.
// `observer` is told of what is wrong with the files of a directory. Throws NoSuchPolicy,
// BadPolicy, and std::runtime_error when it cannot be read.
Side ReadSide(const std::string& name, SecPolicy::PolicyObserver& observer);

}  // namespace SecPolicyCli
