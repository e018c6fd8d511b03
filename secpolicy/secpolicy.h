#pragma once

#include <list>
#include <map>
#include <memory>
#include <queue>
#include <string>
#include <vector>

#include "braxo/lib/exception.h"
#include "secpolicy/export.h"
#include "teskctl/security.h"

/// The public interface of libsecpolicy: reads a host's security policy from plain-text files,
/// installs it into the kernel's access-control module, shows what is installed, and gives running
/// services a runtime interface.
///
/// Failures are Braxo::Lib::BraxoException with a finished message. An exception of another type
/// comes from the host or from memory allocation and passes through unchanged. Nothing is locked
/// and no thread is started: one process at a time loads a policy.
///
/// `access` is the caller's connection to the access-control module; it is only borrowed.
///
/// @code
/// SecPolicy::LoadPolicy("/etc/zorvan/secpolicy");
///
/// const unsigned int job =
///     SecPolicy::CreateDomain("job7", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
///
/// TeskCtl::Security::TeskAccessInterfaceImpl access;
/// SecPolicy::SetFileLabel("/etc/job7.conf", "jobConfig", access);
/// @endcode
namespace SecPolicy {

using TeskCtl::Security::TeskAccess_Capability;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_ModeParam;
using TeskCtl::Security::TeskAccess_ParamCheck;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using TeskCtl::Security::TeskAccessLabelType;

/// @defgroup loading Loading, restoring and showing the whole policy
/// @{

/// Installs the full policy under `policyDir`: objects, the check-access template domain, domains,
/// partner domains, tardisks (always of the fixed policy root) and file labels. A part that fails
/// is reported and the next is loaded; throws at the end when one failed. Ends the process when one
/// of the four well-known domains is missing after the domains are loaded; called from inside a
/// handler, it throws the exception being handled instead.
SECPOLICY_EXPORT void LoadPolicy(const std::string& policyDir);

/// Installs the early-boot policy: the domains under `earlyPolicyDir`, the objects and file labels
/// of the fixed policy root. The first failure is reported and ends the load; it is not thrown.
SECPOLICY_EXPORT void LoadPolicyEarly(const std::string& earlyPolicyDir);

/// Gives every installed domain the enforcement level that the configuration store holds for it. A
/// failure is reported and ends the walk; it is not thrown.
SECPOLICY_EXPORT void RestoreDomainEnforcement();

/// Prints the installed domains (all, or the one in the slot whose decimal number `domainName` is),
/// objects and tardisk labels to standard output. Throws at the first section that fails.
SECPOLICY_EXPORT void DisplayPolicy(const std::string& domainName);

/// @}

/// @defgroup well_known_domains Well-known domains
/// @{

/// Returns the kernel identifier that the latest LoadPolicy found for "globalVMDom"; 0 before that.
SECPOLICY_EXPORT unsigned int GetGlobalVMDomain();

/// Returns the kernel identifier that the latest LoadPolicy found for "ioFilterDom"; 0 before that.
SECPOLICY_EXPORT unsigned int GetIOFilterDomain();

/// Returns the kernel identifier that the latest LoadPolicy found for "appDom"; 0 before that.
SECPOLICY_EXPORT unsigned int GetDefaultTardiskDomain();

/// Returns the kernel identifier that the latest LoadPolicy found for "daemonFrameworkDom"; 0
/// before that.
SECPOLICY_EXPORT unsigned int GetDaemonFrameworkDomain();

/// @}

/// @defgroup reporting Reporting
/// @{

/// Asks the caller to try again: the operation may succeed if it is simply repeated.
class SECPOLICY_EXPORT SecPolicyRetryException : public Braxo::Lib::BraxoException {
 public:
  /// Copies `text`; the event message stays empty.
  explicit SecPolicyRetryException(const std::string& text);

  /// Copies `text` and shares the event message `handle`.
  SecPolicyRetryException(const std::string& text, const Braxo::Lib::KweMessage& handle);

  /// Copies the text and shares the event message.
  SecPolicyRetryException(const SecPolicyRetryException&);

