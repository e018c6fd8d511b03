#include "policy/rule.h"

#include <array>
#include <utility>

namespace Policy {
namespace {

using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using TeskCtl::Security::TeskAccess_CapabilityRule;
using TeskCtl::Security::TeskAccess_DomTransRule;
using TeskCtl::Security::TeskAccess_FileCreationRule;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;
using TeskCtl::Security::TeskAccess_SyscallRule;
using TeskCtl::Security::TeskAccess_UnixSockCreationRule;

// Which fields of a record are the words of its rule.
template <class Record, std::size_t count>
struct RecordForm {
  RuleKind kind;
  std::array<std::string Record::*, count> words;
};

template <class Record>
constexpr auto kFormOf = nullptr;
template <>
constexpr RecordForm<TeskAccess_ObjectAccessRule, 2> kFormOf<TeskAccess_ObjectAccessRule> = {
    RuleKind::kObjectAccess,
    {&TeskAccess_ObjectAccessRule::label, &TeskAccess_ObjectAccessRule::accessKind}};
template <>
constexpr RecordForm<TeskAccess_CapabilityRule, 1> kFormOf<TeskAccess_CapabilityRule> = {
    RuleKind::kCapability, {&TeskAccess_CapabilityRule::capability}};
template <>
constexpr RecordForm<TeskAccess_DomTransRule, 3> kFormOf<TeskAccess_DomTransRule> = {
    RuleKind::kDomainTransition,
    {&TeskAccess_DomTransRule::label, &TeskAccess_DomTransRule::targetDomain,
     &TeskAccess_DomTransRule::transitionKind}};
template <>
constexpr RecordForm<TeskAccess_FileCreationRule, 3> kFormOf<TeskAccess_FileCreationRule> = {
    RuleKind::kFileCreation,
    {&TeskAccess_FileCreationRule::label, &TeskAccess_FileCreationRule::secondLabel,
     &TeskAccess_FileCreationRule::creationKind}};
template <>
constexpr RecordForm<TeskAccess_CapabilityParamRule, 3> kFormOf<TeskAccess_CapabilityParamRule> = {
    RuleKind::kParameterCheck,
    {&TeskAccess_CapabilityParamRule::paramCheck, &TeskAccess_CapabilityParamRule::firstParam,
     &TeskAccess_CapabilityParamRule::secondParam}};
template <>
constexpr RecordForm<TeskAccess_FilePathAccessRule, 1> kFormOf<TeskAccess_FilePathAccessRule> = {
    RuleKind::kFilePath, {&TeskAccess_FilePathAccessRule::path}};
template <>
constexpr RecordForm<TeskAccess_SyscallRule, 1> kFormOf<TeskAccess_SyscallRule> = {
    RuleKind::kSyscall, {&TeskAccess_SyscallRule::syscall}};
template <>
constexpr RecordForm<TeskAccess_UnixSockCreationRule, 2> kFormOf<TeskAccess_UnixSockCreationRule> =
    {RuleKind::kUnixSocketCreation,
     {&TeskAccess_UnixSockCreationRule::label, &TeskAccess_UnixSockCreationRule::sockKind}};

template <class Record>
concept EndsInGrant = requires(Record record) {
  record.grant;
};

}  // namespace

std::string TextOf(const Verdict& verdict) {
  const bool* const grant = std::get_if<bool>(&verdict);
  if (grant == nullptr) return std::get<Permissions>(verdict).Text();
  return *grant ? "grant" : "revoke";
}

bool Rule::Grants() const {
  const bool* const grant = std::get_if<bool>(&verdict);
  return grant != nullptr ? *grant : !Permits().IsEmpty();
}

ParameterRange Rule::Range() const { return ParseParameterRange(words[1], words[2]); }

std::span<const std::string> Rule::Words() const {
  const RuleForm& form = FormOf(kind);
  std::size_t count = form.words.size();
  while (count > form.MinWords() && words[count - 1].empty()) --count;
  return {words.data(), count};
}

std::string Rule::Text() const {
  std::string text = FormOf(kind).keyword;
  for (const std::string& word : Words()) {
    text += ' ';
    text += word;
  }
  text += ' ';
  return text + TextOf(verdict);
}

template <class Record>
Rule TakeRule(Record& record) {
  constexpr auto& form = kFormOf<Record>;
  Rule rule;
  rule.kind = form.kind;
  rule.line = record.line;
  for (std::size_t index = 0; index < form.words.size(); ++index) {
    rule.words[index] = std::move(record.*form.words[index]);
  }
  if constexpr (EndsInGrant<Record>) {
    rule.verdict = record.grant;
  } else {
    rule.verdict = Permissions::Parse(record.permissions);
  }
  return rule;
}

template <class Record>
void MoveInto(Record& record, Rule& rule) {
  constexpr auto& form = kFormOf<Record>;
  record.line = rule.line;
  for (std::size_t index = 0; index < form.words.size(); ++index) {
    record.*form.words[index] = std::move(rule.words[index]);
  }
  if constexpr (EndsInGrant<Record>) {
    record.grant = rule.Grants();
  } else {
    record.permissions = rule.Permits().Text();
  }
}

template Rule TakeRule(TeskAccess_ObjectAccessRule&);
template Rule TakeRule(TeskAccess_CapabilityRule&);
template Rule TakeRule(TeskAccess_DomTransRule&);
template Rule TakeRule(TeskAccess_FileCreationRule&);
template Rule TakeRule(TeskAccess_CapabilityParamRule&);
template Rule TakeRule(TeskAccess_FilePathAccessRule&);
template Rule TakeRule(TeskAccess_SyscallRule&);
template Rule TakeRule(TeskAccess_UnixSockCreationRule&);

template void MoveInto(TeskAccess_ObjectAccessRule&, Rule&);
template void MoveInto(TeskAccess_CapabilityRule&, Rule&);
template void MoveInto(TeskAccess_DomTransRule&, Rule&);
template void MoveInto(TeskAccess_FileCreationRule&, Rule&);
template void MoveInto(TeskAccess_CapabilityParamRule&, Rule&);
template void MoveInto(TeskAccess_FilePathAccessRule&, Rule&);
template void MoveInto(TeskAccess_SyscallRule&, Rule&);
template void MoveInto(TeskAccess_UnixSockCreationRule&, Rule&);

}  // namespace Policy
