#include "scenarios/good_host.h"

#include <algorithm>
#include <sstream>

#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr char kTardiskPolicy[] = "/etc/zorvan/secpolicy/tardisks/base";

}  // namespace

GoodRoots::GoodRoots()
    : FixedRoots({
          {"/policy/objects/base", "toolLabel\nlogLabel  # written by everybody\n"},
          {"/policy/domains/appDom", "# the domain of tardisks without a policy\n"},
          {"/policy/domains/daemonFrameworkDom", "-s execve grant\n"},
          {"/policy/domains/globalVMDom",
           "-r /vm rw\n"
           "-s read grant\n"
           "-c cap_chown revoke\n"
           "-p bind_port 80 443 grant\n"
           "-a toolLabel read grant\n"
           "-d toolLabel supportDom exec grant\n"
           "-f toolLabel logLabel regular grant\n"
           "-u logLabel stream revoke\n"},
          {"/policy/domains/ioFilterDom", "-a logLabel write grant\n"},
          {"/policy/domains/plugins/notRead", "-x\n"},
          {"/policy/tardisks/notRead", "-x\n"},
          {"/policy/fileLabels/tools", "/opt/tool/run toolLabel\n/opt/log/* logLabel\n"},
          {"/etc/zorvan/secpolicy/domains/plugins/mon", "-s write grant\n"},
          {"/etc/zorvan/secpolicy/domains/notRead", "-x\n"},
          {kTardiskPolicy, "-E toolLabel globalVMDom\n"},
          {"/etc/zorvan/secpolicy/objects/base", "earlyLabel\n"},
          {"/etc/zorvan/secpolicy/fileLabels/base", "/opt/early earlyLabel\n"},
          {"/early/domains/bootDom", "-s read grant\n"},
          {"/early/objects/notRead", "two words\n"},
          {"/early/fileLabels/notRead", "one\n"},
          {"/tardisks/base.tgz", ""},
          {"/tardisks/extra.tgz", ""},
          {"/opt/log/today", ""},
          {"/opt/tool/run", ""},
          {"/opt/early", ""},
      }) {}

void ScriptGoodHost(ScriptedHost& host) {
  host.domains[1] = {.name = "supportDom",
                     .level = "permissive",
                     .state = 4294967295,
                     .refCount = 17,
                     .worldRefCount = 3};
  host.SetTardisk(kTardiskPolicy, "base.tgz");
  host.DeclareLabel("toolLabel", 4);
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {{"oldLabel", 9}, {"toolLabel", 4}, {"unlabeled", 2}};
  host.invalidLabels[TESKACCESS_LABEL_OBJECT] = {"logLabel"};
  host.SetOption("/UserVars/CheckAccessTemplateEnabled", 1);
}

void LoadOnce(ScriptedHost& host) {
  SecPolicy::LoadPolicy("/policy");
  host.keywords[TESKACCESS_KEYWORD_LABEL] = {
      {"logLabel", 5}, {"tardiskDefault", 3}, {"toolLabel", 4}, {"unlabeled", 2}};
  host.invalidLabels.clear();
  // A file policy goes to the kernel by another road than the one on which rules are read back.
  host.rules[5].filePathAccess = {
      {.line = 0, .domainId = 5, .domainName = "globalVMDom", .path = "/vm", .permissions = "rw"}};
}

std::string Informed(const std::string& message) {
  return "syslog(LOG_INFO, \"%s\", " + Quoted(message) + ")\n";
}

std::string Reported(const std::string& message) {
  return "stderr " + Quoted("Error: " + message + "\n") + "\n" + "syslog(LOG_ERR, \"Error: %s\", " +
         Quoted(message) + ")\n";
}

std::string Printed(const std::string& line) { return "stdout " + Quoted(line + "\n") + "\n"; }

std::string PrintedHeader(const std::string& title, const std::string& subtitle) {
  const std::string rule(std::max(title.size(), subtitle.size()), '-');
  const std::string second = subtitle.empty() ? "" : Printed(subtitle);
  return Printed("") + Printed("") + Printed(rule) + Printed(title) + second + Printed(rule);
}

std::vector<std::string> SplitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

