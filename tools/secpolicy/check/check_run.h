#pragma once

#include <deque>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "diagnostic.h"
#include "policy/rule_kind.h"
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

// One check of a whole policy: what all its parts share.
struct CheckRun {
  // `unwanted` are the names of the warnings to leave out. Throws what the host throws.
  CheckRun(bool fresh, const std::vector<std::string>& unwanted)
      : scratch(fresh), diagnostics(unwanted) {}

  ScratchState scratch;  // first: `access` is a connection to it
  SecPolicy::TeskAccessInterfaceImpl access;
  DiagnosticList diagnostics;
  std::deque<SourceFile> files;
  std::map<std::string, std::string> contents;  // where that of a file lies, if in another one
  std::map<Policy::WordKind, Vocabulary> vocabularies;  // for hints; those that were asked

  // What the files say of each other.
  std::map<std::string, Place> objects;                      // where each is declared
  std::set<std::string> usedLabels;                          // in rules and on files
  std::map<std::string, const SourceFile*> domains;          // of policy files
  std::map<std::string, std::set<std::string>> transitions;  // from domain to domain
  std::set<std::string> enteredDomains;                      // other than by a -d rule
};

// Opens every policy file of `dir`, in the order in which a load takes them, and checks its bytes.
// What cannot be read becomes a problem; what a load skips, one of the kind `skipped`, but not the
// directory `expected`.
std::vector<NamedFile> OpenPolicyFiles(CheckRun& run, const std::string& dir,
                                       const std::string& expected = {},
                                       const Code& skipped = Codes::kSkippedEntry);

// Tells of everything in `dir`, but of the directory `expected`, that is no regular file.
void CheckEntries(CheckRun& run, const std::string& dir, const std::string& expected,
                  const Code& skipped);

// True when there is surely nothing at `path`.
bool IsMissing(const std::string& path);

// Tells when the word `word` of a line is a path that means another file in every directory.
void CheckIsAbsolute(CheckRun& run, const SourceFile& file, unsigned int line, std::size_t word);

// Adds the problem of a line of `file` that a load does not take.
void AddRefusal(CheckRun& run, const SourceFile& file, const SecPolicy::Problem& problem,
                const std::string& hint);

// The parts of a check, in the order in which a load comes to them. `dir` is that of the files.
void CheckObjects(CheckRun& run, const std::string& dir);
void CheckDomains(CheckRun& run, const std::string& dir, const std::string& prefix,
                  const std::string& expected = {});
void CheckTardisks(CheckRun& run, const std::string& dir);
void CheckFileLabels(CheckRun& run, const std::string& dir);

// Looks for domains that every host needs below `dir`, and for what nobody uses.
void CheckUse(CheckRun& run, const std::string& dir);

}  // namespace SecPolicyCli
