#include "origin_reader.h"

#include <map>
#include <queue>
#include <span>

#include "printed_rules.h"
#include "real_path.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/tardisk/tardisk_exception_rules.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using LinuxHost::RuleOrigin;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;

constexpr char kExceptionRule[] = "-E";
constexpr char kPathRule[] = "-r";
constexpr char kTransitionRule[] = "-d";
constexpr std::string_view kPermissionLetters = "rwx";

using Lines = std::map<unsigned int, std::queue<std::string>>;

// What the load has told about already is not told again.
template <class Step>
void Quietly(Step step) {
  try {
    step();
  } catch (const BraxoException&) {
    return;
  }
}

std::map<std::string, std::string> FilesOf(const std::string& dir) {
  std::map<std::string, std::string> files;
  Quietly([&] { SecPolicy::GetFileList(dir, files); });
  return files;
}

Lines LinesOf(const std::string& path) {
  Lines lines;
  Quietly([&] { SecPolicy::ParseFile(path, lines); });
  return lines;
}

// The numbers of the lines of each kind, in order: the first rule of a kind is that of the first
// line, and so on.
std::map<std::string, std::vector<unsigned int>> NumbersByKeyword(const Lines& lines) {
  std::map<std::string, std::vector<unsigned int>> numbers;
  for (const auto& [number, words] : lines) numbers[words.front()].push_back(number);
  return numbers;
}

std::string InKernelOrder(const std::string& permissions) {
  std::string ordered;
  for (const char letter : kPermissionLetters) {
    if (permissions.find(letter) != std::string::npos) ordered += letter;
  }
  return ordered;
}

// A path rule is displayed as the kernel keeps it: with the letters in its order, and once more for
// the path that it resolves to.
void AddPathOrigins(const SecPolicy::FilePathAccessRules& written, const std::string& file,
                    std::vector<RuleOrigin>& origins) {
  SecPolicy::FilePathAccessRules kept;
  kept.keyword = written.keyword;
  for (TeskAccess_FilePathAccessRule rule : written.rules) {
    rule.permissions = InKernelOrder(rule.permissions);
    const std::string resolved = RealPathOf(rule.path);
    const bool elsewhere = !resolved.empty() && resolved != rule.path;
    kept.rules.push_back(rule);
    if (!elsewhere) continue;
    rule.path = resolved;
    kept.rules.push_back(rule);
  }
  auto rule = kept.rules.begin();
  for (const std::string& text : PrintedRules(kept)) {
    origins.push_back({.domain = rule->domainName, .rule = text, .file = file, .line = rule->line});
    ++rule;
  }
}

}  // namespace

void OriginReader::ReadDomains(const std::string& dir, const std::string& prefix) {
  for (const auto& [path, name] : FilesOf(dir)) ReadDomain(path, prefix + name);
}

void OriginReader::ReadDomain(const std::string& path, const std::string& name) {
  unsigned int id = 0;
  if (!access.FindDomain(name, &id)) return;
  Lines lines = LinesOf(path);
  const auto numbers = NumbersByKeyword(lines);
  SecPolicy::DomainPolicy policy(name, id);
  Quietly([&] { policy.ProcessParsedPolicyFile(access, lines); });

  for (const auto& [keyword, ruleSet] : policy.ruleSets) {
    if (!numbers.contains(keyword)) continue;
    if (keyword == kPathRule) {
      AddPathOrigins(dynamic_cast<const SecPolicy::FilePathAccessRules&>(*ruleSet), path, rules);
      continue;
    }
    auto number = numbers.at(keyword).begin();
    for (std::string& text : PrintedRules(*ruleSet)) {
      rules.push_back({.domain = name, .rule = std::move(text), .file = path, .line = *number++});
    }
  }
}

void OriginReader::ReadTardisks(const std::string& dir) {
  for (const auto& file : FilesOf(dir)) Quietly([&] { ReadTardisk(file.first); });
}

void OriginReader::ReadTardisk(const std::string& path) {
  const std::string tardisk = SecPolicy::TardiskPolicy(path).GetBackingTardiskPath();
  if (tardisk.empty()) return;
  SecPolicy::TardiskExceptionRules exceptions;
  for (auto& [number, words] : LinesOf(path)) {
    if (words.front() != kExceptionRule) return;
    words.pop();
    exceptions.AddRule(number, tardisk, path, words, access);
    const SecPolicy::TeskAccess_TardiskExceptionRule& rule = exceptions.rules.back();
    labels.push_back(
        {.path = tardisk, .isTree = false, .label = rule.label, .file = path, .line = number});
    AddTransitions(rule.label, rule.domainName, path, number);
  }
}

// From each launch domain the execution of what a tardisk brings leads into its domain.
void OriginReader::AddTransitions(const std::string& label, const std::string& domain,
                                  const std::string& file, unsigned int line) {
  SecPolicy::DomTransRules transition;
  transition.keyword = kTransitionRule;
  TeskCtl::Security::TeskAccess_DomTransRule& rule = transition.rules.emplace_back();
  rule.label = label;
  rule.targetDomain = domain;
  rule.transitionKind = access.GetTardiskExecEventKeyword();
  rule.grant = true;
  for (const std::string& launchDomain : access.GetTardiskLaunchDomains()) {
    for (const std::string& text : PrintedRules(transition)) {
      rules.push_back({.domain = launchDomain, .rule = text, .file = file, .line = line});
    }
  }
}

void OriginReader::ReadFileLabels(const std::string& dir) {
  for (const auto& [path, name] : FilesOf(dir)) ReadLabels(path);
}

void OriginReader::ReadLabels(const std::string& path) {
  SecPolicy::FileLabelPolicy policy;
  Quietly([&] { policy.ParsePolicy(path, access); });
  for (const auto& written : policy.fileLabels) {
    labels.push_back({.path = written.path,
                      .isTree = written.recursive,
                      .label = written.label,
                      .file = written.policyFile,
                      .line = written.lineNumber});
  }
}

}  // namespace SecPolicyCli
