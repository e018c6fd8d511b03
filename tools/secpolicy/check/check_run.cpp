#include "check_run.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <fstream>

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

void CheckEntries(CheckRun& run, const std::string& dir, const std::string& expected) {
  SecPolicy::Directory directory(dir);
  if (!directory.IsOpen()) return;
  std::map<std::string, const char*> skipped;
  while (const dirent* entry = directory.Next()) {
    if (entry->d_type != DT_REG && entry->d_name != expected) {
      skipped.emplace(entry->d_name, KindOf(entry->d_type));
    }
  }
  for (const auto& [name, kind] : skipped) {
    AddFileProblem(run, Codes::kSkippedEntry, dir + "/" + name,
                   std::string("this is ") + kind + ": a load skips it");
  }
}

void WriteLines(const std::string& path, const SourceFile& file,
                const std::vector<unsigned int>& numbers, std::size_t begin, std::size_t size) {
  std::ofstream output(path, std::ios::binary | std::ios::trunc);
  for (std::size_t i = begin; i < begin + size; ++i) output << file.Text(numbers[i]) << '\n';
}

// Drops "PATH:LINE : " from the beginning of a message.
std::string WithoutPlace(const std::string& message, const std::string& path) {
  constexpr std::string_view kEnd = " : ";
  if (!message.starts_with(path + ":")) return message;
  const std::size_t end = message.find(kEnd, path.size());
  return end == std::string::npos ? message : message.substr(end + kEnd.size());
}

}  // namespace

std::vector<NamedFile> OpenPolicyFiles(CheckRun& run, const std::string& dir,
                                       const std::string& expected) {
  std::map<std::string, std::string> names;
  try {
    SecPolicy::GetFileList(dir, names);
  } catch (const BraxoException& failure) {
    AddFileProblem(run, Codes::kUnreadable, dir, failure.what());
    return {};
  }
  std::vector<NamedFile> opened;
  for (const auto& [path, name] : names) {
    run.diagnostics.BeginFile(path);
    try {
      const SourceFile& file = run.files.emplace_back(path);
      file.CheckBytes(run.diagnostics);
      opened.push_back({&file, name});
    } catch (const BraxoException& failure) {
      AddFileProblem(run, Codes::kUnreadable, path, failure.what());
    }
  }
  CheckEntries(run, dir, expected);
  return opened;
}

bool IsMissing(const std::string& path) {
  struct stat attributes {};
  return stat(path.c_str(), &attributes) != 0 && (errno == ENOENT || errno == ENOTDIR);
}

std::vector<unsigned int> ParseEveryLine(
    const SourceFile& file, const std::string& scratchFile,
    const std::function<void(const std::string& path)>& parse,
    const std::function<std::size_t()>& count,
    const std::function<void(unsigned int line, const std::string& message)>& refused) {
  std::vector<unsigned int> numbers;
  for (const auto& [number, words] : file.Lines()) numbers.push_back(number);

  std::vector<unsigned int> accepted;
  std::string path = file.Path();
  std::size_t begin = 0;
  std::size_t size = numbers.size();
  while (begin < numbers.size()) {
    const std::size_t before = count();
    std::string refusal;
    try {
      parse(path);
    } catch (const BraxoException& failure) {
      refusal = WithoutPlace(failure.what(), path);
    }
    const std::size_t end = std::min(begin + count() - before, numbers.size());
    for (; begin < end; ++begin) accepted.push_back(numbers[begin]);
    if (begin == numbers.size()) break;
    // After a refusal the next piece is one line, and then twice as much each time, so that a file
    // of nothing but bad lines is not read over and over.
    size = refusal.empty() ? size * 2 : 1;
    if (!refusal.empty()) refused(numbers[begin++], refusal);
    size = std::min(size, numbers.size() - begin);
    WriteLines(scratchFile, file, numbers, begin, size);
    path = scratchFile;
  }
  return accepted;
}

}  // namespace SecPolicyCli
