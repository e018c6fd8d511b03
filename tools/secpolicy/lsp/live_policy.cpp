#include "live_policy.h"

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <sstream>
#include <string_view>
#include <tuple>
#include <utility>

#include "kitlibs/file.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using ByFile = std::map<std::string_view, std::vector<const Diagnostic*>>;

ByFile Sorted(const DiagnosticList& list) {
  ByFile byFile;
  for (const Diagnostic& diagnostic : list.All()) byFile[diagnostic.file].push_back(&diagnostic);
  return byFile;
}

bool IsSame(const std::vector<const Diagnostic*>& one,
            const std::vector<const Diagnostic*>& other) {
  return std::ranges::equal(one, other, [](const auto* a, const auto* b) { return *a == *b; });
}

// Whether it is told of words that nobody knows: which ones are near depends on all that are known.
bool HasUnknownWord(const DiagnosticList& list) {
  return std::ranges::any_of(list.All(), [](const Diagnostic& diagnostic) {
    return diagnostic.code == &Codes::kUnknownWord || diagnostic.code == &Codes::kUnknownDomain;
  });
}

// Whether something else was found when these labels were not there, or were.
bool DependsOn(const Findings& findings, const std::set<std::string>& labels) {
  const auto isUsed = [&](const auto& label) { return findings.usedLabels.contains(label); };
  return !labels.empty() &&
         (HasUnknownWord(findings.diagnostics) || std::ranges::any_of(labels, isUsed));
}

std::set<std::string> NamesOf(const std::map<std::string, Place>& objects) {
  std::set<std::string> names;
  for (const auto& [name, place] : objects) names.insert(name);
  return names;
}

bool HasWordOf(const SourceFile& file, const std::set<std::string>& words) {
  return std::ranges::any_of(file.Lines(), [&](const auto& line) {
    return std::ranges::any_of(line.second, [&](const auto& word) { return words.contains(word); });
  });
}

bool IsThere(const std::string& path) {
  std::error_code ignored;
  return std::filesystem::is_regular_file(path, ignored);
}

}  // namespace

LivePolicy::LivePolicy(std::string root, bool isFresh, std::vector<std::string> unwantedCodes)
    : dir(std::move(root)),
      fresh(isFresh),
      unwanted(std::move(unwantedCodes)),
      objects(unwanted),
      names(unwanted),
      tardisks(unwanted),
      fileLabels(unwanted),
      uses(unwanted) {}

LivePolicy::~LivePolicy() = default;

void LivePolicy::Take(const std::string& path, const std::string& content) {
  const bool isNew = contents.insert_or_assign(path, content).second;
  if (isNew && !IsThere(path)) Forget();
  edited.insert(path);
}

void LivePolicy::Release(const std::string& path) {
  if (contents.erase(path) == 0) return;
  if (!IsThere(path)) Forget();
  edited.insert(path);
}

void LivePolicy::Check() {
  if (isComplete && !edited.empty()) CheckEdited();
  if (!isComplete) CheckAll();
  edited.clear();
}

std::set<std::string> LivePolicy::TakeChanged() { return std::exchange(changed, {}); }

// What there was may be gone.
void LivePolicy::Clear() {
  const auto clear = [this](DiagnosticList& list) {
    NoteChanges(list, DiagnosticList(unwanted));
    list = DiagnosticList(unwanted);
  };
  for (Findings* findings : {&objects, &names, &tardisks, &fileLabels}) {
    clear(findings->diagnostics);
    *findings = Findings(unwanted);
  }
  for (DomainFile& file : domainFiles) {
    clear(file.bytes.diagnostics);
    clear(file.lines.diagnostics);
  }
  clear(uses);
  domainFiles.clear();
  labelUses.clear();
  load.reset();
  run.reset();
}

void LivePolicy::CheckAll() {
  Clear();
  changed.insert(edited.begin(), edited.end());
  run = std::make_unique<CheckRun>(fresh, unwanted);
  load = std::make_unique<LinuxHost::PolicyTransaction>(LinuxHost::CurrentState());
  BeginLoadOf(*load, dir);
  for (const auto& [path, content] : contents) {
    std::istringstream input(content);
    TakeContent(*run, path, input);
  }
  Renew(objects, [this] { CheckObjects(*run, dir + "/" + SecPolicy::kObjectsDir); });
  CheckDomainsDirs();
  CheckTardiskFiles();
  CheckLabelFiles();
  CheckUses();
  isComplete = true;
}

template <class Body>
void LivePolicy::Collect(Findings& findings, Body body) {
  std::swap(static_cast<Findings&>(*run), findings);
  body();
  std::swap(static_cast<Findings&>(*run), findings);
}

template <class Body>
void LivePolicy::Renew(Findings& findings, Body body) {
  Findings renewed(unwanted);
  Collect(renewed, body);
  Replace(findings, std::move(renewed));
}

