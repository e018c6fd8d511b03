#include "origin_reader.h"

#include <map>
#include <queue>
#include <span>

#include "policy/rule.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/tardisk/tardisk_exception_rules.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;

constexpr char kExceptionRule[] = "-E";

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

}  // namespace

void OriginReader::ReadPaths(const std::string& dir, const std::string& prefix,
                             LinuxHost::LoadKind kind) {
  for (const auto& [path, name] : FilesOf(dir)) {
    Paths& domain = paths.emplace_back(Paths{.kind = kind, .domain = prefix + name, .lines = {}});
    for (auto& [number, words] : LinesOf(path)) {
      if (words.front() != FormOf(Policy::RuleKind::kFilePath).keyword) continue;
      words.pop();
      if (!words.empty()) domain.lines.push_back({.path = words.front(), .line = number});
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
  const Policy::Rule transition = {.kind = Policy::RuleKind::kDomainTransition,
                                   .words = {label, domain, access.GetTardiskExecEventKeyword()},
                                   .verdict = true,
                                   .origin = {.file = file, .line = line}};
  for (const std::string& launchDomain : access.GetTardiskLaunchDomains()) {
    rules.push_back({.domain = launchDomain, .rule = transition});
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