std::string WithoutLines(const std::string& text, const std::string& start) {
  std::string kept;
  for (const std::string& line : SplitLines(text)) {
    if (!line.starts_with(start)) kept += line + "\n";
  }
  return kept;
}

std::string FirstLines(const std::string& text, std::size_t count) {
  std::vector<std::string> lines = SplitLines(text);
  lines.resize(count);
  std::string kept;
  for (const std::string& line : lines) kept += line + "\n";
  return kept;
}

std::string WithoutLastLine(const std::string& text) {
  return text.substr(0, text.rfind('\n', text.size() - 2) + 1);
}

const std::string kDone = "~TeskAccessInterfaceImpl()\n";

const std::string kFailed =
    "~TeskAccessInterfaceImpl()\n"
    "throws Braxo::Lib::BraxoException: "
    "There were some problems encountered in setting the policy\n";

const LoadSections kFirstLoad = {
    .begin = R"(TeskAccessInterfaceImpl()
syslog(LOG_INFO, "%s", "Using policy dir /policy")
)",
    .objects = R"(syslog(LOG_INFO, "%s", "Parsed all objects")
GetKeywordsMap(LABEL)
GetInvalidLabels(OBJECT)
RemoveLabels(["logLabel"], OBJECT)
AddLabels(["logLabel"], OBJECT)
syslog(LOG_INFO, "%s", "The values of the following objects have been changed:")
syslog(LOG_INFO, "%s", "logLabel")
IsPredefinedLabel("oldLabel", OBJECT)
IsPredefinedLabel("unlabeled", OBJECT)
RemoveLabels(["oldLabel"], OBJECT)
syslog(LOG_INFO, "%s", "The following objects have been removed:")
syslog(LOG_INFO, "%s", "oldLabel")
AddLabels(["toolLabel", "logLabel"], OBJECT)
syslog(LOG_INFO, "%s", "Objects defined and obsolete objects removed")
)",
    .templateDomain = R"(FindOption("/UserVars/CheckAccessTemplateEnabled")
AdvancedIntegerOption::GetValue("/UserVars/CheckAccessTemplateEnabled")
FindDomain("checkAccessTemplateDom")
CreateDomain("checkAccessTemplateDom", 3)
FindDomain("checkAccessTemplateDom")
SetFilePathAccessRules([{line: 0, domainId: 2, domainName: "", path: "/", permissions: ""}])
~AdvancedOption("/UserVars/CheckAccessTemplateEnabled")
)",
    .domains = R"(FindDomain("appDom")
CreateDomain("appDom", 0)
FindDomain("daemonFrameworkDom")
CreateDomain("daemonFrameworkDom", 0)
FindDomain("globalVMDom")
CreateDomain("globalVMDom", 0)
FindDomain("ioFilterDom")
CreateDomain("ioFilterDom", 0)
syslog(LOG_INFO, "%s", "Parsed all domain names")
ValidateKeyword(SYSCALL, "execve")
ValidateKeyword(SYSCALL, "read")
ValidateKeyword(CAPABILITY, "cap_chown")
ValidateKeyword(PARAM_CHECK, "bind_port")
ValidateKeyword(LABEL, "toolLabel")
ValidateKeyword(OBJECT_ACCESS, "read")
FindDomain("supportDom")
ValidateKeyword(LABEL, "toolLabel")
ValidateKeyword(DOM_TRANS, "exec")
ValidateKeyword(LABEL, "toolLabel")
ValidateKeyword(LABEL, "logLabel")
ValidateKeyword(FILE_CREATION, "regular")
ValidateKeyword(LABEL, "logLabel")
ValidateKeyword(UNIX_SOCK_CREATION, "stream")
ValidateKeyword(LABEL, "logLabel")
ValidateKeyword(OBJECT_ACCESS, "write")
syslog(LOG_INFO, "%s", "Domain policies parsed and syntax validated")
CheckCapabilityParamRuleConstraints("appDom", [])
CheckCapabilityParamRuleConstraints("daemonFrameworkDom", [])
CheckCapabilityParamRuleConstraints("globalVMDom", [{line: 4, domainId: 5, domainName: "globalVMDom", paramCheck: "bind_port", firstParam: "80", secondParam: "443", grant: true}])
CheckCapabilityParamRuleConstraints("ioFilterDom", [])
syslog(LOG_INFO, "%s", "Constraints check for domain policies succeeded")
SetSyscallRule({line: 1, domainId: 4, domainName: "daemonFrameworkDom", syscall: "execve", grant: true})
SetObjectAccessRule({line: 5, domainId: 5, domainName: "globalVMDom", label: "toolLabel", accessKind: "read", grant: true})
SetCapabilityRule({line: 3, domainId: 5, domainName: "globalVMDom", capability: "cap_chown", grant: false})
SetDomTransRule({line: 6, domainId: 5, domainName: "globalVMDom", label: "toolLabel", targetDomain: "supportDom", targetDomainId: 1, transitionKind: "exec", grant: true})
SetFileCreationRule({line: 7, domainId: 5, domainName: "globalVMDom", label: "toolLabel", secondLabel: "logLabel", creationKind: "regular", grant: true})
SetCapabilityParamRule({line: 4, domainId: 5, domainName: "globalVMDom", paramCheck: "bind_port", firstParam: "80", secondParam: "443", grant: true})
RealPath("/vm")
Call(0x405f, 0, 5, [{"/vm", 3}, {"/vm", 3}], 2, &out)
SetSyscallRule({line: 2, domainId: 5, domainName: "globalVMDom", syscall: "read", grant: true})
SetUnixSockCreationRule({line: 8, domainId: 5, domainName: "globalVMDom", label: "logLabel", sockKind: "stream", grant: false})
SetObjectAccessRule({line: 1, domainId: 6, domainName: "ioFilterDom", label: "logLabel", accessKind: "write", grant: true})
syslog(LOG_INFO, "%s", "Domain policies set")
)",
    .partners = R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins")
