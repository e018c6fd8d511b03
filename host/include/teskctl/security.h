#pragma once

#include <list>
#include <map>
#include <memory>
#include <string>
#include <vector>

/// The kernel's access-control module.
namespace TeskCtl::Security {

/// The two label spaces of the access-control module. File and tardisk labels are object labels.
enum TeskAccessLabelType : int { TESKACCESS_LABEL_DOMAIN = 0, TESKACCESS_LABEL_OBJECT = 1 };

/// The keyword tables of the access-control module.
enum TeskAccess_KeywordType : int {
  TESKACCESS_KEYWORD_LABEL = 1,
  TESKACCESS_KEYWORD_CAPABILITY = 2,
  TESKACCESS_KEYWORD_PARAM_CHECK = 3,
  TESKACCESS_KEYWORD_OBJECT_ACCESS = 4,
  TESKACCESS_KEYWORD_DOM_TRANS = 5,
  TESKACCESS_KEYWORD_FILE_CREATION = 6,
  TESKACCESS_KEYWORD_UNIX_SOCK_CREATION = 7,
  TESKACCESS_KEYWORD_SYSCALL = 8
};

/// Which default rules a new domain starts with.
enum TeskAccessKsi_DefaultDom : int {
  TESKACCESS_DEFAULT_DOM_NONE = 0,
  TESKACCESS_DEFAULT_DOM_CHECK_ACCESS = 3
};

/// One of the 19 capabilities, 0 to 18; the host names them.
enum TeskAccess_Capability : unsigned int {};

/// One of the 10 parameter checks, 0 to 9; the host names them.
enum TeskAccess_ParamCheck : unsigned int {};

/// A file policy as it is exchanged with the kernel.
struct TeskAccess_FileRule {
  char path[1984];          ///< NUL-terminated
  unsigned int permission;  ///< 0x1 read, 0x2 write, 0x10 execute
};

/// The parameters of a parameter check; each host defines it in a header of its own.
struct TeskAccess_ModeParam;

// The rule records. All begin with the line of the policy file, and the identifier and the name of
// the domain that owns the rule; then the words of the policy line follow, as written.

/// A `-r` rule.
struct TeskAccess_FilePathAccessRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string path;           ///< as written or resolved
  std::string permissions;    ///< letters of "rwx", may be empty
};

/// A `-s` rule.
struct TeskAccess_SyscallRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string syscall;        ///< or a set, `@file`
  bool grant = false;         ///< false: revoke
};

/// A `-c` rule.
struct TeskAccess_CapabilityRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string capability;     ///< such as `cap_kill`
  bool grant = false;         ///< false: revoke
};

/// A `-p` rule.
struct TeskAccess_CapabilityParamRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string paramCheck;     ///< such as `bind_port`
  std::string firstParam;     ///< a number
  std::string secondParam;    ///< may be empty
  bool grant = false;         ///< false: revoke
};

/// An `-a` rule.
struct TeskAccess_ObjectAccessRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string label;          ///< of the object
  std::string accessKind;     ///< such as `read`
  bool grant = false;         ///< false: revoke
};

/// A `-d` rule.
struct TeskAccess_DomTransRule {
  unsigned int line = 0;            ///< in the policy file
  unsigned int domainId = 0;        ///< of the owner
  std::string domainName;           ///< of the owner
  std::string label;                ///< of the object
  std::string targetDomain;         ///< that is entered
  unsigned int targetDomainId = 0;  ///< that is entered
  std::string transitionKind;       ///< such as `exec`
  bool grant = false;               ///< false: revoke
};

/// An `-f` rule.
struct TeskAccess_FileCreationRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string label;          ///< of the object
  std::string secondLabel;    ///< of what is created
  std::string creationKind;   ///< such as `regular`
  bool grant = false;         ///< false: revoke
};

/// A `-u` rule.
struct TeskAccess_UnixSockCreationRule {
  unsigned int line = 0;      ///< in the policy file
  unsigned int domainId = 0;  ///< of the owner
  std::string domainName;     ///< of the owner
  std::string label;          ///< of the object
  std::string sockKind;       ///< such as `stream`
  bool grant = false;         ///< false: revoke
};

/// A caller's connection to the access-control module. One thread at a time uses a connection; each
/// may have its own. Processes need not care for each other. Construction and destruction leave
/// errno as it was. Every member but the destructor may throw Braxo::Lib::BraxoException, and does
/// so for a domain, label or word that it needs and the kernel does not know.
class __attribute__((visibility("default"))) TeskAccessInterfaceImpl {
 public:
  TeskAccessInterfaceImpl();
  TeskAccessInterfaceImpl(const TeskAccessInterfaceImpl&) = delete;
  TeskAccessInterfaceImpl& operator=(const TeskAccessInterfaceImpl&) = delete;
  ~TeskAccessInterfaceImpl();

  /// Writes the identifier of the domain `name` to `*id` and returns true; returns false and leaves
  /// `*id` untouched when there is no such domain.
  bool FindDomain(const std::string& name, unsigned int* id);

