#include "host/enforce/plan/file_rights.h"

namespace Enforce {
namespace {

using Policy::Permission;
using Policy::Rule;
using Policy::RuleKind;

Rights RightsOfPath(const Rule& rule) {
  Rights granted = 0;
  for (const AccessRow& row : kAccesses) {
    if (rule.Permits().Has(row.permission)) granted |= row.rights;
  }
  for (const CreationRow& row : kCreations) {
    if (row.byPath && rule.Permits().Has(Permission::kWrite)) granted |= row.rights;
  }
  return granted;
}

Rights RightsOfAccess(const Rule& rule) {
  Rights granted = 0;
  for (const AccessRow& row : kAccesses) {
    if (row.word == rule.words[1]) granted |= row.rights;
  }
  return granted;
}

Rights RightsOfCreation(const Rule& rule) {
  Rights granted = 0;
  for (const CreationRow& row : kCreations) {
    if (IsAbout(row, rule)) granted |= row.rights;
  }
  return granted;
}

}  // namespace

bool IsAbout(const CreationRow& row, const Rule& rule) {
  return row.kind == rule.kind &&
         row.word == rule.words[rule.kind == RuleKind::kFileCreation ? 2 : 1];
}

Rights RightsOf(const Rule& rule) {
  if (!rule.Grants()) return 0;
  switch (rule.kind) {
    case RuleKind::kFilePath:
      return RightsOfPath(rule);
    case RuleKind::kObjectAccess:
      return RightsOfAccess(rule);
    case RuleKind::kDomainTransition:
      return Landlock::kExecute;
    case RuleKind::kFileCreation:
    case RuleKind::kUnixSocketCreation:
      return RightsOfCreation(rule);
    case RuleKind::kCapability:
    case RuleKind::kParameterCheck:
    case RuleKind::kSyscall:
      break;
  }
  return 0;
}

}  // namespace Enforce
