#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "policy/installed_policy.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "runtime/change.h"
#include "secpolicyhost/mode_param.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccess_ModeParam;
using SecPolicy::TeskAccess_ParamCheck;
using SecPolicy::TeskAccessInterfaceImpl;

// The check and the numbers of a rule, as they are typed.
struct CheckedNumbers {
  std::string word;
  TeskAccess_ParamCheck check;
  TeskAccess_ModeParam numbers;
};

CheckedNumbers ReadNumbers(const std::string& check, const std::vector<std::string>& numbers,
                           TeskAccessInterfaceImpl& access) {
  const auto number = TeskAccess_ParamCheck{
      FindNumberedWord(Policy::WordKind::kParameterCheck, check, access).number};
  if (check == Policy::kMaskCheck && numbers.size() > 1) {
    throw QuestionError(check + " takes one number, of all bits that it is about");
  }
  try {
    const auto range =
        Policy::ParseParameterRange(numbers.front(), numbers.size() > 1 ? numbers.back() : "");
    return {check, number, {range.first, range.last}};
  } catch (const Braxo::Lib::BraxoException& failure) {
    throw QuestionError(failure.what());
  }
}

ExitCode Set(const std::string& word, const std::string& check, std::vector<std::string> words) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  if (words.size() < 2 || words.size() > 3) {
    throw QuestionError("write: DOMAIN CHECK FIRST [LAST] grant, or revoke");
  }
  const bool grant = ReadGrant(words.back());
  words.pop_back();
  const CheckedNumbers rule = ReadNumbers(check, words, access);
  return Change("param-check set", [&] {
    SecPolicy::SetParamCheckRule(domain.id, rule.check, &rule.numbers, grant ? 1 : 0);
  });
}

Action DefineSet(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto check = std::make_shared<std::string>();
  const auto words = std::make_shared<std::vector<std::string>>();
  syntax.AddOption("CHECK", *check, "The parameter check, as 'secpolicy words checks' lists it")
      .Require();
  syntax
      .AddList("NUMBER", *words,
               "A number, or the first and the last of a range; then grant or revoke")
      .Require();
  return [=] { return Ask("param-check set", [=] { return Set(*domain, *check, *words); }); };
}

// The rules that there are for the check.
std::string WhyNotRemoved(const NamedDomain& domain, const CheckedNumbers& wanted) {
  TeskAccessInterfaceImpl access;
  const auto installed = Policy::ReadDomain(access, domain.id);
  std::vector<std::string> rules;
  for (const Policy::Rule& rule : installed ? installed->rules : std::vector<Policy::Rule>{}) {
    const bool isOfCheck =
        rule.kind == Policy::RuleKind::kParameterCheck && rule.words[0] == wanted.word;
    if (isOfCheck) rules.push_back("'" + rule.Text() + "'");
  }
  if (rules.empty()) return domain.name + " has no rule for " + wanted.word;
  return "A rule is removed by its very numbers; " + domain.name + " has " + ListOf(rules, "and");
}

ExitCode Remove(const std::string& word, const std::string& check,
                const std::vector<std::string>& numbers) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  if (numbers.back() == "grant" || numbers.back() == "revoke") {
    throw QuestionError("a rule is removed by its numbers alone, without '" + numbers.back() + "'");
  }
  if (numbers.size() > 2) throw QuestionError("write: DOMAIN CHECK FIRST [LAST]");
  const CheckedNumbers rule = ReadNumbers(check, numbers, access);
  return Change(
      "param-check remove",
      [&] { SecPolicy::RemoveParamCheckRule(domain.id, rule.check, &rule.numbers); },
      [&] { return WhyNotRemoved(domain, rule); });
}

Action DefineRemove(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto check = std::make_shared<std::string>();
  const auto numbers = std::make_shared<std::vector<std::string>>();
  syntax.AddOption("CHECK", *check, "The parameter check, as 'secpolicy words checks' lists it")
      .Require();
  syntax.AddList("NUMBER", *numbers, "The number, or the first and the last of a range").Require();
  return
      [=] { return Ask("param-check remove", [=] { return Remove(*domain, *check, *numbers); }); };
}

const Kind kSet = {
    "set", "Set a rule for a parameter check of a domain",
    "As the line '-p CHECK FIRST [LAST] grant' of a policy file does, or revoke. One for the same\n"
    "numbers goes. Numbers are decimal, or hexadecimal with 0x.\n"
    "\n"
    "Examples:\n"
    "  secpolicy param-check set job7 bind_port 80 grant\n"
    "  secpolicy param-check set job7 bind_port 8000 8099 grant\n"
    "  secpolicy param-check set job7 clone_flags 0x10000000 revoke",
    DefineSet};

const Kind kRemove = {"remove", "Remove a rule for a parameter check of a domain",
                      "Removes the rule for just these numbers, whether it grants or revokes them. "
                      "When the last grant\n"
                      "of a check goes, every value passes that none revokes. What a policy file "
                      "says comes back with\n"
                      "the next load.\n"
                      "\n"
                      "Example:\n"
                      "  secpolicy param-check remove job7 bind_port 8000 8099",
                      DefineRemove};

Action Define(Syntax& syntax) { return syntax.AddKinds(std::vector<Kind>{kSet, kRemove}); }

}  // namespace

const Verb kParamCheck = {
    "param-check", "Set and remove parameter checks of domains while the system runs",
    "What services do by the library's runtime interface. A DOMAIN is its name or its number. "
    "What\n"
    "is changed counts at once for who enters the domain, and until the next boot; 'secpolicy why\n"
    "DOMAIN pass CHECK NUMBER' says what passes.\n"
    "\n"
    "Examples:\n"
    "  secpolicy param-check set job7 bind_port 80 grant\n"
    "  secpolicy param-check remove job7 bind_port 80",
    Define};

}  // namespace SecPolicyCli