  /// Creates the domain `name` with the default rules `dflt` and returns its identifier.
  unsigned int CreateDomain(const std::string& name, TeskAccessKsi_DefaultDom dflt);

  /// The number of domain slots; identifiers are less than it.
  unsigned int GetMaxDomains();

  /// Describes the domain in slot `id`: name, enforcement level, state word, number of references,
  /// number of worlds that run in it, and its default rules. Returns false for an empty slot.
  bool GetCompleteDomainInfo(unsigned int id, std::string& name, std::string& enforcementLevel,
                             unsigned int& state, unsigned int& refCount,
                             unsigned int& worldRefCount, TeskAccessKsi_DefaultDom& dflt);

  /// Sets the enforcement level of the domain `name`.
  bool EnableDomain(const std::string& name, const std::string& level, bool flag);

  /// Tells the kernel which domain plays the part of the global VM's.
  bool SetGlobalVMDomain(unsigned int id);

  /// Tells the kernel which domain plays the part of the IO filter's.
  bool SetIoFilterDomain(unsigned int id);

  /// Tells the kernel which domain plays the part of the daemon framework's.
  bool SetDaemonFrameworkDomain(unsigned int id);

  /// True for the label of a domain that belongs to a privileged virtual machine.
  bool IsPrivilegedVm(const std::string& name);

  /// Attaches the guest-communication service `service` to the domain `id`.
  void AddGcomService(unsigned int id, const std::string& service);

  /// Checks `word` against the table of `type`; throws for an unknown word.
  bool ValidateKeyword(TeskAccess_KeywordType type, const std::string& word);

  /// The words of the table of `type` with their kernel identifiers.
  std::map<std::string, long> GetKeywordsMap(TeskAccess_KeywordType type);

  /// The kernel identifier of the label `name`; 1 when there is no such label.
  unsigned int LookupLabel(const std::string& name, TeskAccessLabelType type);

  /// The name of the label with the kernel identifier `id`.
  std::string GetLabel(unsigned int id, TeskAccessLabelType type);

  /// True for a label that is built into the kernel.
  bool IsPredefinedLabel(const std::string& name, TeskAccessLabelType type);

  /// The labels whose kernel values are no longer valid.
  std::vector<std::string> GetInvalidLabels(TeskAccessLabelType type);

  /// Adds those of the labels that are missing.
  bool AddLabels(std::vector<std::string> names, TeskAccessLabelType type);

  /// Removes the labels.
  bool RemoveLabels(std::vector<std::string> names, TeskAccessLabelType type);

  /// Install one rule, those of paths a whole list.
  /// @{
  void SetSyscallRule(TeskAccess_SyscallRule rule);
  void SetCapabilityRule(TeskAccess_CapabilityRule rule);
  void SetCapabilityParamRule(TeskAccess_CapabilityParamRule rule);
  void SetObjectAccessRule(TeskAccess_ObjectAccessRule rule);
  void SetDomTransRule(TeskAccess_DomTransRule rule);
  void SetFileCreationRule(TeskAccess_FileCreationRule rule);
  void SetUnixSockCreationRule(TeskAccess_UnixSockCreationRule rule);
  void SetFilePathAccessRules(std::list<TeskAccess_FilePathAccessRule>& rules);
  /// @}

  /// Append the rules of the domain `domainId` to `rules`.
  /// @{
  void GetFilePathAccessRules(unsigned int domainId,
                              std::list<TeskAccess_FilePathAccessRule>& rules);
  void GetSyscallRules(unsigned int domainId, std::list<TeskAccess_SyscallRule>& rules);
  void GetCapabilityRules(unsigned int domainId, std::list<TeskAccess_CapabilityRule>& rules);
  void GetCapabilityParamRules(unsigned int domainId,
                               std::list<TeskAccess_CapabilityParamRule>& rules);
  void GetObjectAccessRules(unsigned int domainId, std::list<TeskAccess_ObjectAccessRule>& rules);
  void GetDomTransRules(unsigned int domainId, std::list<TeskAccess_DomTransRule>& rules);
  void GetFileCreationRules(unsigned int domainId, std::list<TeskAccess_FileCreationRule>& rules);
  void GetUnixSockCreationRules(unsigned int domainId,
                                std::list<TeskAccess_UnixSockCreationRule>& rules);
  /// @}

  /// Throws when parameter-check rules of the domain `domainName` contradict each other.
  bool CheckCapabilityParamRuleConstraints(const std::string& domainName,
                                           std::list<TeskAccess_CapabilityParamRule>& rules);

  /// The domains from which programs of tardisks are launched.
  std::vector<std::string> GetTardiskLaunchDomains();

  /// The transition kind of executing a program from a tardisk.
  std::string GetTardiskExecEventKeyword();

  /// The label of a tardisk without a policy of its own.
  std::string GetDefaultTardiskLabel();

  /// The domain of a tardisk without a policy of its own.
  std::string GetDefaultTardiskDomain();

 private:
  class Impl;
  std::unique_ptr<Impl> impl;
};

}  // namespace TeskCtl::Security
