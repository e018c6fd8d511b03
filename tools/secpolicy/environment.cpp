#include "environment.h"

#include <unistd.h>

namespace SecPolicyCli {
namespace {

std::string NameOf(const std::string& variable) { return variable.substr(0, variable.find('=')); }

}  // namespace

std::vector<std::string> EnvironmentWith(std::vector<std::string> variables,
                                         std::set<std::string> dropped) {
  for (const std::string& variable : variables) dropped.insert(NameOf(variable));
  for (char* const* variable = environ; *variable != nullptr; ++variable) {
    if (!dropped.contains(NameOf(*variable))) variables.emplace_back(*variable);
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
