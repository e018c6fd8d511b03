#pragma once

#include <list>
#include <string>
#include <vector>

#include "teskctl/security.h"

// How the trace shows arguments.
namespace SecPolicyTest {

std::string Print(const std::string& text);
std::string Print(const char* text);
std::string Print(unsigned int number);
std::string Print(bool value);
std::string Print(TeskCtl::Security::TeskAccessLabelType type);
std::string Print(TeskCtl::Security::TeskAccess_KeywordType type);
std::string Print(TeskCtl::Security::TeskAccessKsi_DefaultDom dflt);
std::string Print(const TeskCtl::Security::TeskAccess_FileRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_SyscallRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_CapabilityRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_CapabilityParamRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_ObjectAccessRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_DomTransRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_FileCreationRule& rule);
std::string Print(const TeskCtl::Security::TeskAccess_UnixSockCreationRule& rule);

template <class Items>
std::string PrintAll(const Items& items) {
  std::string text;
  for (const auto& item : items) text += (text.empty() ? "" : ", ") + Print(item);
  return "[" + text + "]";
}

template <class First, class... Others>
std::string Arguments(const First& first, const Others&... others) {
  std::string text = Print(first);
  ((text += ", " + Print(others)), ...);
  return text;
}

}  // namespace SecPolicyTest
