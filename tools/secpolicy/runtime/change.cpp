#include "change.h"

#include <climits>
#include <memory>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "enforce/published.h"
#include "query/question.h"
#include "root.h"

namespace SecPolicyCli {
namespace {

// A cause that cannot be found out is no second failure.
std::string Advise(const std::function<std::string()>& whyNot) {
  try {
    const std::string advice = AdviseOnPrivilege();
    return advice.empty() ? whyNot() : advice;
  } catch (const Braxo::Lib::BraxoException&) {
    return AdviseOnPrivilege();
  }
}

}  // namespace

ExitCode Change(const std::string& verb, const std::function<void()>& change,
                const std::function<std::string()>& whyNot) {
  return CallLibrary(
      verb,
      [&](ErrorList&) {
        change();
        PublishPlansOrTell(verb);
      },
      [&] { return Advise(whyNot); });
}

std::shared_ptr<const std::string> AddDomain(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  syntax.AddOption("DOMAIN", *domain, "The name of a domain, or its number").Require();
  return domain;
}

bool ReadGrant(const std::string& word) {
  if (word == "grant" || word == "revoke") return word == "grant";
  throw QuestionError("'" + word + "' is neither grant nor revoke");
}

int ReadProcess(const std::string& word) {
  const auto process = ReadNumber(word);
  if (process && *process > 0 && *process <= INT_MAX) return static_cast<int>(*process);
  throw QuestionError("'" + word + "' is not the number of a process");
}

NumberedWord FindNumberedWord(Policy::WordKind kind, const std::string& word,
                              SecPolicy::TeskAccessInterfaceImpl& access) {
  const std::string found = FindWord(kind, word, access);
  const auto number = access.GetKeywordsMap(*FormOf(kind).table).at(found);
  return {found, static_cast<unsigned int>(number)};
}

}  // namespace SecPolicyCli