File_IsDirectory("/etc/zorvan/secpolicy/domains/plugins")
FindDomain("plugin-mon")
CreateDomain("plugin-mon", 0)
syslog(LOG_INFO, "%s", "Parsed all domain names")
ValidateKeyword(SYSCALL, "write")
syslog(LOG_INFO, "%s", "Domain policies parsed and syntax validated")
CheckCapabilityParamRuleConstraints("plugin-mon", [])
syslog(LOG_INFO, "%s", "Constraints check for domain policies succeeded")
SetSyscallRule({line: 1, domainId: 7, domainName: "plugin-mon", syscall: "write", grant: true})
syslog(LOG_INFO, "%s", "Domain policies set")
)",
    .wellKnown = R"(FindDomain("globalVMDom")
SetGlobalVMDomain(5)
FindDomain("ioFilterDom")
SetIoFilterDomain(6)
FindDomain("appDom")
FindDomain("daemonFrameworkDom")
SetDaemonFrameworkDomain(4)
)",
    .tardisks = R"(Sysinfo(1)
Sysinfo::AddInstancePath("/etc/zorvan/secpolicy/tardisks/base")
Sysinfo::Get(548)
~Sysinfo()
Sysinfo(1)
Sysinfo::AddInstancePath("/etc/zorvan/secpolicy/tardisks/base")
Sysinfo::Get(548)
~Sysinfo()
FindDomain("globalVMDom")
syslog(LOG_INFO, "%s", "Parsed all the tardisk policy files")
LookupLabel("toolLabel", OBJECT)
SetXattr("/tardisks/base.tgz", "zorvan.security", 4, 4, 2)
GetTardiskLaunchDomains()
GetTardiskExecEventKeyword()
FindDomain("hostDom")
SetDomTransRule({line: 1, domainId: 0, domainName: "hostDom", label: "toolLabel", targetDomain: "globalVMDom", targetDomainId: 5, transitionKind: "tardisk_exec", grant: true})
GetTardiskExecEventKeyword()
FindDomain("daemonFrameworkDom")
SetDomTransRule({line: 1, domainId: 4, domainName: "daemonFrameworkDom", label: "toolLabel", targetDomain: "globalVMDom", targetDomainId: 5, transitionKind: "tardisk_exec", grant: true})
syslog(LOG_INFO, "%s", "Set all the tardisk labels and policy")
GetDefaultTardiskLabel()
GetDefaultTardiskDomain()
GetTardiskLaunchDomains()
GetTardiskExecEventKeyword()
FindDomain("hostDom")
SetDomTransRule({line: 0, domainId: 0, domainName: "hostDom", label: "tardiskDefault", targetDomain: "appDom", targetDomainId: 3, transitionKind: "tardisk_exec", grant: true})
FindDomain("daemonFrameworkDom")
SetDomTransRule({line: 0, domainId: 4, domainName: "daemonFrameworkDom", label: "tardiskDefault", targetDomain: "appDom", targetDomainId: 3, transitionKind: "tardisk_exec", grant: true})
LookupLabel("tardiskDefault", OBJECT)
SetXattr("/tardisks/extra.tgz", "zorvan.security", 3, 4, 2)
)",
    .fileLabels = R"(ValidateKeyword(LABEL, "toolLabel")