void LivePolicy::Replace(Findings& findings, Findings renewed) {
  NoteChanges(findings.diagnostics, renewed.diagnostics);
  for (const std::string& label : renewed.usedLabels) {
    if (++labelUses[label] == 1) run->usedLabels.insert(label);
  }
  for (const std::string& label : findings.usedLabels) {
    if (--labelUses[label] == 0) run->usedLabels.erase(label);
  }
  findings = std::move(renewed);
}

void LivePolicy::NoteChanges(const DiagnosticList& before, const DiagnosticList& after) {
  if (before.All() == after.All()) return;
  const ByFile old = Sorted(before);
  const ByFile now = Sorted(after);
  for (const auto& [file, problems] : now) {
    const auto earlier = old.find(file);
    if (earlier == old.end() || !IsSame(earlier->second, problems)) changed.emplace(file);
  }
  for (const auto& [file, problems] : old) {
    if (!now.contains(file)) changed.emplace(file);
  }
}

void LivePolicy::CheckDomainsDirs() {
  domainsDirs = DomainsDirsOf(dir);
  for (std::size_t number = 0; number < domainsDirs.size(); ++number) CheckDomainsDir(number);
  NoteChanges(DiagnosticList(unwanted), names.diagnostics);
}

// As CheckDomains, but each file for itself.
void LivePolicy::CheckDomainsDir(std::size_t number) {
  const DomainsDir& domains = domainsDirs[number];
  std::map<std::string, std::string> listed;
  Collect(names, [&] {
    listed = ListPolicyFiles(*run, domains.path);
    CheckEntries(*run, domains.path, domains.expected, Codes::kSkippedEntry);
  });
  const std::size_t first = domainFiles.size();
  std::vector<NamedFile> opened;
  for (const auto& [path, name] : listed) {
    DomainFile& file = domainFiles.emplace_back(path, name, number, unwanted);
    if (Open(file)) opened.push_back({file.domain.file, name});
  }
  std::vector<DomainSource> defined;
  Collect(names, [&] { defined = DefineDomains(*run, opened, domains.prefix); });
  auto next = defined.begin();
  for (std::size_t index = first; index < domainFiles.size(); ++index) {
    DomainFile& file = domainFiles[index];
    if (next == defined.end() || next->file != file.domain.file) continue;
    file.domain = *next++;
    CheckLines(file);
  }
}

void LivePolicy::CheckTardiskFiles() {
  const std::string path = dir + "/" + SecPolicy::kTardisksDir;
  Renew(tardisks, [&] {
    if (File_IsDirectory(path.c_str())) CheckTardisks(*run, path);
  });
}

void LivePolicy::CheckLabelFiles() {
  Renew(fileLabels, [this] { CheckFileLabels(*run, dir + "/" + SecPolicy::kFileLabelsDir); });
}

// The labels in use are counted as they come and go; transitions are few.
void LivePolicy::CheckUses() {
  run->transitions.clear();
  run->enteredDomains = tardisks.enteredDomains;
  for (const DomainFile& file : domainFiles) {
    for (const auto& [from, targets] : file.lines.transitions) {
      run->transitions[from].insert(targets.begin(), targets.end());
    }
    run->enteredDomains.insert(file.lines.enteredDomains.begin(), file.lines.enteredDomains.end());
  }
  CheckUse(*run, dir + "/" + SecPolicy::kDomainsDir);
  NoteChanges(uses, run->diagnostics);
  uses = std::exchange(run->diagnostics, DiagnosticList(unwanted));
}

bool LivePolicy::IsIn(const std::string& path, const char* name) const {
  return std::filesystem::path(path).parent_path() == std::filesystem::path(dir) / name;
}

// Makes the texts of edited files known, and finds what is to be checked of them. Nothing when that
// is more than the files that are known.
std::optional<LivePolicy::Stale> LivePolicy::TakeEdited() {
  Stale stale;
  for (const std::string& path : edited) {
    changed.insert(path);
    const auto content = contents.find(path);
    if (content == contents.end()) {
      run->contents.erase(path);
    } else {
      std::istringstream input(content->second);
      TakeContent(*run, path, input);
    }
    const auto parent = std::filesystem::path(path).parent_path().string();
    const auto file = std::ranges::find(domainFiles, path, &DomainFile::path);
    if (file != domainFiles.end() && file->domain.file != nullptr) {
      stale.domains.insert(&*file);
    } else if (std::ranges::find(domainsDirs, parent, &DomainsDir::path) != domainsDirs.end()) {
      return std::nullopt;
    }
    stale.objects = stale.objects || IsIn(path, SecPolicy::kObjectsDir);
    stale.tardisks = stale.tardisks || IsIn(path, SecPolicy::kTardisksDir);
    stale.fileLabels = stale.fileLabels || IsIn(path, SecPolicy::kFileLabelsDir);
  }
  return stale;
}

