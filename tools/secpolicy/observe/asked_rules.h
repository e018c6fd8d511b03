#pragma once

#include <string>

#include "policy/decision.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The question with the label of its file, or of the directory that it is made in; a file that is
// not there yet has that of its directory. Other questions are as they were.
Policy::Question WithLabel(Policy::Question question, SecPolicy::TeskAccessInterfaceImpl& access);

// The question as 'why' is asked it: "read /etc/shadow".
std::string TextOf(const Policy::Question& question);

// The directory that a path is in.
std::string DirectoryOf(const std::string& path);

}  // namespace SecPolicyCli
