#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <list>
#include <map>
#include <unordered_map>

#include "check_run.h"
#include "host/enforce/plan/port_check.h"
#include "host/linux/common/host_error.h"
#include "policy/call_set.h"
#include "policy/parameter_range.h"
#include "rule_form.h"
#include "secpolicy/observed/policy_lines.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using ParameterRules = std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>;
using Words = SourceFile::Words;

const char* const kParameterRule = FormOf(Policy::RuleKind::kParameterCheck).keyword;
const char* const kCallRule = FormOf(Policy::RuleKind::kSyscall).keyword;
const char* const kPathRule = FormOf(Policy::RuleKind::kFilePath).keyword;

constexpr char kStartCalls[] = "@start";

constexpr std::uint64_t kLastPort = 65'535;

bool IsNumber(const std::string& word) {
  try {
    Policy::ParseParameterRange(word, "");
    return true;
  } catch (const BraxoException&) {
    return false;
  }
}

std::uint64_t NumberOf(const std::string& word) {
  return Policy::ParseParameterRange(word, "").first;
}

bool IsReversed(const std::string& first, const std::string& second) {
  return !second.empty() && NumberOf(first) > NumberOf(second);
}

// How a range is written of which both ends stand in one word.
Hint HintForRange(const std::string& word) {
  const std::size_t end = word.find_first_of("-:.");
  const std::size_t begin = word.find_last_of("-:.");
  if (end == std::string::npos) return {};
  const std::string first = word.substr(0, end);
  const std::string last = word.substr(begin + 1);
  if (!IsNumber(first) || !IsNumber(last)) return {};
  const std::string words = first + " " + last;
  return {"a range is two words: " + words, words};
}

// The check of one domain's file.
class DomainCheck {
 public:
  DomainCheck(CheckRun& checkRun, const SourceFile& policyFile, const std::string& domainName,
              unsigned int id)
      : run(checkRun), file(policyFile), name(domainName), lines(domainName, id) {}

  void CheckLines() {
    for (const auto& [line, words] : file.Lines()) {
      if (!Accepts(line, words)) continue;
      CheckRepetition(line, words);
      if (words.front() == kPathRule) CheckPathRule(line, words);
      if (words.front() == kParameterRule) CheckPorts(line, words);
      if (words.front() == kCallRule) calls[words[1]] = words.back() == "grant";
    }
    CheckParameterRules();
    CheckStart();
  }

 private:
  // What a rule says of the thing that it is about.
  struct Saying {
    unsigned int line;
    std::string word;
  };

  bool Accepts(unsigned int line, const Words& words) {
    NoteUse(words);
    try {
      lines.Read(line, file.TokensOf(line), run.access);
      return true;
    } catch (const SecPolicy::LineFailure& failure) {
      const SecPolicy::Problem& problem = failure.problem;
      AddRefusal(run, file, problem, HintForRule(run, CodeOf(*problem.fault), words, problem.word));
      return false;
    }
  }

  // Also what a bad line names counts as used: its own problem is enough.
  void NoteUse(const Words& words) {
    const auto form = FindLineForm(words.front());
    if (!form) return;
    const std::size_t count = std::min(form->words.size(), words.size() - 1);
    for (std::size_t i = 0; i < count; ++i) {
      const std::string& word = words[i + 1];
      if (form->words[i] == Policy::WordKind::kLabel) run.usedLabels.insert(word);
      if (form->words[i] == Policy::WordKind::kDomain && words.back() != "revoke") {
        run.transitions[name].insert(word);
      }
    }
  }

  void CheckRepetition(unsigned int line, const Words& words) {
    const bool isPath = words.front() == kPathRule;
    std::string about;
    for (std::size_t i = 0; i < (isPath ? 2 : words.size() - 1); ++i) about += words[i] + ' ';
    std::string saying = isPath ? (words.size() > 2 ? words[2] : "") : words.back();
    if (isPath) std::sort(saying.begin(), saying.end());

    const auto [earlier, isNew] = sayings.try_emplace(about, Saying{line, saying});
    if (isNew) return;
    const std::string place = "line " + std::to_string(earlier->second.line);
    if (earlier->second.word == saying) {
      Add(Codes::kDuplicateRule, line, words, "this rule is in " + place + " already");
    } else if (words.front() != kParameterRule) {
      Add(Codes::kContradictingRule, line, words,
          "this rule replaces the one in " + place + ", which says otherwise");
    }
    earlier->second = {line, saying};
  }

  void CheckPathRule(unsigned int line, const Words& words) {
    const std::string& path = words[1];
    CheckIsAbsolute(run, file, line, 1);
    if (path.find('*') != std::string::npos) {
      run.diagnostics.Add(
          file.AtWord(Codes::kStarInPath, line, 1,
                      "a -r rule has no patterns: this one is about a file whose name has a star"));
    } else if (IsMissing(path)) {
      run.diagnostics.Add(file.AtWord(Codes::kMissingPath, line, 1,
                                      "there is nothing at " + path + " under this root"));
    }
    if (words.size() < 3) return;
    try {
      SecPolicy::CheckPermissions(words[2]);
    } catch (const BraxoException& failure) {
      run.diagnostics.Add(file.AtWord(Codes::kBadPermissions, line, 2, failure.what(),
                                      "letters out of r, w and x, each at most once"));
    }
  }

  // No socket has such a port, so that the rule, or a part of its range, is about nothing.
  void CheckPorts(unsigned int line, const Words& words) {
    if (!Enforce::IsPortCheck(words[1])) return;
    for (std::size_t i = 2; i + 1 < words.size(); ++i) {
      if (!IsNumber(words[i]) || NumberOf(words[i]) <= kLastPort) continue;
      run.diagnostics.Add(file.AtWord(
          Codes::kUnknownPort, line, i,
          "there is no port " + words[i] + ": the last is " + std::to_string(kLastPort)));
    }
  }