  /// As the copy is made.
  SecPolicyRetryException& operator=(const SecPolicyRetryException&) = default;
  ~SecPolicyRetryException() override;
};

/// Reports progress to the system log, or to the kernel log while the system log does not run.
/// Throws what the kernel log throws.
SECPOLICY_EXPORT void SecpolicyInfo(const std::string& message);

/// Reports a failure on standard error, flushed, and then like SecpolicyInfo.
/// Throws what the kernel log throws.
SECPOLICY_EXPORT void SecpolicyError(const std::string& message);

/// Prints a section header to standard output: `title` and, unless it is empty, `subtitle`, between
/// two rules of dashes as wide as the longer one. Every line is flushed.
SECPOLICY_EXPORT void DisplayHeader(const std::string& title, const std::string& subtitle);

/// Throws the failure of a rule line that has the wrong number of words.
[[noreturn]] SECPOLICY_EXPORT void RuleSizeError();

/// @}

/// @defgroup policy_files Policy files
/// @{

/// Splits `text` at single spaces; empty pieces are dropped.
SECPOLICY_EXPORT std::queue<std::string> StringToQueue(const std::string& text);

/// Splits what precedes the first "#" of `line`.
SECPOLICY_EXPORT std::queue<std::string> ParsePolicyLine(const std::string& line);

/// Adds the words of every line of the file at `path` that has any to `parsed`, by line number from
/// 1. Entries of other lines are kept. A line over 1023 characters is cut there and ends the file.
/// Throws, with `parsed` unchanged, when the file cannot be opened.
SECPOLICY_EXPORT void ParseFile(const std::string& path,
                                std::map<unsigned int, std::queue<std::string>>& parsed);

/// Adds every regular file of `dir` to `files`: the full path (`dir`, "/" and the name) and the
/// name. Throws, with `files` unchanged, when the directory cannot be opened.
SECPOLICY_EXPORT void GetFileList(const std::string& dir,
                                  std::map<std::string, std::string>& files);

/// True for "grant", false for "revoke"; throws for any other word. `word` is left as it is.
SECPOLICY_EXPORT bool IsGrant(std::string& word);

/// @}

/// @defgroup domain_policy Domain policy
/// @{

/// Installs every domain policy file of `dir`; the file's name is the domain's. Bad files are
/// reported and the others installed. Throws when the directory cannot be read or a domain cannot
/// be created, and at the end when a domain failed.
SECPOLICY_EXPORT void LoadPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access);

/// Installs the partner domains of the fixed policy root, if there are any, as LoadPolicyDomains.
SECPOLICY_EXPORT void LoadPartnerPolicyDomains(TeskAccessInterfaceImpl& access);

/// Prints a header and the domain in the slot whose decimal number `domain` is, or every domain
/// when `domain` is empty. A slot that fails does not stop the others; throws at the end.
SECPOLICY_EXPORT void DisplayPolicyDomains(TeskAccessInterfaceImpl& access,
                                           const std::string& domain);

/// Prints the domain in slot `id` with its rules; nothing for an empty slot. A domain or a kind of
/// rule that cannot be read is reported, not thrown.
SECPOLICY_EXPORT void DisplayDomainPolicy(TeskAccessInterfaceImpl& access, unsigned int id);

/// @}

/// @defgroup object_policy Object policy
/// @{

/// Makes the kernel's object labels equal to the names in the files of `dir`. Bad files are
/// reported and the names read are installed; throws at the end when a file failed, and when the
/// directory cannot be read.
SECPOLICY_EXPORT void LoadPolicyObjects(const std::string& dir, TeskAccessInterfaceImpl& access);

/// Prints the objects that the kernel knows, with their identifiers.
SECPOLICY_EXPORT void DisplayPolicyObjects(TeskAccessInterfaceImpl& access);

/// Brings the kernel's labels of `type` into line with `policyLabels`: labels whose values became
/// invalid are made anew, labels of `kernelLabels` (name to kernel value) that nobody names are
/// removed, the policy's are added. Reports what was changed and removed. Throws what the kernel
/// throws; the steps before that stay done.
SECPOLICY_EXPORT void SyncLabelsFromPolicy(std::vector<std::string> policyLabels,
                                           std::map<std::string, long> kernelLabels,
                                           TeskAccessLabelType type,
                                           TeskAccessInterfaceImpl& access);

/// Returns, in ascending order, the `kernelLabels` that are neither in `policyLabels` nor built in
/// nor, for domain labels, those of a privileged virtual machine.
SECPOLICY_EXPORT std::vector<std::string> GetObsoleteLabels(
    std::vector<std::string> policyLabels, std::map<std::string, long> kernelLabels,
    TeskAccessLabelType type, TeskAccessInterfaceImpl& access);

