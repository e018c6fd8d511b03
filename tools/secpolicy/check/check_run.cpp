#include "check_run.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <string_view>

#include "host/linux/common/host_error.h"
#include "secpolicy/parse/directory.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;

const char* KindOf(unsigned char entryType) {
  switch (entryType) {
    case DT_LNK:
      return "a symbolic link";
    case DT_DIR:
      return "a directory";
    default:
      return "no regular file";
  }
}

void AddFileProblem(CheckRun& run, const Code& code, const std::string& file,
                    const std::string& message) {
  Diagnostic diagnostic;
  diagnostic.code = &code;
  diagnostic.file = file;
  diagnostic.message = message;
  run.diagnostics.Add(std::move(diagnostic));
}

// A load reads every regular file, so also what an editor or a package left behind.
void CheckName(CheckRun& run, const SourceFile& file, const std::string& name) {
  constexpr std::string_view kEnds[] = {"~",    ".swp", ".swo",     ".bak",    ".orig",
                                        ".rej", ".tmp", ".rpmsave", ".rpmnew", ".rpmorig"};
  const bool isCopy = std::any_of(std::begin(kEnds), std::end(kEnds),
                                  [&](std::string_view end) { return name.ends_with(end); }) ||
                      (name.size() > 1 && name.starts_with('#') && name.ends_with('#')) ||
                      name.find(".dpkg-") != std::string::npos ||
                      name.find(".ucf-") != std::string::npos;
  if (!isCopy) return;
  run.diagnostics.Add(file.About(
      Codes::kEditorCopy, "this looks like a copy that was left behind: a load reads it as policy",
      "move it out of the directory"));
}

}  // namespace

void CheckEntries(CheckRun& run, const std::string& dir, const std::string& expected,
                  const Code& skipped) {
  SecPolicy::Directory directory(dir);
  if (!directory.IsOpen()) return;
  std::map<std::string, const char*> kinds;
  bool isTyped = true;
  while (const dirent* entry = directory.Next()) {
    if (entry->d_type == DT_UNKNOWN) isTyped = false;
    if (entry->d_type == DT_REG || entry->d_type == DT_UNKNOWN || entry->d_name == expected) {
      continue;
    }
    kinds.emplace(entry->d_name, KindOf(entry->d_type));
  }
  if (!isTyped) {
    AddFileProblem(run, Codes::kUntypedEntries, dir,
                   "this file system does not tell which of its entries are files: to a load the "
                   "directory looks empty");
  }
  for (const auto& [name, kind] : kinds) {
    AddFileProblem(run, skipped, dir + "/" + name,
                   std::string("this is ") + kind + ": a load skips it");
  }
}

void TakeContent(CheckRun& run, const std::string& file, std::istream& input) {
  const auto [place, isNew] = run.contents.try_emplace(file);
  std::string& content = place->second;
  if (isNew) {
    content = run.scratch.DirectoryPath() + "/content-" + std::to_string(run.contentsTaken++);
  }
  std::ofstream output(content, std::ios::binary);
  std::copy(std::istreambuf_iterator<char>(input), {}, std::ostreambuf_iterator<char>(output));
  output.flush();
  if (!output) LinuxHost::ThrowErrno("cannot write ", content);
}

std::map<std::string, std::string> ListPolicyFiles(CheckRun& run, const std::string& dir) {
  std::map<std::string, std::string> names;
  try {
    SecPolicy::GetFileList(dir, names);
  } catch (const BraxoException& failure) {
    AddFileProblem(run, Codes::kUnreadable, dir, failure.what());
    return {};
  }
  for (const auto& [path, content] : run.contents) {
    const std::size_t slash = path.rfind('/');
    if (path.substr(0, slash) == dir) names.emplace(path, path.substr(slash + 1));
  }
  return names;
}

const SourceFile* OpenPolicyFile(CheckRun& run, const std::string& path, const std::string& name) {
  run.diagnostics.BeginFile(path);
  try {
    const auto content = run.contents.find(path);
    const SourceFile& file =
        run.files.emplace_back(path, content == run.contents.end() ? path : content->second);
    CheckName(run, file, name);
    file.CheckBytes(run.diagnostics);
    return &file;
  } catch (const BraxoException& failure) {
    AddFileProblem(run, Codes::kUnreadable, path, failure.what());
    return nullptr;
  }
}

std::vector<NamedFile> OpenPolicyFiles(CheckRun& run, const std::string& dir,
                                       const std::string& expected, const Code& skipped) {
  std::vector<NamedFile> opened;
  for (const auto& [path, name] : ListPolicyFiles(run, dir)) {
    if (const SourceFile* const file = OpenPolicyFile(run, path, name)) {
      opened.push_back({file, name});
    }
  }
  CheckEntries(run, dir, expected, skipped);
  return opened;
}

bool IsObjectLabel(CheckRun& run, const std::string& name) {
  constexpr std::uint32_t kNoSuchLabel = 1;
  return run.access.LookupLabel(name, TeskCtl::Security::TESKACCESS_LABEL_OBJECT) != kNoSuchLabel;
}

bool IsMissing(const std::string& path) {
  struct stat attributes {};
  return stat(path.c_str(), &attributes) != 0 &&
         (errno == ENOENT || errno == ENOTDIR || errno == ENAMETOOLONG || errno == ELOOP);
}

void CheckIsAbsolute(CheckRun& run, const SourceFile& file, unsigned int line, std::size_t word) {
  const std::string& path = file.Lines().at(line).at(word);
  if (path.starts_with('/')) return;
  run.diagnostics.Add(file.AtWord(Codes::kRelativePath, line, word,
                                  "this path is looked up from where a load is started",
                                  "a path begins with a slash"));
}

void AddRefusal(CheckRun& run, const SourceFile& file, const SecPolicy::Problem& problem,
                const Hint& hint) {
  const std::size_t size = file.Lines().at(problem.line).size();
  const bool isWhole = problem.word >= size;
  run.diagnostics.Add(file.AtWords(CodeOf(*problem.fault), problem.line, isWhole ? 0 : problem.word,
                                   isWhole ? size - 1 : problem.word, problem.reason, hint));
}

}  // namespace SecPolicyCli