  bool MayCall(std::string_view call) const {
    bool isGranted = false;
    for (const auto& [word, grants] : calls) {
      if (!Policy::SpeaksOfCall(word, call)) continue;
      if (!grants) return false;
      isGranted = true;
    }
    return isGranted;
  }

  // A domain without rules is a name that others need.
  void CheckStart() {
    if (file.Lines().empty()) return;
    const auto members = Policy::FindCallSet(kStartCalls)->members;
    const auto lacking =
        std::ranges::count_if(members, [&](std::string_view call) { return !MayCall(call); });
    if (lacking == 0) return;
    Diagnostic diagnostic = file.About(
        Codes::kCannotStart,
        "no dynamically linked program can start in the domain '" + name + "': it may not make " +
            CountOf(static_cast<std::size_t>(lacking), "system call") + " of " + kStartCalls);
    diagnostic.hint = "write: -s @start grant";
    run.diagnostics.Add(std::move(diagnostic));
  }

  // Adds the rules to those that do not contradict each other, twice as many each time; where the
  // host refuses them, half as many, down to the one rule to blame.
  void CheckParameterRules() {
    ParameterRules& rules = lines.ParameterRules();
    if (Conflict(rules).empty()) return;
    ParameterRules sound;
    std::size_t size = 1;
    while (!rules.empty()) {
      size = std::min(size, rules.size());
      const auto end = std::next(rules.begin(), static_cast<std::ptrdiff_t>(size));
      const auto added = rules.begin();
      sound.splice(sound.end(), rules, added, end);
      const std::string refusal = Conflict(sound);
      if (refusal.empty()) {
        size *= 2;
        continue;
      }
      if (size == 1) {
        RefuseParameterRule(*added, refusal);
        sound.erase(added);
        continue;
      }
      rules.splice(rules.begin(), sound, added, sound.end());
      size /= 2;
    }
  }

  // A number that is none is to blame itself, else the rule is.
  void RefuseParameterRule(const ParameterRules::value_type& rule, const std::string& refusal) {
    constexpr std::size_t kFirstNumber = 2;
    const auto& [line, domainId, domainName, check, first, second, grant] = rule;
    if (!IsNumber(first)) {
      run.diagnostics.Add(
          file.AtWord(Codes::kParameterConflict, line, kFirstNumber, refusal, HintForRange(first)));
    } else if (!second.empty() && !IsNumber(second)) {
      run.diagnostics.Add(file.AtWord(Codes::kParameterConflict, line, kFirstNumber + 1, refusal));
    } else if (IsReversed(first, second)) {
      const std::string inOrder = second + " " + first;
      run.diagnostics.Add(
          file.AtWords(Codes::kParameterConflict, line, kFirstNumber, kFirstNumber + 1, refusal,
                       Hint("the smaller number comes first: " + inOrder, inOrder)));
    } else {
      Add(Codes::kParameterConflict, line, file.Lines().at(line), refusal);
    }
  }

  // Why the host refuses the rules; empty when it does not.
  std::string Conflict(ParameterRules& rules) {
    try {
      run.access.CheckCapabilityParamRuleConstraints(name, rules);
      return "";
    } catch (const BraxoException& failure) {
      return failure.what();
    }
  }

  void Add(const Code& code, unsigned int line, const Words& words, const std::string& message) {
    run.diagnostics.Add(file.AtWords(code, line, 0, words.size() - 1, message));
  }

  CheckRun& run;
  const SourceFile& file;
  std::string name;
  SecPolicy::DomainLines lines;
  std::unordered_map<std::string, Saying> sayings;  // the latest of each thing
  std::map<std::string, bool> calls;                // the latest word on each name or set
};

// Of a host that has no room for one more domain.
std::string DescribeRest(std::size_t files) {
  return files == 0 ? ""
                    : "neither is there room for " + CountOf(files, "file") + " after this one";
}

}  // namespace

// Creates the domains in the scratch state, as a load does before it reads any file.
std::vector<DomainSource> DefineDomains(CheckRun& run, const std::vector<NamedFile>& files,
                                        const std::string& prefix) {
  std::vector<DomainSource> domains;
  for (std::size_t index = 0; index < files.size(); ++index) {
    const NamedFile& named = files[index];
    const std::string name = prefix + named.name;
    unsigned int id = 0;
    try {
      if (!run.access.FindDomain(name, &id)) {
        id = run.access.CreateDomain(name, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
      }
    } catch (const LinuxHost::HostError& refusal) {
      const bool isFull = refusal.Code() == ENOSPC;
      run.diagnostics.Add(named.file->About(Codes::kBadName, refusal.what(),
                                            isFull ? DescribeRest(files.size() - index - 1) : ""));
      if (isFull) break;
      continue;
    }
    run.domains[name] = named.file;
    domains.push_back({named.file, name, id});
  }
  run.vocabularies.erase(Policy::WordKind::kDomain);
  return domains;
}

void CheckDomain(CheckRun& run, const DomainSource& domain, const std::string& prefix) {
  // Partner domains are entered by the service that belongs to them.
  if (!prefix.empty()) run.enteredDomains.insert(domain.name);
  DomainCheck(run, *domain.file, domain.name, domain.id).CheckLines();
}

void CheckDomains(CheckRun& run, const DomainsDir& dir) {
  const std::vector<NamedFile> files = OpenPolicyFiles(run, dir.path, dir.expected);
  for (const DomainSource& domain : DefineDomains(run, files, dir.prefix)) {
    CheckDomain(run, domain, dir.prefix);
  }
}

}  // namespace SecPolicyCli
