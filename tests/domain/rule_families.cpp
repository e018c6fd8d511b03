#include "domain/rule_families.h"

#include <sstream>

#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"

namespace SecPolicyTest {
namespace {

template <class Rules>
std::unique_ptr<SecPolicy::PolicyRules> Make() {
  return std::make_unique<Rules>();
}

RuleFamily Syscall() {
  return {
      .name = "Syscall",
      .keyword = "-s",
      .make = &Make<SecPolicy::SyscallRules>,
      .granted = "read grant",
      .revoked = "read revoke",
      .wrongLength = {"", "grant", "read extra grant"},
      .lookups = {R"(ValidateKeyword(SYSCALL, "read"))"},
      .setGranted =
          R"(SetSyscallRule({line: 7, domainId: 42, domainName: "appDom", syscall: "read", grant: true}))",
      .setRevoked =
          R"(SetSyscallRule({line: 7, domainId: 42, domainName: "appDom", syscall: "read", grant: false}))",
      .printedGranted = R"(stdout "-s read grant\n")",
      .printedRevoked = R"(stdout "-s read revoke\n")",
      .getter = "GetSyscallRules",
      .install =
          [](InstalledRules& rules) {
            rules.syscall = {{7, 42, "appDom", "read", true}, {7, 42, "appDom", "read", false}};
          },
  };
}

RuleFamily Capability() {
  return {
      .name = "Capability",
      .keyword = "-c",
      .make = &Make<SecPolicy::CapabilityRules>,
      .granted = "cap_kill grant",
      .revoked = "cap_kill revoke",
      .wrongLength = {"", "grant", "cap_kill extra grant"},
      .lookups = {R"(ValidateKeyword(CAPABILITY, "cap_kill"))"},
      .setGranted =
          R"(SetCapabilityRule({line: 7, domainId: 42, domainName: "appDom", capability: "cap_kill", grant: true}))",
      .setRevoked =
          R"(SetCapabilityRule({line: 7, domainId: 42, domainName: "appDom", capability: "cap_kill", grant: false}))",
      .printedGranted = R"(stdout "-c cap_kill grant\n")",
      .printedRevoked = R"(stdout "-c cap_kill revoke\n")",
      .getter = "GetCapabilityRules",
      .install =
          [](InstalledRules& rules) {
            rules.capability = {{7, 42, "appDom", "cap_kill", true},
                                {7, 42, "appDom", "cap_kill", false}};
          },
  };
}

RuleFamily CapabilityParam() {
  return {
      .name = "CapabilityParam",
      .keyword = "-p",
      .make = &Make<SecPolicy::CapabilityParamRules>,
      .granted = "bind_port 80 443 grant",
      .revoked = "bind_port 80 443 revoke",
      .wrongLength = {"", "grant", "bind_port grant", "bind_port 80 443 extra grant"},
      .lookups = {R"(ValidateKeyword(PARAM_CHECK, "bind_port"))"},
      .setGranted =
          R"(SetCapabilityParamRule({line: 7, domainId: 42, domainName: "appDom", paramCheck: "bind_port", firstParam: "80", secondParam: "443", grant: true}))",
      .setRevoked =
          R"(SetCapabilityParamRule({line: 7, domainId: 42, domainName: "appDom", paramCheck: "bind_port", firstParam: "80", secondParam: "443", grant: false}))",
      .printedGranted = R"(stdout "-p bind_port 80 443 grant\n")",
      .printedRevoked = R"(stdout "-p bind_port 80 443 revoke\n")",
      .getter = "GetCapabilityParamRules",
      .install =
          [](InstalledRules& rules) {
            rules.capabilityParam = {{7, 42, "appDom", "bind_port", "80", "443", true},
                                     {7, 42, "appDom", "bind_port", "80", "443", false}};
          },
  };
}

RuleFamily ObjectAccess() {
  return {
      .name = "ObjectAccess",
      .keyword = "-a",
      .make = &Make<SecPolicy::ObjectAccessRules>,
      .granted = "toolLabel execute grant",
      .revoked = "toolLabel execute revoke",
      .wrongLength = {"", "grant", "toolLabel grant", "toolLabel execute extra grant"},
      .lookups = {R"(ValidateKeyword(LABEL, "toolLabel"))",
                  R"(ValidateKeyword(OBJECT_ACCESS, "execute"))"},
      .setGranted =
          R"(SetObjectAccessRule({line: 7, domainId: 42, domainName: "appDom", label: "toolLabel", accessKind: "execute", grant: true}))",
      .setRevoked =
          R"(SetObjectAccessRule({line: 7, domainId: 42, domainName: "appDom", label: "toolLabel", accessKind: "execute", grant: false}))",
      .printedGranted = R"(stdout "-a toolLabel execute grant\n")",
      .printedRevoked = R"(stdout "-a toolLabel execute revoke\n")",
      .getter = "GetObjectAccessRules",
      .install =
          [](InstalledRules& rules) {
            rules.objectAccess = {{7, 42, "appDom", "toolLabel", "execute", true},
                                  {7, 42, "appDom", "toolLabel", "execute", false}};
          },
  };
}

RuleFamily DomTrans() {
  return {
      .name = "DomTrans",
      .keyword = "-d",
      .make = &Make<SecPolicy::DomTransRules>,
      .granted = "toolLabel targetDom exec grant",
      .revoked = "toolLabel targetDom exec revoke",
      .wrongLength = {"", "grant", "toolLabel targetDom grant",
                      "toolLabel targetDom exec extra grant"},
      .lookups = {R"(FindDomain("targetDom"))", R"(ValidateKeyword(LABEL, "toolLabel"))",
                  R"(ValidateKeyword(DOM_TRANS, "exec"))"},
      .setGranted =
          R"(SetDomTransRule({line: 7, domainId: 42, domainName: "appDom", label: "toolLabel", targetDomain: "targetDom", targetDomainId: 1, transitionKind: "exec", grant: true}))",
      .setRevoked =
          R"(SetDomTransRule({line: 7, domainId: 42, domainName: "appDom", label: "toolLabel", targetDomain: "targetDom", targetDomainId: 1, transitionKind: "exec", grant: false}))",
      .printedGranted = R"(stdout "-d toolLabel targetDom exec grant\n")",
      .printedRevoked = R"(stdout "-d toolLabel targetDom exec revoke\n")",
      .getter = "GetDomTransRules",
      .install =
          [](InstalledRules& rules) {
            rules.domTrans = {{7, 42, "appDom", "toolLabel", "targetDom", 1, "exec", true},
                              {7, 42, "appDom", "toolLabel", "targetDom", 1, "exec", false}};
          },
  };
}

RuleFamily FileCreation() {
  return {
      .name = "FileCreation",
      .keyword = "-f",
      .make = &Make<SecPolicy::FileCreationRules>,
      .granted = "dirLabel fileLabel regular grant",
      .revoked = "dirLabel fileLabel regular revoke",
      .wrongLength = {"", "grant", "dirLabel fileLabel grant",
                      "dirLabel fileLabel regular extra grant"},
      .lookups = {R"(ValidateKeyword(LABEL, "dirLabel"))", R"(ValidateKeyword(LABEL, "fileLabel"))",
                  R"(ValidateKeyword(FILE_CREATION, "regular"))"},
      .setGranted =
          R"(SetFileCreationRule({line: 7, domainId: 42, domainName: "appDom", label: "dirLabel", secondLabel: "fileLabel", creationKind: "regular", grant: true}))",
      .setRevoked =
          R"(SetFileCreationRule({line: 7, domainId: 42, domainName: "appDom", label: "dirLabel", secondLabel: "fileLabel", creationKind: "regular", grant: false}))",
      .printedGranted = R"(stdout "-f dirLabel fileLabel regular grant\n")",
      .printedRevoked = R"(stdout "-f dirLabel fileLabel regular revoke\n")",
      .getter = "GetFileCreationRules",
      .install =
          [](InstalledRules& rules) {
            rules.fileCreation = {{7, 42, "appDom", "dirLabel", "fileLabel", "regular", true},
                                  {7, 42, "appDom", "dirLabel", "fileLabel", "regular", false}};
          },
  };
}

RuleFamily UnixSockCreation() {
  return {
      .name = "UnixSockCreation",
      .keyword = "-u",
      .make = &Make<SecPolicy::UnixSockCreationRules>,
      .granted = "sockLabel stream grant",
      .revoked = "sockLabel stream revoke",
      .wrongLength = {"", "grant", "sockLabel grant", "sockLabel stream extra grant"},
      .lookups = {R"(ValidateKeyword(LABEL, "sockLabel"))",
                  R"(ValidateKeyword(UNIX_SOCK_CREATION, "stream"))"},
      .setGranted =
          R"(SetUnixSockCreationRule({line: 7, domainId: 42, domainName: "appDom", label: "sockLabel", sockKind: "stream", grant: true}))",
      .setRevoked =
          R"(SetUnixSockCreationRule({line: 7, domainId: 42, domainName: "appDom", label: "sockLabel", sockKind: "stream", grant: false}))",
      .printedGranted = R"(stdout "-u sockLabel stream grant\n")",
      .printedRevoked = R"(stdout "-u sockLabel stream revoke\n")",
      .getter = "GetUnixSockCreationRules",
      .install =
          [](InstalledRules& rules) {
            rules.unixSockCreation = {{7, 42, "appDom", "sockLabel", "stream", true},
                                      {7, 42, "appDom", "sockLabel", "stream", false}};
          },
  };
}

RuleFamily FilePathAccess() {
  return {
      .name = "FilePathAccess",
      .keyword = "-r",
      .make = &Make<SecPolicy::FilePathAccessRules>,
      .granted = "/bin/ls rx",
      .revoked = "/bin/ls",
      .wrongLength = {"", "/bin/ls rx grant", "/bin/ls r x grant"},
      .lookups = {},
      .setGranted = R"(Call(0x405f, 0, 42, [{"/bin/ls", 17}, {"/bin/ls", 17}], 2, &out))",
      .setRevoked = R"(Call(0x405f, 0, 42, [{"/bin/ls", 0}, {"/bin/ls", 0}], 2, &out))",
      .printedGranted = R"(stdout "-r /bin/ls rx\n")",
      .printedRevoked = R"(stdout "-r /bin/ls \n")",
      .getter = "GetFilePathAccessRules",
      .install =
          [](InstalledRules& rules) {
            rules.filePathAccess = {{7, 42, "appDom", "/bin/ls", "rx"},
                                    {7, 42, "appDom", "/bin/ls", ""}};
          },
  };
}

}  // namespace

const std::vector<RuleFamily>& VerdictFamilies() {
  static const std::vector<RuleFamily> families = {
      Syscall(),  Capability(),   CapabilityParam(), ObjectAccess(),
      DomTrans(), FileCreation(), UnixSockCreation()};
  return families;
}

const std::vector<RuleFamily>& AllFamilies() {
  static const std::vector<RuleFamily> families = [] {
    std::vector<RuleFamily> all = VerdictFamilies();
    all.push_back(FilePathAccess());
    return all;
  }();
  return families;
}

std::queue<std::string> Words(const std::string& text) {
  std::queue<std::string> words;
  std::istringstream stream(text);
  for (std::string word; stream >> word;) words.push(word);
  return words;
}

std::string OnLine(const std::string& text, unsigned int line) {
  const std::string seven = "{line: 7,";
  std::string result = text;
  return result.replace(result.find(seven), seven.size(), "{line: " + std::to_string(line) + ",");
}

}  // namespace SecPolicyTest
