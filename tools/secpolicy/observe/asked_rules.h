#pragma once

#include <optional>
#include <string>
#include <vector>

#include "policy/decision.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The question with the label of its file, or of the directory that it is made in; a file that is
// not there yet has that of its directory. Other questions are as they were.
Policy::Question WithLabel(Policy::Question question, SecPolicy::TeskAccessInterfaceImpl& access);

// The question about a capability that does what the one that is asked about is for, too; nothing
// where there is none.
std::optional<Policy::WordsQuestion> WiderCapability(const Policy::WordsQuestion& asked);

// True when rules grant it, or a wider capability.
bool IsGranted(const Policy::Question& question, const Policy::InstalledDomain& domain);

// The question as 'why' is asked it: "read", "/etc/shadow".
std::vector<std::string> WordsOf(const Policy::Question& question);

// The same as one text.
std::string TextOf(const Policy::Question& question);

// The directory that a path is in.
std::string DirectoryOf(const std::string& path);

}  // namespace SecPolicyCli