ValidateKeyword(LABEL, "logLabel")
syslog(LOG_INFO, "%s", "Parsed all file label mappings")
LookupLabel("toolLabel", OBJECT)
SetXattr("/opt/tool/run", "zorvan.security", 4, 4, 2)
LookupLabel("logLabel", OBJECT)
SetXattr("/opt/log", "zorvan.security", 5, 4, 2)
LookupLabel("logLabel", OBJECT)
SetXattr("/opt/log/today", "zorvan.security", 5, 4, 2)
syslog(LOG_INFO, "%s", "Set all file labels")
)",
    .end = Informed("System security policy has been set successfully") + kDone + "returns\n",
};

const LoadSections kNextLoad = {
    .begin = kFirstLoad.begin,
    .objects = R"(syslog(LOG_INFO, "%s", "Parsed all objects")
GetKeywordsMap(LABEL)
GetInvalidLabels(OBJECT)
RemoveLabels([], OBJECT)
AddLabels([], OBJECT)
IsPredefinedLabel("tardiskDefault", OBJECT)
IsPredefinedLabel("unlabeled", OBJECT)
RemoveLabels([], OBJECT)
AddLabels(["toolLabel", "logLabel"], OBJECT)
syslog(LOG_INFO, "%s", "Objects defined and obsolete objects removed")
)",
    .templateDomain = R"(FindOption("/UserVars/CheckAccessTemplateEnabled")
AdvancedIntegerOption::GetValue("/UserVars/CheckAccessTemplateEnabled")
FindDomain("checkAccessTemplateDom")
~AdvancedOption("/UserVars/CheckAccessTemplateEnabled")
)",
    .domains = WithoutLines(kFirstLoad.domains, "CreateDomain("),
    .partners = WithoutLines(kFirstLoad.partners, "CreateDomain("),
    .wellKnown = kFirstLoad.wellKnown,
    .tardisks = kFirstLoad.tardisks,
    .fileLabels = kFirstLoad.fileLabels,
    .end = kFirstLoad.end,
};

const LoadSections kEarlyLoad = {
    .begin = R"(TeskAccessInterfaceImpl()
syslog(LOG_INFO, "%s", "Using early policy dir /early")
)",
    .objects = R"(syslog(LOG_INFO, "%s", "Parsed all objects")
GetKeywordsMap(LABEL)
GetInvalidLabels(OBJECT)
RemoveLabels(["logLabel"], OBJECT)
AddLabels(["logLabel"], OBJECT)
syslog(LOG_INFO, "%s", "The values of the following objects have been changed:")
syslog(LOG_INFO, "%s", "logLabel")
IsPredefinedLabel("oldLabel", OBJECT)
IsPredefinedLabel("toolLabel", OBJECT)
IsPredefinedLabel("unlabeled", OBJECT)
RemoveLabels(["oldLabel", "toolLabel"], OBJECT)
syslog(LOG_INFO, "%s", "The following objects have been removed:")
syslog(LOG_INFO, "%s", "oldLabel")
syslog(LOG_INFO, "%s", "toolLabel")
AddLabels(["earlyLabel"], OBJECT)
syslog(LOG_INFO, "%s", "Objects defined and obsolete objects removed")
)",
    .templateDomain = "",
    .domains = R"(FindDomain("bootDom")
