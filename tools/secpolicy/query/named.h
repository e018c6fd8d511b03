#pragma once

#include <optional>
#include <string>

#include "policy/installed_policy.h"
#include "secpolicy/secpolicy.h"

// What people name by its name or its number. A name counts before a number that is written the
// same. What returns no optional throws QuestionError, with the nearest name, when there is no such
// thing.
namespace SecPolicyCli {

// Why `name` cannot name a new domain where people type it; empty when it can. Programs may give
// domains any names.
std::string WhyNoDomainName(const std::string& name);

struct NamedDomain {
  unsigned int id = 0;
  std::string name;
};

NamedDomain FindDomain(const std::string& word, SecPolicy::TeskAccessInterfaceImpl& access);

// The installed domain with this name or number, with its rules.
Policy::InstalledDomain RequireInstalledDomain(const std::string& word,
                                               SecPolicy::TeskAccessInterfaceImpl& access);

// The number that the word is in decimal; nothing when it is none.
std::optional<unsigned int> ReadNumber(const std::string& word);

// The name of the object label with the number `word`; nothing when there is none.
std::optional<std::string> FindObjectByNumber(const std::string& word,
                                              SecPolicy::TeskAccessInterfaceImpl& access);

// The name of an object label.
std::string FindObject(const std::string& word, SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
