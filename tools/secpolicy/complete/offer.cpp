#include "offer.h"

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <map>
#include <system_error>

#include "braxo/lib/exception.h"
#include "check/diagnostic.h"
#include "host/linux/operation/host_words.h"
#include "host/linux/operation/state_use.h"
#include "policy/call_set.h"
#include "policy/level.h"
#include "query/question.h"
#include "saved/saved_state.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;
using Words = std::vector<std::string>;

Offer OfferOf(const Words& words) {
  Offer offer;
  for (const std::string& word : words) offer.words.push_back({word});
  return offer;
}

std::vector<OfferedWord> FilesIn(const std::string& dir, const std::string& prefix = "") {
  std::vector<OfferedWord> names;
  std::error_code failure;
  std::filesystem::directory_iterator entry(dir, failure);
  for (; !failure && entry != std::filesystem::directory_iterator(); entry.increment(failure)) {
    std::error_code unknown;
    if (entry->is_regular_file(unknown))
      names.push_back({prefix + entry->path().filename().string()});
  }
  return names;
}

// Of a host that was never booted, and to who may not read what is installed.
Offer OfferDomainsOfFiles() {
  Offer offer{.words = FilesIn(std::string(SecPolicy::kPolicyRoot) + "/" + SecPolicy::kDomainsDir)};
  std::ranges::copy(FilesIn(SecPolicy::kPartnerDomainsDir, SecPolicy::kPartnerPrefix),
                    std::back_inserter(offer.words));
  return offer;
}

Words WordsOfHost(WordKind kind) {
  Words words;
  const auto& table = FormOf(kind).table;
  if (!table) return words;
  for (const auto& [word, id] : LinuxHost::HostWords(*table)) words.push_back(word);
  return words;
}

// The host would make a state of its own where there is none.
Words InstalledWords(WordKind kind) {
  if (LinuxHost::IsStateMissing()) return WordsOfHost(kind);
  try {
    SecPolicy::TeskAccessInterfaceImpl access;
    return KnownWords(kind, access);
  } catch (const Braxo::Lib::BraxoException&) {
    return {};
  }
}

Offer OfferInstalled(WordKind kind) {
  if (kind == WordKind::kPath) return {.words = {}, .files = OfferedFiles::kFiles};
  Offer offer = OfferOf(InstalledWords(kind));
  if (kind == WordKind::kDomain && offer.words.empty()) return OfferDomainsOfFiles();
  if (kind != WordKind::kSyscall) return offer;
  for (OfferedWord& each : offer.words) {
    if (const auto* const set = Policy::FindCallSet(each.word)) each.meaning = set->purpose;
  }
  return offer;
}

Offer OfferQuestion(const Words& before) {
  if (before.empty()) {
    Offer actions;
    for (const QuestionForm& form : QuestionForms())
      actions.words.push_back({form.action, form.usage});
    return actions;
  }
  const auto form = std::ranges::find(QuestionForms(), before.front(), &QuestionForm::action);
  if (form == QuestionForms().end() || before.size() > form->words.size()) return {};
  return OfferInstalled(form->words[before.size() - 1]);
}

Offer OfferSavedStates(const Words& /*before*/) {
  Offer offer;
  for (const SavedState& state : ListSavedStates()) offer.words.push_back({state.name});
  return offer;
}

Offer OfferObjects(const Words& /*before*/) {
  if (LinuxHost::IsStateMissing()) return {};
  SecPolicy::TeskAccessInterfaceImpl access;
  Offer offer;
  for (const auto& [name, id] : access.GetKeywordsMap(*FormOf(WordKind::kLabel).table)) {
    offer.words.push_back({name});
  }
  return offer;
}

// What two policies are that are compared.
Offer OfferSide(const Words& before) {
  Offer offer = OfferSavedStates(before);
  offer.words.push_back({"installed", "what is installed now"});
  offer.files = OfferedFiles::kDirectories;
  return offer;
}

Offer OfferLevels(const Words& /*before*/) {
  Offer offer;
  for (const Policy::Level level : Policy::kLevels) offer.words.push_back({TextOf(level)});
  return offer;
}

// The words of a command: a program, and files for it.
Offer OfferCommand(const Words& before) {
  return {.words = {}, .files = before.empty() ? OfferedFiles::kPrograms : OfferedFiles::kFiles};
}

Offering OnlyFiles(OfferedFiles files) {
  return [files](const Words&) { return Offer{.words = {}, .files = files}; };
}

}  // namespace

Offering OfferWords(const Words& words) {
  return [words](const Words&) { return OfferOf(words); };
}

Offering OfferNothing() { return OnlyFiles(OfferedFiles::kNone); }

Offering OfferWordsOf(WordKind kind) {
  return [kind](const Words&) { return OfferInstalled(kind); };
}

Offering OfferObjects() {
  return [](const Words& before) { return OfferObjects(before); };
}

Offering OfferFiles() { return OnlyFiles(OfferedFiles::kFiles); }

Offering OfferSavedStates() {
  return [](const Words& before) { return OfferSavedStates(before); };
}

Offering OfferTardisks() {
  return [](const Words&) { return Offer{.words = FilesIn(SecPolicy::kTardiskImagesDir)}; };
}

Offering OfferCodes(bool onlyWarnings) {
  return [onlyWarnings](const Words&) {
    Offer offer;
    for (const Code* const code : AllCodes()) {
      if (onlyWarnings && code->severity == Severity::kError) continue;
      offer.words.push_back({code->name, code->summary});
    }
    return offer;
  };
}

Offering OfferingFor(std::string_view valueName) {
  static const std::map<std::string_view, Offering> offerings = {
      {"A", OfferSide},
      {"B", OfferSide},
      {"CALL", OfferWordsOf(WordKind::kSyscall)},
      {"CAPABILITY", OfferWordsOf(WordKind::kCapability)},
      {"CHECK", OfferWordsOf(WordKind::kParameterCheck)},
      {"CMD", OfferCommand},
      {"CODE", OfferCodes(false)},
      {"DIR", OnlyFiles(OfferedFiles::kDirectories)},
      {"DOMAIN", OfferWordsOf(WordKind::kDomain)},
      {"FILE", OfferFiles()},
      {"LABEL", OfferWordsOf(WordKind::kLabel)},
      {"LEVEL", OfferLevels},
      {"OBJECT", OfferWordsOf(WordKind::kLabel)},
      {"PATH", OfferFiles()},
      {"POLICY", OfferSide},
      {"PROGRAM", OfferCommand},
      {"WHAT", OfferQuestion},
  };
  const auto found = offerings.find(valueName);
  return found == offerings.end() ? Offering() : found->second;
}

}  // namespace SecPolicyCli
