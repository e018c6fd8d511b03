#include "named.h"

#include <charconv>
#include <optional>
#include <vector>

#include "question.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

std::optional<unsigned int> ReadNumber(const std::string& word) {
  unsigned int number = 0;
  const char* const end = word.data() + word.size();
  const auto read = std::from_chars(word.data(), end, number);
  if (read.ec != std::errc() || read.ptr != end) return std::nullopt;
  return number;
}

// Empty when there is none.
std::string NameOfDomain(unsigned int id) {
  try {
    return SecPolicy::GetDomainNameForID(id);
  } catch (const Braxo::Lib::BraxoException&) {
    return "";
  }
}

}  // namespace

NamedDomain FindDomain(const std::string& word, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (access.FindDomain(word, &id)) return {id, word};
  if (const auto number = ReadNumber(word)) {
    const std::string name = NameOfDomain(*number);
    if (!name.empty()) return {*number, name};
  }
  RefuseDomain(word, access);
}

std::string FindObject(const std::string& word, TeskAccessInterfaceImpl& access) {
  const auto objects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  if (objects.contains(word)) return word;
  const auto number = ReadNumber(word);
  std::vector<std::string> names;
  for (const auto& [name, id] : objects) {
    if (number && id == static_cast<long>(*number)) return name;
    names.push_back(name);
  }
  RefuseWord("object", word, names);
}

}  // namespace SecPolicyCli
