#pragma once

#include <cstddef>
#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "check/check_run.h"
#include "file_role.h"
#include "host/linux/operation/policy_load.h"

namespace SecPolicyCli {

// A file of a policy as it was read.
struct PolicyFile {
  FileRole role = {};
  std::string domain;                  // of a domain's file: the name of the domain
  const SourceFile* source = nullptr;  // until the policy is checked again
};

// A policy that is checked again and again while its files are edited. What it finds is what
// CheckPolicy would, of files with the content that they are given here; after an edit only the
// files are read again that depend on it.
class LivePolicy {
 public:
  // Of the policy directory `root`. `isFresh` and `unwantedCodes` as for CheckRequest.
  LivePolicy(std::string root, bool isFresh, std::vector<std::string> unwantedCodes);
  LivePolicy(const LivePolicy&) = delete;
  LivePolicy& operator=(const LivePolicy&) = delete;
  ~LivePolicy();

  const std::string& Root() const { return dir; }

  // The file `path` has this content from now on, whatever is on disk; and has again what is there.
  // Nothing is checked yet.
  void Take(const std::string& path, const std::string& content);
  void Release(const std::string& path);

  // What is installed, which files there are and what is on disk may have changed.
  void Forget() { isComplete = false; }

  // Checks what has changed, if anything. Throws what the host throws.
  void Check();

  // The files whose problems have changed since this was asked last.
  std::set<std::string> TakeChanged();

  // The problems of the file, those of its lines in order. Of one that is none of the policy's, or
  // is not there, none.
  std::vector<Diagnostic> ProblemsOf(const std::string& file) const;

  // All files, in the order in which a load takes them.
  std::vector<PolicyFile> Files() const;

  // The tables of the host, as they are for the whole policy.
  CheckRun& Tables() { return *run; }

 private:
  // A file that defines a domain.
  struct DomainFile {
    DomainFile(std::string filePath, std::string fileName, std::size_t dirNumber,
               const std::vector<std::string>& unwanted)
        : path(std::move(filePath)),
          name(std::move(fileName)),
          dir(dirNumber),
          bytes(unwanted),
          lines(unwanted) {}

    std::string path;
    std::string name;  // of the file
    std::size_t dir;   // the number of its directory among those of domains
    DomainSource
        domain;      // without a file when it cannot be read, without a name when it is refused
    Findings bytes;  // with the file itself
    Findings lines;
  };

  // What of the policy is to be checked again.
  struct Stale {
    bool objects = false;
    bool tardisks = false;
    bool fileLabels = false;
    std::set<DomainFile*> domains = {};
  };

  void Clear();
  void CheckAll();
  void CheckDomainsDirs();
  void CheckDomainsDir(std::size_t number);
  std::optional<Stale> TakeEdited();
  void AddDependent(const std::set<std::string>& labels, Stale& stale);
  void CheckEdited();
  std::set<std::string> CheckEditedObjects();
  bool Open(DomainFile& file);
  void CheckLines(DomainFile& file);
  void CheckTardiskFiles();
  void CheckLabelFiles();
  void CheckUses();

  // What `body` finds becomes part of the findings.
  template <class Body>
  void Collect(Findings& findings, Body body);

  // What `body` finds takes the place of what was found before.
  template <class Body>
  void Renew(Findings& findings, Body body);
  void Replace(Findings& findings, Findings renewed);

  void NoteChanges(const DiagnosticList& before, const DiagnosticList& after);
  bool DependsOnLaterDomains(const DomainFile& file) const;
  bool IsIn(const std::string& path, const char* name) const;

  std::string dir;
  bool fresh;
  std::vector<std::string> unwanted;
  std::map<std::string, std::string> contents;  // by path
  std::set<std::string> edited;                 // since the latest check
  std::set<std::string> changed;
  bool isComplete = false;  // the tables below are those of all files

  std::unique_ptr<CheckRun> run;  // as Findings, what all files say of others
  std::unique_ptr<LinuxHost::PolicyTransaction> load;
  std::vector<DomainsDir> domainsDirs;
  Findings objects;
  std::deque<DomainFile> domainFiles;  // none ever moves
  Findings names;                      // of the directories of domains
  Findings tardisks;
  Findings fileLabels;
  DiagnosticList uses;
  std::map<std::string, std::size_t> labelUses;  // how many findings have each label
};

}  // namespace SecPolicyCli
