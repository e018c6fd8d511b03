#include "support/policy_host.h"

#include <gtest/gtest.h>

namespace SecPolicyFuzz {

using TeskCtl::Security::TeskAccess_KeywordType;

PolicyHost::PolicyHost() {
  // A check that the host makes itself ends the process, too.
  testing::GTEST_FLAG(throw_on_failure) = true;
  strict = true;
  DeclareDomain("appDom");
  DeclareDomain("daemonFrameworkDom");
  DeclareDomain("fuzzDom");
  DeclareLabel("tool", 4);
  DeclareLabel("data", 5);
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_CAPABILITY] = {{"chown", 0}, {"kill", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_PARAM_CHECK] = {{"port", 0}, {"signal", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_OBJECT_ACCESS] = {{"read", 0}, {"write", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_DOM_TRANS] = {{"exec", 0}, {"enter", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_FILE_CREATION] = {{"regular", 0},
                                                                        {"fifo", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION] = {{"stream", 0},
                                                                             {"dgram", 1}};
  keywords[TeskAccess_KeywordType::TESKACCESS_KEYWORD_SYSCALL] = {{"open", 0}, {"fork", 1}};
}

}  // namespace SecPolicyFuzz