// What was not edited itself, but names what now is declared or no longer is.
void LivePolicy::AddDependent(const std::set<std::string>& labels, Stale& stale) {
  for (DomainFile& file : domainFiles) {
    if (DependsOn(file.lines, labels)) stale.domains.insert(&file);
  }
  stale.fileLabels = stale.fileLabels || DependsOn(fileLabels, labels);
  stale.tardisks = stale.tardisks || DependsOn(tardisks, labels);
}

// Leaves the tables incomplete where all files have to be read again.
void LivePolicy::CheckEdited() {
  isComplete = false;
  run->vocabularies.clear();
  auto stale = TakeEdited();
  if (!stale) return;
  if (stale->objects) AddDependent(CheckEditedObjects(), *stale);
  for (DomainFile* const file : stale->domains) {
    if (edited.contains(file->path) && !Open(*file)) return;
    CheckLines(*file);
    if (DependsOnLaterDomains(*file)) return;
  }
  if (stale->tardisks) CheckTardiskFiles();
  if (stale->fileLabels) CheckLabelFiles();
  CheckUses();
  isComplete = true;
}

// Returns the names that were declared before or are now, but not both.
std::set<std::string> LivePolicy::CheckEditedObjects() {
  const std::set<std::string> before = NamesOf(run->objects);
  run->objects.clear();
  Renew(objects, [this] { CheckObjects(*run, dir + "/" + SecPolicy::kObjectsDir); });
  const std::set<std::string> after = NamesOf(run->objects);
  std::set<std::string> others;
  std::ranges::set_symmetric_difference(before, after, std::inserter(others, others.end()));
  return others;
}

// False when it cannot be read.
bool LivePolicy::Open(DomainFile& file) {
  const SourceFile* const before = file.domain.file;
  Renew(file.bytes, [&] { file.domain.file = OpenPolicyFile(*run, file.path, file.name); });
  const auto defining = run->domains.find(file.domain.name);
  if (defining != run->domains.end() && defining->second == before) {
    defining->second = file.domain.file;
  }
  return file.domain.file != nullptr;
}

void LivePolicy::CheckLines(DomainFile& file) {
  if (file.domain.name.empty()) return;
  Renew(file.lines, [&] { CheckDomain(*run, file.domain, domainsDirs.at(file.dir).prefix); });
}

// A load reads the domains of early boot before it knows the others, and these before partners. Now
// all of them are known, which is too much for files that name later ones.
bool LivePolicy::DependsOnLaterDomains(const DomainFile& file) const {
  if (file.dir + 1 == domainsDirs.size()) return false;
  std::set<std::string> later;
  for (const DomainFile& other : domainFiles) {
    if (other.dir > file.dir) later.insert(other.domain.name);
  }
  for (const DomainFile& other : domainFiles) {
    if (other.dir <= file.dir) later.erase(other.domain.name);
  }
  if (later.empty()) return false;
  return HasUnknownWord(file.lines.diagnostics) || HasWordOf(*file.domain.file, later);
}

std::vector<Diagnostic> LivePolicy::ProblemsOf(const std::string& file) const {
  std::vector<Diagnostic> problems;
  const auto add = [&](const DiagnosticList& list) {
    std::ranges::copy_if(list.All(), std::back_inserter(problems),
                         [&](const Diagnostic& diagnostic) { return diagnostic.file == file; });
  };
  for (const Findings* findings : {&objects, &names, &tardisks, &fileLabels}) {
    add(findings->diagnostics);
  }
  for (const DomainFile& domainFile : domainFiles) {
    if (domainFile.path != file) continue;
    add(domainFile.bytes.diagnostics);
    add(domainFile.lines.diagnostics);
  }
  add(uses);
  std::ranges::stable_sort(problems, {}, [](const Diagnostic& diagnostic) {
    return std::tuple(diagnostic.line, diagnostic.column);
  });
  return problems;
}

std::vector<PolicyFile> LivePolicy::Files() const {
  std::vector<PolicyFile> files;
  const auto add = [&](FileRole role, const Findings& findings) {
    for (const SourceFile& file : findings.files) files.push_back({role, "", &file});
  };
  add(FileRole::kObjectFile, objects);
  for (const DomainFile& file : domainFiles) {
    if (file.domain.file == nullptr) continue;
    files.push_back(
        {FileRole::kDomainFile, domainsDirs.at(file.dir).prefix + file.name, file.domain.file});
  }
  add(FileRole::kTardiskFile, tardisks);
  add(FileRole::kLabelFile, fileLabels);
  return files;
}

}  // namespace SecPolicyCli
