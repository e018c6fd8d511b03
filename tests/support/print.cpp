#include "support/print.h"

#include <cstring>

#include "support/trace.h"

namespace SecPolicyTest {

using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using TeskCtl::Security::TeskAccess_CapabilityRule;
using TeskCtl::Security::TeskAccess_DomTransRule;
using TeskCtl::Security::TeskAccess_FileCreationRule;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_KeywordType;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;
using TeskCtl::Security::TeskAccess_SyscallRule;
using TeskCtl::Security::TeskAccess_UnixSockCreationRule;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using TeskCtl::Security::TeskAccessLabelType;

namespace {

template <class Rule>
std::string Head(const Rule& rule) {
  return "{line: " + Print(rule.line) + ", domainId: " + Print(rule.domainId) +
         ", domainName: " + Print(rule.domainName);
}

template <class Value>
std::string Field(const char* name, const Value& value) {
  return std::string(", ") + name + ": " + Print(value);
}

template <class Rule>
std::string Grant(const Rule& rule) {
  return Field("grant", rule.grant) + "}";
}

}  // namespace

std::string Print(const std::string& text) { return Quoted(text); }
std::string Print(const char* text) { return text == nullptr ? "null" : Quoted(text); }
std::string Print(unsigned int number) { return std::to_string(number); }
std::string Print(bool value) { return value ? "true" : "false"; }

std::string Print(TeskAccessLabelType type) {
  if (type == TeskCtl::Security::TESKACCESS_LABEL_DOMAIN) return "DOMAIN";
  if (type == TeskCtl::Security::TESKACCESS_LABEL_OBJECT) return "OBJECT";
  return std::to_string(static_cast<int>(type));
}

std::string Print(TeskAccess_KeywordType type) {
  switch (type) {
    case TeskCtl::Security::TESKACCESS_KEYWORD_LABEL:
      return "LABEL";
    case TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY:
      return "CAPABILITY";
    case TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK:
      return "PARAM_CHECK";
    case TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS:
      return "OBJECT_ACCESS";
    case TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS:
      return "DOM_TRANS";
    case TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION:
      return "FILE_CREATION";
    case TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION:
      return "UNIX_SOCK_CREATION";
    case TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL:
      return "SYSCALL";
  }
  return std::to_string(static_cast<int>(type));
}

std::string Print(TeskAccessKsi_DefaultDom dflt) { return std::to_string(static_cast<int>(dflt)); }

std::string Print(const TeskAccess_FileRule& rule) {
  return "{" + Quoted({rule.path, strnlen(rule.path, sizeof rule.path)}) + ", " +
         Print(rule.permission) + "}";
}

std::string Print(const TeskAccess_FilePathAccessRule& rule) {
  return Head(rule) + Field("path", rule.path) + Field("permissions", rule.permissions) + "}";
}

std::string Print(const TeskAccess_SyscallRule& rule) {
  return Head(rule) + Field("syscall", rule.syscall) + Grant(rule);
}

std::string Print(const TeskAccess_CapabilityRule& rule) {
  return Head(rule) + Field("capability", rule.capability) + Grant(rule);
}

std::string Print(const TeskAccess_CapabilityParamRule& rule) {
  return Head(rule) + Field("paramCheck", rule.paramCheck) + Field("firstParam", rule.firstParam) +
         Field("secondParam", rule.secondParam) + Grant(rule);
}

std::string Print(const TeskAccess_ObjectAccessRule& rule) {
  return Head(rule) + Field("label", rule.label) + Field("accessKind", rule.accessKind) +
         Grant(rule);
}

std::string Print(const TeskAccess_DomTransRule& rule) {
  return Head(rule) + Field("label", rule.label) + Field("targetDomain", rule.targetDomain) +
         Field("targetDomainId", rule.targetDomainId) +
         Field("transitionKind", rule.transitionKind) + Grant(rule);
}

std::string Print(const TeskAccess_FileCreationRule& rule) {
  return Head(rule) + Field("label", rule.label) + Field("secondLabel", rule.secondLabel) +
         Field("creationKind", rule.creationKind) + Grant(rule);
}

std::string Print(const TeskAccess_UnixSockCreationRule& rule) {
  return Head(rule) + Field("label", rule.label) + Field("sockKind", rule.sockKind) + Grant(rule);
}

}  // namespace SecPolicyTest