/// Reports `labels` as changed, one line each under a heading; nothing when empty.
SECPOLICY_EXPORT void PrintInvalidLabels(std::vector<std::string> labels, TeskAccessLabelType type);

/// Reports `labels` as removed, one line each under a heading; nothing when empty.
SECPOLICY_EXPORT void PrintObsoleteLabels(std::vector<std::string> labels,
                                          TeskAccessLabelType type);

/// @}

/// @defgroup file_labels File labels
/// @{

/// Labels files and trees as the files of `dir` say. Bad lines and labels are reported and the
/// others applied; throws at the end when one failed, and when the directory cannot be read.
SECPOLICY_EXPORT void LoadPolicyFileLabels(const std::string& dir, TeskAccessInterfaceImpl& access);

/// Gives the file at `path` the object label `label`. Throws for an unknown label, and for a file
/// that does not carry a label yet.
SECPOLICY_EXPORT void SetFileLabel(const std::string& path, const std::string& label,
                                   TeskAccessInterfaceImpl& access);

/// Gives `dir` and everything in it the object label `label`, but links, sockets and entries whose
/// type the directory does not tell. Throws at the first entry that fails; what was labelled before
/// keeps its label.
SECPOLICY_EXPORT void SetDirLabelRecursive(const std::string& dir, const std::string& label,
                                           TeskAccessInterfaceImpl& access);

/// Returns the object label of the file at `path`; throws when it carries none.
SECPOLICY_EXPORT std::string GetFileLabel(const std::string& path, TeskAccessInterfaceImpl& access);

/// @}

/// @defgroup tardisk_policy Tardisk policy
/// @{

class TardiskRules;

/// The policy file of one tardisk.
class SECPOLICY_EXPORT TardiskPolicy {
 public:
  /// Remembers the path of the policy file; does not touch the file.
  explicit TardiskPolicy(const std::string& policyFile);
  TardiskPolicy(const TardiskPolicy&) = delete;
  TardiskPolicy& operator=(const TardiskPolicy&) = delete;
  ~TardiskPolicy();

  /// Returns the path of the tardisk that the policy file came from, empty when it came from none.
  /// Throws when that cannot be found out.
  std::string GetBackingTardiskPath();

  /// Reads the policy file. Throws at the first bad line; the rules before it are kept. A file that
  /// came from no tardisk is reported and skipped.
  void ParsePolicy(TeskAccessInterfaceImpl& access);

  /// Labels the tardisk and installs its domain transitions. Throws at the first failure.
  void SetPolicy(TeskAccessInterfaceImpl& access);

 private:
  friend class TardiskPolicySteps;

  std::string policyFile;
  std::map<std::string, std::unique_ptr<TardiskRules>> ruleSets;
};

/// Appends the path of every tardisk of the host, in directory order. Throws when they cannot be
/// listed.
SECPOLICY_EXPORT void GetAllTardisks(std::list<std::string>& tardisks);

/// Appends the policies of `policyDir` whose files came from a tardisk to `policies`, which the
/// caller deletes, also after an exception; and to `unmatched` the tardisks without a policy. Both
/// stay as they were when `policyDir` does not exist. Throws when the tardisks or the directory
/// cannot be listed, and when a policy file cannot be opened, examined or asked for its tardisk.
SECPOLICY_EXPORT void GetTardiskLists(const std::string& policyDir,
                                      std::list<TardiskPolicy*>& policies,
                                      std::list<std::string>& unmatched);

/// Reads and then applies every policy; bad ones are reported and the others applied. Throws at the
/// end when one failed. The policies stay the caller's.
SECPOLICY_EXPORT void ParseAndSetTardiskPolicy(std::list<TardiskPolicy*> policies,
                                               TeskAccessInterfaceImpl& access);

/// Installs the tardisk policies of `dir`, and the default policy for all other tardisks. Failures
/// are reported; throws at the end when there was one, and at once as GetTardiskLists.
SECPOLICY_EXPORT void LoadPolicyTardisks(const std::string& dir, TeskAccessInterfaceImpl& access);

/// Installs the default transitions and gives `tardisks` the default label. Failures are reported;
/// throws at the end when there was one, and at once for an unknown launch domain.
SECPOLICY_EXPORT void SetDefaultTardiskPolicy(std::list<std::string>& tardisks,
                                              TeskAccessInterfaceImpl& access);

/// Prints every tardisk with its label. A label that cannot be read is reported.
SECPOLICY_EXPORT void DisplayPolicyTardiskLabels(TeskAccessInterfaceImpl& access);

