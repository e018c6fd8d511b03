#pragma once

#include <string>
#include <vector>

namespace CLI {
class App;
class Error;
}  // namespace CLI

namespace SecPolicyCli {

// The names of the verbs, or of the kinds of a verb.
std::vector<std::string> SubcommandNames(const CLI::App& app);

// What was asked for, with the kind of a verb: "secpolicy label get".
std::string CommandOf(const CLI::App& app);

// The message for a command line that cannot be understood, and where to read on.
std::string ExplainUsage(const CLI::App* app, const CLI::Error& error);

}  // namespace SecPolicyCli
