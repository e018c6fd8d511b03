#include "secpolicy/domain/file_path_access_rules.h"

#include <cstdio>

#include "secpolicy/domain/rule_steps.h"
#include "zorvan/kernel.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TeskAccess_FilePathAccessRule;

struct Access {
  char letter;
  unsigned int bit;
  const char* repeated;
};

constexpr std::array kAccesses = {
    Access{'r', 0x1, "Read access already specified."},
    Access{'w', 0x2, "Write access already specified."},
    Access{'x', 0x10, "Exec access already specified."},
};

const Access& FindAccess(char letter) {
  for (const Access& access : kAccesses) {
    if (access.letter == letter) return access;
  }
  RaiseError("Unknown access privilege specified.");
}

unsigned int MaskOf(const std::string& permissions) {
  if (permissions.size() > kAccesses.size()) RaiseError("Please enter the permissions from [rwx].");
  unsigned int mask = 0;
  for (const char letter : permissions) {
    const Access& access = FindAccess(letter);
    if ((mask & access.bit) != 0) RaiseError(access.repeated);
    mask |= access.bit;
  }
  return mask;
}

// Permissions are checked only when a rule is set, and their failure is meant to stay bare.
unsigned int MaskOf(const TeskAccess_FilePathAccessRule& rule) {
  try {
    return MaskOf(rule.permissions);
  } catch (const Braxo::Lib::BraxoException& failure) {
    throw LineFailure(failure.what(), {.line = rule.line, .reason = failure.what()});
  }
}

void TakePath(TeskAccess_FilePathAccessRule& rule, RuleLine& line) {
  line.RequireCount(1, 2);
  rule.path = line.Take();
  if (line.Left() > 0) rule.permissions = line.Take();
}

// The kernel matches a path as the program gave it and as it resolves, so a rule is for both, even
// where they are the same. A path that does not resolve yet is set as written.
using PathEntries = std::array<TeskAccess_FileRule, 2>;

unsigned int FillPaths(PathEntries& entries, const std::string& path) {
  auto& [written, resolved] = entries;
  static_cast<void>(std::snprintf(written.path, sizeof written.path, "%s", path.c_str()));
  if (Zorvan::Kernel::RealPath(written.path, resolved.path) == 0) return 2;
  SecpolicyInfo("Getting realpath failed: " + path);
  return 1;
}

}  // namespace

void FilePathAccessRules::AddRule(unsigned int line, const std::string& domainName,
                                  unsigned int domainId, std::queue<std::string> args,
                                  TeskAccessInterfaceImpl& access) {
  AppendRule(rules, {line, domainName, domainId, args, access}, TakePath);
}

unsigned int FilePathAccessRules::GetPermission(const std::string& permissions) {
  return MaskOf(permissions);
}

void FilePathAccessRules::SetObserved(PolicyObserver& observer) {
  for (const TeskAccess_FilePathAccessRule& rule : rules) {
    observer.OnPathRule(rule);
    PathEntries entries{};
    const unsigned int count = FillPaths(entries, rule.path);
    const unsigned int permission = MaskOf(rule);
    for (TeskAccess_FileRule& entry : entries) entry.permission = permission;

    unsigned int result = 0;
    try {
      AddFilePolicyBatch(0, rule.domainId, entries.data(), count, &result);
    } catch (const Braxo::Lib::BraxoException& failure) {
      RaisePolicySetError(rule.line, rule.domainName, failure.what());
    }
  }
}

void FilePathAccessRules::ReadSystemRules(unsigned int domainId, TeskAccessInterfaceImpl& access) {
  access.GetFilePathAccessRules(domainId, rules);
}

void FilePathAccessRules::PrintRules() {
  PrintEach(keyword, rules, [](std::string& text, const TeskAccess_FilePathAccessRule& rule) {
    AppendWord(text, rule.path);
    AppendWord(text, rule.permissions);
  });
}

}  // namespace SecPolicy
