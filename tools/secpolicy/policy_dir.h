#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "command_line.h"

namespace SecPolicyCli {

// Adds the argument DIR, a policy directory, to `syntax`; its value is `preset` when it is not
// given.
std::shared_ptr<const std::string> AddPolicyDir(Syntax& syntax, const std::string& preset);

// Adds the flag --keep of a load to `syntax`.
Option AddKeep(Syntax& syntax, bool& keep);

// Adds the flag --timing to `syntax`.
Option AddTiming(Syntax& syntax, bool& timing);

// What may be meant by the path of a policy that is not there, as a sentence with a blank before
// it; nothing when that cannot be told.
std::string AdviseOnMissing(const std::string& path);

// Refuses a policy directory that is not there; nothing for one that is.
std::optional<ExitCode> RefuseMissingDir(const std::string& verb, const std::string& dir);

// The file that a load of the policy directory `policyDir` takes the domain's policy from.
std::string DomainFile(std::string_view domain, const std::string& policyDir);

// The domain whose policy the file of a policy directory holds; empty for other files.
std::string DomainOfFile(const std::string& file);

}  // namespace SecPolicyCli
