#include "named.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <optional>
#include <utility>
#include <vector>

#include "installed/installed_policy.h"
#include "policy/limits.h"
#include "question.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

constexpr auto kObjects = TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;

// Empty when there is none.
std::string NameOfDomain(unsigned int id) {
  try {
    return SecPolicy::GetDomainNameForID(id);
  } catch (const Braxo::Lib::BraxoException&) {
    return "";
  }
}

}  // namespace

// What can stand in a rule, be a file, and is on a command line what it is.
std::string WhyNoDomainName(const std::string& name) {
  const auto isLetter = [](unsigned char letter) { return std::isalnum(letter) != 0; };
  const bool isWord = std::ranges::all_of(name, [&](unsigned char letter) {
    return isLetter(letter) || letter == '_' || letter == '-' || letter == '.';
  });
  const bool isName = isWord && !name.empty() && isLetter(static_cast<unsigned char>(name[0]));
  if (!isName || name.size() > Policy::kLongestDomainName) {
    return "'" + name + "' is no name: letters, digits and '_', '-', '.' behind the first, " +
           std::to_string(Policy::kLongestDomainName) + " at most";
  }
  return ReadNumber(name) ? "'" + name + "' is no name: it would be taken for a number" : "";
}

std::optional<unsigned int> ReadNumber(const std::string& word) {
  unsigned int number = 0;
  const char* const end = word.data() + word.size();
  const auto read = std::from_chars(word.data(), end, number);
  if (read.ec != std::errc() || read.ptr != end) return std::nullopt;
  return number;
}

NamedDomain FindDomain(const std::string& word, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (access.FindDomain(word, &id)) return {id, word};
  if (const auto number = ReadNumber(word)) {
    const std::string name = NameOfDomain(*number);
    if (!name.empty()) return {*number, name};
  }
  RefuseDomain(word, access);
}

Policy::InstalledDomain RequireInstalledDomain(const std::string& word,
                                               TeskAccessInterfaceImpl& access) {
  auto domain = ReadInstalledDomain(FindDomain(word, access).name, access);
  // Destroyed in between.
  if (!domain) RefuseDomain(word, access);
  return std::move(*domain);
}

std::optional<std::string> FindObjectByNumber(const std::string& word,
                                              TeskAccessInterfaceImpl& access) {
  const auto number = ReadNumber(word);
  if (!number) return std::nullopt;
  for (const auto& [name, id] : access.GetKeywordsMap(kObjects)) {
    if (id == static_cast<long>(*number)) return name;
  }
  return std::nullopt;
}

std::string FindObject(const std::string& word, TeskAccessInterfaceImpl& access) {
  const auto objects = access.GetKeywordsMap(kObjects);
  if (objects.contains(word)) return word;
  if (const auto name = FindObjectByNumber(word, access)) return *name;
  std::vector<std::string> names;
  names.reserve(objects.size());
  for (const auto& [name, id] : objects) names.push_back(name);
  RefuseWord("object", word, names);
}

}  // namespace SecPolicyCli
