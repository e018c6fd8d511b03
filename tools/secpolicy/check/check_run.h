#pragma once

#include <cstddef>
#include <deque>
#include <istream>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "diagnostic.h"
#include "policy/rule_kind.h"
#include "policy_files.h"
#include "scratch/scratch_state.h"
#include "secpolicy/secpolicy.h"
#include "source_file.h"
#include "text/suggestion.h"

namespace SecPolicyCli {

// A line of a policy file.
struct Place {
  const SourceFile* file = nullptr;
  unsigned int line = 0;
};

// A policy file and its name in its directory.
struct NamedFile {
  const SourceFile* file = nullptr;
  std::string name;
};

// A policy file that defines a domain.
struct DomainSource {
  const SourceFile* file = nullptr;
  std::string name;
  unsigned int id = 0;
};

// What some files were found to be and to say.
struct Findings {
  // `unwanted` are the names of the warnings to leave out.
  explicit Findings(const std::vector<std::string>& unwanted) : diagnostics(unwanted) {}

  DiagnosticList diagnostics;
  std::deque<SourceFile> files;
  std::set<std::string> usedLabels;                          // in rules and on files
  std::map<std::string, std::set<std::string>> transitions;  // from domain to domain
  std::set<std::string> enteredDomains;                      // other than by a -d rule
};

// One check of a whole policy: what all its parts share, and what the part that is being checked
// finds.
struct CheckRun : Findings {
  // Throws what the host throws.
  CheckRun(bool fresh, const std::vector<std::string>& unwanted)
      : Findings(unwanted), scratch(fresh) {}

  ScratchState scratch;  // before `access`, which is a connection to it
  SecPolicy::TeskAccessInterfaceImpl access;
  std::map<std::string, std::string> contents;  // where that of a file lies, if in another one
  std::size_t contentsTaken = 0;                // also of files that have their own again
  std::map<Policy::WordKind, Vocabulary> vocabularies;  // for hints; those that were asked

  std::map<std::string, Place> objects;              // where each is declared
  std::map<std::string, const SourceFile*> domains;  // of policy files
};

// Takes what is read from `input` for the content of `file`. Throws what the host throws.
void TakeContent(CheckRun& run, const std::string& file, std::istream& input);

// The policy files of `dir` with their names, in the order in which a load takes them. A file whose
// content lies in another one need not be there. What cannot be read becomes a problem.
std::map<std::string, std::string> ListPolicyFiles(CheckRun& run, const std::string& dir);

// Opens the policy file `path` and checks its bytes. What cannot be read becomes a problem, and
// null.
const SourceFile* OpenPolicyFile(CheckRun& run, const std::string& path, const std::string& name);

// Opens every policy file of `dir`, in the order in which a load takes them, and checks its bytes.
// What cannot be read becomes a problem; what a load skips, one of the kind `skipped`, but not the
// directory `expected`.
std::vector<NamedFile> OpenPolicyFiles(CheckRun& run, const std::string& dir,
                                       const std::string& expected = {},
                                       const Code& skipped = Codes::kSkippedEntry);

// Tells of everything in `dir`, but of the directory `expected`, that is no regular file.
void CheckEntries(CheckRun& run, const std::string& dir, const std::string& expected,
                  const Code& skipped);

// True when an object has this name. Throws what the host throws.
bool IsObjectLabel(CheckRun& run, const std::string& name);

// True when there is surely nothing at `path`.
bool IsMissing(const std::string& path);

// Tells when the word `word` of a line is a path that means another file in every directory.
void CheckIsAbsolute(CheckRun& run, const SourceFile& file, unsigned int line, std::size_t word);

// Adds the problem of a line of `file` that a load does not take.
void AddRefusal(CheckRun& run, const SourceFile& file, const SecPolicy::Problem& problem,
                const Hint& hint);

// The parts of a check, in the order in which a load comes to them. `dir` is that of the files.
void CheckObjects(CheckRun& run, const std::string& dir);
void CheckDomains(CheckRun& run, const DomainsDir& dir);
void CheckTardisks(CheckRun& run, const std::string& dir);
void CheckFileLabels(CheckRun& run, const std::string& dir);

// The steps of CheckDomains: defines the domains of the files, of which those are returned that the
// host took; and checks the lines of a file.
std::vector<DomainSource> DefineDomains(CheckRun& run, const std::vector<NamedFile>& files,
                                        const std::string& prefix);
void CheckDomain(CheckRun& run, const DomainSource& domain, const std::string& prefix);

// Looks for domains that every host needs below `dir`, and for what nobody uses.
void CheckUse(CheckRun& run, const std::string& dir);

}  // namespace SecPolicyCli
