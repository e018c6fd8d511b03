#include "enforce/environment.h"

#include <unistd.h>

#include <set>

#include "host/enforce/broker/message.h"

namespace SecPolicyCli {
namespace {

std::string NameOf(const std::string& variable) { return variable.substr(0, variable.find('=')); }

}  // namespace

std::vector<std::string> EnvironmentOf(const Entry& entry) {
  std::vector<std::string> variables = entry.environment;
  std::set<std::string> names = {Enforce::kBrokerVariable};
  for (const std::string& variable : variables) names.insert(NameOf(variable));
  for (char* const* variable = environ; *variable != nullptr; ++variable) {
    if (!names.contains(NameOf(*variable))) variables.emplace_back(*variable);
  }
  return variables;
}

std::vector<char*> PointersTo(std::vector<std::string>& words) {
  std::vector<char*> pointers;
  pointers.reserve(words.size() + 1);
  for (std::string& word : words) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  return pointers;
}

}  // namespace SecPolicyCli
