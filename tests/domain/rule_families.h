#pragma once

#include <iosfwd>
#include <memory>
#include <queue>
#include <string>
#include <vector>

#include "secpolicy/domain/policy_rules.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {

// What one kind of rule set does with its own words. All rules stand on line 7 of "appDom", whose
// identifier is 42; "targetDom", wherever it is named, is the host's domain 1.
struct RuleFamily {
  const char* name;
  const char* keyword;
  std::unique_ptr<SecPolicy::PolicyRules> (*make)();

  const char* granted;                   // the words of a good line
  const char* revoked;                   // the same with the other verdict
  std::vector<const char*> wrongLength;  // lines with too few or too many words
  std::vector<const char*> lookups;      // what a good line asks of the host, in order
  const char* setGranted;                // how the good lines reach the kernel
  const char* setRevoked;
  const char* printedGranted;  // how they are printed
  const char* printedRevoked;

  const char* getter;                // the call that reads the rules back
  void (*install)(InstalledRules&);  // gives the kernel the two good lines
};

inline void PrintTo(const RuleFamily& family, std::ostream* stream) { *stream << family.name; }

// The seven kinds whose lines end in "grant" or "revoke" and that are set rule by rule.
const std::vector<RuleFamily>& VerdictFamilies();

// All eight: with file paths, whose "revoked" line is one without permissions.
const std::vector<RuleFamily>& AllFamilies();

// The words of `text`, which are separated by blanks.
std::queue<std::string> Words(const std::string& text);

// `text` with the line number 7 replaced by `line`.
std::string OnLine(const std::string& text, unsigned int line);

}  // namespace SecPolicyTest
