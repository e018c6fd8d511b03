#pragma once

#include <list>
#include <memory>
#include <queue>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

// Policies line by line, for those who look at them without a load. Each line is read as a load
// reads it; one that a load does not take throws LineFailure.
namespace SecPolicy {

class DomainPolicy;

// The lines of a domain's policy file.
class DomainLines {
 public:
  DomainLines(const std::string& name, unsigned int id);
  DomainLines(const DomainLines&) = delete;
  DomainLines& operator=(const DomainLines&) = delete;
  ~DomainLines();

  void Read(unsigned int line, std::queue<std::string> words, TeskAccessInterfaceImpl& access);

  // The "-p" rules among the lines that were taken.
  std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& ParameterRules();

 private:
  std::unique_ptr<DomainPolicy> policy;
};

// The lines of the policy file of the tardisk `tardiskPath`.
class TardiskLines {
 public:
  TardiskLines(const std::string& policyFile, const std::string& tardiskPath)
      : policy(policyFile), tardisk(tardiskPath) {}

  void Read(unsigned int line, std::queue<std::string> words, TeskAccessInterfaceImpl& access);

 private:
  TardiskPolicy policy;
  std::string tardisk;
};

// Returns the name of an object.
std::string ReadObjectLine(const std::string& file, unsigned int line,
                           std::queue<std::string> words);

// Throws BraxoException, as the installing of a "-r" rule does, unless `permissions` are well.
void CheckPermissions(const std::string& permissions);

// Whether an entry of a labelled directory gets a label: links, sockets and entries of unknown type
// (DT_UNKNOWN) are left alone.
bool IsLabelled(unsigned char entryType);

// SetFileLabel and SetDirLabelRecursive. `error` becomes the error number when a file cannot be
// given the label.
void SetFileLabel(const std::string& path, const std::string& label,
                  TeskAccessInterfaceImpl& access, int& error);
void SetDirLabelRecursive(const std::string& dir, const std::string& label,
                          TeskAccessInterfaceImpl& access, int& error);

}  // namespace SecPolicy
