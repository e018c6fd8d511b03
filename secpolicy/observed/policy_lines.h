#pragma once

#include <deque>
#include <list>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

// Policies line by line, for those who look at them without a load. Each line is read as a load
// reads it: `problem` names the file and the line, and `words` are what stands there. Returns
// whether a load takes the line; when it does not, `problem` says why.
namespace SecPolicy {

class DomainPolicy;

using LineWords = std::span<const std::string>;

// The lines of a domain's policy file.
class DomainLines {
 public:
  DomainLines(const std::string& name, unsigned int id);
  DomainLines(const DomainLines&) = delete;
  DomainLines& operator=(const DomainLines&) = delete;
  ~DomainLines();

  bool Read(LineWords words, TeskAccessInterfaceImpl& access, Problem& problem);

  // The "-p" rules among the lines that were taken.
  std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& ParameterRules();

 private:
  std::unique_ptr<DomainPolicy> policy;
};

// The lines of the policy file of the tardisk `tardiskPath`.
class TardiskLines {
 public:
  TardiskLines(const std::string& policyFile, const std::string& tardiskPath);

  bool Read(LineWords words, TeskAccessInterfaceImpl& access, Problem& problem);

 private:
  TardiskPolicy policy;
  std::string tardisk;
};

// Appends the name of an object to `names`.
bool ReadObjectLine(LineWords words, std::vector<std::string>& names, Problem& problem);

// Appends a file label to `labels`.
bool ReadFileLabelLine(LineWords words, TeskAccessInterfaceImpl& access,
                       std::deque<FileLabel>& labels, Problem& problem);

// Appends the labels of a whole file to `labels`. Throws BraxoException at the first line that a
// load does not take; the labels before it are kept.
void ReadFileLabels(const std::string& file, TeskAccessInterfaceImpl& access,
                    std::deque<FileLabel>& labels);

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