/// @}

/// @defgroup runtime_domains Runtime interface: domains
///
/// Each call checks its arguments, makes one kernel call and throws when it fails; nothing is
/// reported. A world is the kernel's process.
/// @{

/// Creates the domain `name`, not empty, with the default rules `dflt`; returns its identifier.
SECPOLICY_EXPORT unsigned int CreateDomain(const std::string& name, TeskAccessKsi_DefaultDom dflt);

/// Destroys the domain `id`.
SECPOLICY_EXPORT void DestroyDomain(unsigned int id);

/// Attaches the guest-communication service `service`, not empty, to the domain `id`.
SECPOLICY_EXPORT void AddGcomService(unsigned int id, const std::string& service);

/// Finds the domains that nothing references any more. `capacity` is the room in `ids`, counted in
/// identifiers; the kernel stores how many there are in `*count`, which is not null, and fills
/// `ids`, which may be null when `capacity` is 0.
SECPOLICY_EXPORT void RetrieveLeakedDomains(unsigned long capacity, unsigned int* count,
                                            unsigned int* ids);

/// Returns the identifier of the domain that `world` runs in.
SECPOLICY_EXPORT unsigned int GetDomainIDForWorld(int world);

/// Returns the name of the domain `id`, at most 64 bytes of it.
SECPOLICY_EXPORT std::string GetDomainNameForID(unsigned int id);

/// @}

/// @defgroup runtime_file_policies Runtime interface: file policies
/// @{

/// Adds the `count` rules at `rules`, which are only borrowed, to the domain `domainId`, for
/// `world` or, with 0, for all its worlds. The kernel stores a result word in `*result`, which is
/// not null.
SECPOLICY_EXPORT void AddFilePolicyBatch(int world, unsigned int domainId,
                                         TeskAccess_FileRule* rules, unsigned int count,
                                         unsigned int* result);

/// Removes the file policy for `path`, not empty, from the domain `domainId`: that of `world` or,
/// with 0, the one for all its worlds.
SECPOLICY_EXPORT void RemoveFilePolicy(int world, unsigned int domainId, const std::string& path);

/// Gives the file policy for `path`, not empty, of the domain `domainId` the permissions `mode`,
/// which are those of a TeskAccess_FileRule.
SECPOLICY_EXPORT void UpdateFilePolicy(unsigned int domainId, const std::string& path,
                                       unsigned int mode);

/// Returns the number of file policies of the domain `domainId`.
SECPOLICY_EXPORT unsigned int RetrieveNumberOfFilePolicies(unsigned int domainId);

/// Fills `buffer`, which holds `capacity` rules, with the file policies of the domain `domainId`.
/// Throws SecPolicyRetryException when the policies changed since they were counted.
SECPOLICY_EXPORT void RetrieveFilePolicies(unsigned int domainId, TeskAccess_FileRule* buffer,
                                           unsigned int capacity);

/// Points the file policies of virtual machines for `oldPath` to `newPath`; neither may be empty.
SECPOLICY_EXPORT void ReplaceFilePolicyVMs(const std::string& oldPath, const std::string& newPath);

/// @}

/// @defgroup runtime_capabilities Runtime interface: capabilities and parameter checks
///
/// The numbers are the host's, and so are their names and TeskAccess_ModeParam: of the Linux host
/// in "secpolicyhost/values.h" and "secpolicyhost/mode_param.h".
/// @{

/// Grants (`grant` not 0) or revokes the capability, 0 to 18, for the domain `domainId`.
SECPOLICY_EXPORT void SetCapRule(unsigned int domainId, TeskAccess_Capability capability,
                                 char grant);

/// Grants (`grant` not 0) or revokes the parameters `mode`, not null and only borrowed, of the
/// parameter check `check`, 0 to 9, for the domain `domainId`.
SECPOLICY_EXPORT void SetParamCheckRule(unsigned int domainId, TeskAccess_ParamCheck check,
                                        const TeskAccess_ModeParam* mode, char grant);

/// Removes the rule about the parameters `mode`, not null and only borrowed, of the parameter check
/// `check`, 0 to 9, from the domain `domainId`.
SECPOLICY_EXPORT void RemoveParamCheckRule(unsigned int domainId, TeskAccess_ParamCheck check,
                                           const TeskAccess_ModeParam* mode);

/// @}

}  // namespace SecPolicy