CreateDomain("bootDom", 0)
syslog(LOG_INFO, "%s", "Parsed all domain names")
ValidateKeyword(SYSCALL, "read")
syslog(LOG_INFO, "%s", "Domain policies parsed and syntax validated")
CheckCapabilityParamRuleConstraints("bootDom", [])
syslog(LOG_INFO, "%s", "Constraints check for domain policies succeeded")
SetSyscallRule({line: 1, domainId: 2, domainName: "bootDom", syscall: "read", grant: true})
syslog(LOG_INFO, "%s", "Domain policies set")
)",
    .partners = "",
    .wellKnown = "",
    .tardisks = "",
    .fileLabels = R"(ValidateKeyword(LABEL, "earlyLabel")
syslog(LOG_INFO, "%s", "Parsed all file label mappings")
LookupLabel("earlyLabel", OBJECT)
SetXattr("/opt/early", "zorvan.security", 6, 4, 2)
syslog(LOG_INFO, "%s", "Set all file labels")
)",
    .end = kDone + "returns\n",
};

namespace {

struct ShownDomain {
  std::string title;
  std::string subtitle;
  std::vector<std::string> ruleSets;  // the lines of each kind that has rules
};

const std::vector<ShownDomain> kShownDomains = {
    {"Domain Name: hostDom Domain ID :0 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {"-d toolLabel globalVMDom tardisk_exec grant\n"
      "-d tardiskDefault appDom tardisk_exec grant\n"}},
    {"Domain Name: supportDom Domain ID :1 Enforcement Level: permissive",
     "State: 4294967295 RefCount: 17 WorldRefCount: 3 defaultDom: 0",
     {}},
    {"Domain Name: checkAccessTemplateDom Domain ID :2 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 3",
     {"-r / \n"}},
    {"Domain Name: appDom Domain ID :3 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {}},
    {"Domain Name: daemonFrameworkDom Domain ID :4 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {"-d toolLabel globalVMDom tardisk_exec grant\n"
      "-d tardiskDefault appDom tardisk_exec grant\n",
      "-s execve grant\n"}},
    {"Domain Name: globalVMDom Domain ID :5 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {"-a toolLabel read grant\n", "-c cap_chown revoke\n", "-d toolLabel supportDom exec grant\n",
      "-f toolLabel logLabel regular grant\n", "-p bind_port 80 443 grant\n", "-r /vm rw\n",
      "-s read grant\n", "-u logLabel stream revoke\n"}},
    {"Domain Name: ioFilterDom Domain ID :6 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {"-a logLabel write grant\n"}},
    {"Domain Name: plugin-mon Domain ID :7 Enforcement Level: enforcing",
     "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0",
     {"-s write grant\n"}},
};

}  // namespace

std::string DisplayedDomain(unsigned int id) {
  const ShownDomain& domain = kShownDomains[id];
  const std::string slot = "(" + std::to_string(id) + ")\n";
  std::string text = "GetCompleteDomainInfo" + slot + PrintedHeader(domain.title, domain.subtitle);
  for (const char* kind : {"ObjectAccess", "Capability", "DomTrans", "FileCreation",
                           "CapabilityParam", "FilePathAccess", "Syscall", "UnixSockCreation"}) {
    text += std::string("Get") + kind + "Rules" + slot;
  }
  for (const std::string& rules : domain.ruleSets) {
    for (const std::string& line : SplitLines(rules)) text += Printed(line);
    text += Printed("") + Printed("");
  }
  return text + Printed("");
}

std::string DisplayedDomains() {
  std::string text = PrintedHeader("Policy set in the kernel", "") + "GetMaxDomains()\n";
  for (unsigned int id = 0; id < kShownDomains.size(); ++id) text += DisplayedDomain(id);
  return text;
}

std::string DisplayedObjects() {
  return PrintedHeader("Objects Defined: Name (Kernel Id)", "") + "GetKeywordsMap(LABEL)\n" +
         Printed("logLabel (5)") + Printed("tardiskDefault (3)") + Printed("toolLabel (4)") +
         Printed("unlabeled (2)");
}

// The path stands before the label is read, and is not flushed until the line is complete.
std::string DisplayedTardisks() {
  return PrintedHeader("Tardisk Path (label)", "") +
         "stdout unflushed \"/tardisks/base.tgz (\"\n"
         "GetXattr(\"/tardisks/base.tgz\", \"zorvan.security\", 4)\n"
         "GetLabel(4, OBJECT)\n" +
         Printed("toolLabel)");
}

}  // namespace SecPolicyTest
