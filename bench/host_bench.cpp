// The library on the Linux host beside bare loops that do only what cannot be left out: the system
// calls of labelling, one prepared insert for each rule in one transaction, one write for each
// line.
//
// SECPOLICY_BENCH_DIRS names the directories, separated by colons, in which trees are labelled; the
// host state lies in the first.
#include <benchmark/benchmark.h>
#include <dirent.h>
#include <fcntl.h>
#include <sqlite3.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <string>
#include <vector>

#include "host/enforce/label_index.h"
#include "host/linux/files/labelled_places.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/secpolicy.h"

namespace {

namespace fs = std::filesystem;
using TeskCtl::Security::TeskAccessInterfaceImpl;

constexpr int kLabels = 1000;

std::string Label(long number) { return "label" + std::to_string(number % kLabels); }

std::vector<fs::path> BenchDirs() {
  const char* given = std::getenv("SECPOLICY_BENCH_DIRS");
  std::string rest = given != nullptr ? given : "/dev/shm";
  std::vector<fs::path> dirs;
  while (!rest.empty()) {
    const std::size_t colon = std::min(rest.find(':'), rest.size());
    dirs.emplace_back(rest.substr(0, colon));
    rest.erase(0, colon + 1);
  }
  return dirs;
}

// A directory of its own, removed at the end.
class ScratchDir {
 public:
  explicit ScratchDir(const fs::path& parent) {
    std::string name = (parent / "secpolicy-bench-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) throw std::runtime_error("cannot make " + name);
    path = name;
  }
  ScratchDir(const ScratchDir&) = delete;
  ScratchDir& operator=(const ScratchDir&) = delete;
  ~ScratchDir() { fs::remove_all(path); }

  fs::path path;
};

// A new host state, with the labels that the rules use, in memory as /run is.
class FreshState {
 public:
  FreshState() : dir(BenchDirs().front()), used(Path()) {
    std::vector<std::string> labels;
    for (int i = 0; i < kLabels; ++i) labels.push_back(Label(i));
    TeskAccessInterfaceImpl access;
    access.AddLabels(labels, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  }

  fs::path Path() const { return dir.path / "host.db"; }

 private:
  ScratchDir dir;
  LinuxHost::UsedState used;
};

// ---- Labelling a tree -------------------------------------------------------------------------

constexpr int kDirectories = 1000;
constexpr int kFilesPerDirectory = 100;

class LabelledTree {
 public:
  explicit LabelledTree(const fs::path& parent) : scratch(parent) {
    const std::uint32_t first = 2;
    Label(scratch.path, first);
    for (int i = 0; i < kDirectories; ++i) {
      const fs::path dir = scratch.path / ("d" + std::to_string(i));
      fs::create_directory(dir);
      Label(dir, first);
      for (int j = 0; j < kFilesPerDirectory; ++j) {
        const fs::path file = dir / ("file" + std::to_string(j));
        std::ofstream(file).put('x');
        Label(file, first);
      }
    }
  }
  const fs::path& Path() const { return scratch.path; }

  static constexpr char kAttribute[] = "security.bpf.zorvan";

 private:
  static void Label(const fs::path& path, std::uint32_t id) {
    if (setxattr(path.c_str(), kAttribute, &id, sizeof id, 0) != 0) std::abort();
  }

  ScratchDir scratch;
};

// One tree for ours and the bare loop, with the number of times it was labelled: another label each
// time, since a file system may skip a value that is there already.
struct SharedTree {
  explicit SharedTree(const fs::path& parent) : tree(parent) {}

  LabelledTree tree;
  long round = 0;
};

SharedTree& TreeIn(const fs::path& parent) {
  static std::map<fs::path, SharedTree> trees;
  return trees.try_emplace(parent, parent).first->second;
}

void LabelTree(benchmark::State& state, const fs::path& parent) {
  const FreshState host;
  SharedTree& shared = TreeIn(parent);
  TeskAccessInterfaceImpl access;
  for (auto _ : state) {
    SecPolicy::SetDirLabelRecursive(shared.tree.Path(), Label(++shared.round % 2), access);
  }
}

void LabelBare(char* path, std::size_t length, std::uint32_t id) {
  DIR* const directory = opendir(path);
  while (const dirent* entry = readdir(directory)) {
    if (std::strcmp(entry->d_name, ".") == 0 || std::strcmp(entry->d_name, "..") == 0) continue;
    const std::size_t nameLength = std::strlen(entry->d_name);
    path[length] = '/';
    std::memcpy(path + length + 1, entry->d_name, nameLength + 1);
    setxattr(path, LabelledTree::kAttribute, &id, sizeof id, XATTR_REPLACE);
    if (entry->d_type == DT_DIR) LabelBare(path, length + 1 + nameLength, id);
    path[length] = '\0';
  }
  closedir(directory);
}

void LabelTreeBare(benchmark::State& state, const fs::path& parent) {
  SharedTree& shared = TreeIn(parent);
  const std::string tree = shared.tree.Path().string();
  std::array<char, 4096> path{};
  tree.copy(path.data(), path.size() - 1);
  for (auto _ : state) {
    // The identifiers of the two labels: the first ones behind those that are built in.
    LabelBare(path.data(), tree.size(), 4 + static_cast<std::uint32_t>(++shared.round % 2));
  }
}

// ---- Indexing the labels of a tree ------------------------------------------------------------

// A tree in which every tenth file has a label of its own, and the last index of it.
class IndexedTree {
 public:
  explicit IndexedTree(const fs::path& parent) : tree(parent), output(parent) {
    constexpr std::uint32_t kOther = 3;
    for (int i = 0; i < kDirectories; ++i) {
      for (int j = 0; j < kFilesPerDirectory; j += 10) {
        const fs::path file =
            tree.Path() / ("d" + std::to_string(i)) / ("file" + std::to_string(j));
        if (setxattr(file.c_str(), LabelledTree::kAttribute, &kOther, sizeof kOther, 0) != 0) {
          std::abort();
        }
      }
    }
  }

  std::string Path() const { return tree.Path().string(); }
  std::string IndexFile() const { return (output.path / "labels.index").string(); }

 private:
  const LabelledTree tree;
  const ScratchDir output;
};

void IndexTree(benchmark::State& state, const fs::path& parent) {
  const IndexedTree tree(parent);
  for (auto _ : state) {
    const Enforce::LabelIndex index(
        {.device = 1, .serial = 1},
        LinuxHost::FindLabelledPlaces(tree.Path(), LabelledTree::kAttribute));
    index.Write(tree.IndexFile());
    state.counters["places"] = static_cast<double>(index.Size());
    state.counters["bytes"] = static_cast<double>(fs::file_size(tree.IndexFile()));
  }
}

std::uint64_t ReadBare(char* path, std::size_t length) {
  std::uint64_t sum = 0;
  DIR* const directory = opendir(path);
  while (const dirent* entry = readdir(directory)) {
    if (std::strcmp(entry->d_name, ".") == 0 || std::strcmp(entry->d_name, "..") == 0) continue;
    const std::size_t nameLength = std::strlen(entry->d_name);
    path[length] = '/';
    std::memcpy(path + length + 1, entry->d_name, nameLength + 1);
    std::uint32_t id = 0;
    lgetxattr(path, LabelledTree::kAttribute, &id, sizeof id);
    sum += id;
    if (entry->d_type == DT_DIR) sum += ReadBare(path, length + 1 + nameLength);
    path[length] = '\0';
  }
  closedir(directory);
  return sum;
}

void IndexTreeBare(benchmark::State& state, const fs::path& parent) {
  const IndexedTree tree(parent);
  std::array<char, 4096> path{};
  tree.Path().copy(path.data(), path.size() - 1);
  for (auto _ : state) benchmark::DoNotOptimize(ReadBare(path.data(), tree.Path().size()));
}

void ReadIndex(benchmark::State& state, const fs::path& parent) {
  const IndexedTree tree(parent);
  Enforce::LabelIndex({.device = 1, .serial = 1},
                      LinuxHost::FindLabelledPlaces(tree.Path(), LabelledTree::kAttribute))
      .Write(tree.IndexFile());
  for (auto _ : state) benchmark::DoNotOptimize(Enforce::LabelIndex::Read(tree.IndexFile()).Size());
}

// ---- Installing rules -------------------------------------------------------------------------

constexpr long kDomains = 100;
constexpr long kRules = 100'000;

std::vector<std::string> Words(TeskCtl::Security::TeskAccess_KeywordType type) {
  std::vector<std::string> words;
  for (const auto& [word, id] : TeskAccessInterfaceImpl().GetKeywordsMap(type)) {
    words.push_back(word);
  }
  return words;
}

std::string DomainName(long number) { return "domain" + std::to_string(number); }

// Policy files of `domains` domains that hold `rules` rules of all kinds between them.
class DomainFiles {
 public:
  DomainFiles(long domains, long rules) : dir(BenchDirs().front()), data(BenchDirs().front()) {
    const FreshState host;
    for (long i = 0; i < rules / domains / 8 + 1; ++i) std::ofstream(DataFile(i));
    syscalls = Words(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL);
    capabilities = Words(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY);
    for (long i = 0; i < domains; ++i) {
      std::ofstream file(dir.path / DomainName(i));
      for (long j = 0; j < rules / domains; ++j) file << Line(j, domains) << '\n';
    }
  }
  const fs::path& Path() const { return dir.path; }

 private:
  std::string DataFile(long number) const {
    return (data.path / ("file" + std::to_string(number))).string();
  }

  std::string Line(long line, long domains) const {
    const long number = line / 8;
    const auto nth = static_cast<std::size_t>(number);
    switch (line % 8) {
      case 0:
        return "-a " + Label(number) + " read grant";
      case 1:
        // There are only so many: a rule that names the same thing again would be no further row.
        if (nth >= capabilities.size()) return "-a " + Label(number) + " write grant";
        return "-c " + capabilities[nth] + " grant";
      case 2:
        return "-d " + Label(number) + " " + DomainName(number % domains) + " exec grant";
      case 3:
        return "-f " + Label(number) + " " + Label(number + 1) + " regular grant";
      case 4:
        return "-p bind_port " + std::to_string(number) + " grant";
      case 5:
        return "-r " + DataFile(number) + " rw";
      case 6:
        if (nth >= syscalls.size()) return "-a " + Label(number) + " list grant";
        return "-s " + syscalls[nth] + " grant";
      default:
        return "-u " + Label(number) + " stream grant";
    }
  }

  ScratchDir dir;
  ScratchDir data;
  std::vector<std::string> syscalls;
  std::vector<std::string> capabilities;
};

// As the command does it: as one step.
void LoadAsAWhole(const DomainFiles& files, TeskAccessInterfaceImpl& access) {
  LinuxHost::PolicyTransaction transaction(LinuxHost::CurrentState());
  transaction.BeginLoad({.directory = files.Path(), .domains = {}});
  SecPolicy::LoadPolicyDomains(files.Path(), access);
  transaction.EndLoad(false);
  transaction.Commit();
}

void LoadDomains(benchmark::State& state) {
  const DomainFiles files(state.range(0), state.range(1));
  for (auto _ : state) {
    state.PauseTiming();
    const FreshState host;
    TeskAccessInterfaceImpl access;
    state.ResumeTiming();
    LoadAsAWhole(files, access);
  }
}
BENCHMARK(LoadDomains)
    ->Args({kDomains, kRules})
    ->Args({kDomains, kRules / 100})
    ->Args({1, kRules / 100})
    ->Args({400, 400 * (kRules / 100)})
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

class Database {
 public:
  explicit Database(const fs::path& path) {
    if (sqlite3_open(path.c_str(), &database) != SQLITE_OK) std::abort();
    sqlite3_exec(database, "PRAGMA synchronous = OFF", nullptr, nullptr, nullptr);
  }
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;
  ~Database() { sqlite3_close(database); }

  void Run(const char* statement) const {
    if (sqlite3_exec(database, statement, nullptr, nullptr, nullptr) != SQLITE_OK) std::abort();
  }

  // Each as a line of its own, which is flushed.
  void WriteRows(const char* select) const {
    sqlite3_stmt* query = nullptr;
    if (sqlite3_prepare_v2(database, select, -1, &query, nullptr) != SQLITE_OK) std::abort();
    const int columns = sqlite3_column_count(query);
    while (sqlite3_step(query) == SQLITE_ROW) {
      std::string line;
      for (int column = 0; column < columns; ++column) {
        line += reinterpret_cast<const char*>(sqlite3_column_text(query, column));
        line += ' ';
      }
      line += '\n';
      std::cout << line << std::flush;
    }
    sqlite3_finalize(query);
  }

  sqlite3* database = nullptr;
};

// The rows that a load leaves behind, and the insertion of one of them.
class InstalledRows {
 public:
  InstalledRows(const Database& source, const char* select, const char* insertion)
      : statement(insertion) {
    sqlite3_stmt* query = nullptr;
    if (sqlite3_prepare_v2(source.database, select, -1, &query, nullptr) != SQLITE_OK) std::abort();
    while (sqlite3_step(query) == SQLITE_ROW) {
      for (int column = 0; column < sqlite3_column_count(query); ++column) {
        values.push_back(sqlite3_value_dup(sqlite3_column_value(query, column)));
      }
      columns = sqlite3_column_count(query);
    }
    sqlite3_finalize(query);
  }
  InstalledRows(const InstalledRows&) = delete;
  InstalledRows& operator=(const InstalledRows&) = delete;
  ~InstalledRows() {
    for (sqlite3_value* value : values) sqlite3_value_free(value);
  }

  void InsertInto(const Database& target) const {
    sqlite3_stmt* insert = nullptr;
    if (sqlite3_prepare_v2(target.database, statement, -1, &insert, nullptr) != SQLITE_OK) {
      std::abort();
    }
    int column = 0;
    for (const sqlite3_value* value : values) {
      sqlite3_bind_value(insert, ++column, value);
      if (column < columns) continue;
      if (sqlite3_step(insert) != SQLITE_DONE) std::abort();
      sqlite3_reset(insert);
      column = 0;
    }
    sqlite3_finalize(insert);
  }

 private:
  const char* statement;
  std::vector<sqlite3_value*> values;
  int columns = 0;
};

// The rows of the same rules, in the same order, by bare prepared inserts into the host's own
// schema, in one transaction.
void InsertRulesBare(benchmark::State& state) {
  const DomainFiles files(state.range(0), state.range(1));
  const FreshState loaded;
  TeskAccessInterfaceImpl access;
  LoadAsAWhole(files, access);
  const Database source(loaded.Path());
  const InstalledRows words(
      source,
      "SELECT domain_id, kind, word1, word2, word3, granted, line, load FROM rule ORDER BY id",
      "INSERT INTO rule (domain_id, kind, word1, word2, word3, granted, line, load) "
      "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)");
  const InstalledRows parameters(
      source,
      "SELECT domain_id, parameter_check, first_value, last_value, first_word, last_word, granted, "
      "line, load FROM parameter_rule ORDER BY id",
      "INSERT INTO parameter_rule (domain_id, parameter_check, first_value, last_value, "
      "first_word, last_word, granted, line, load) VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9)");
  const InstalledRows paths(
      source, "SELECT domain_id, world, path, permission, line, load FROM file_policy ORDER BY id",
      "INSERT INTO file_policy (domain_id, world, path, permission, line, load) "
      "VALUES (?1, ?2, ?3, ?4, ?5, ?6)");
  for (auto _ : state) {
    state.PauseTiming();
    const FreshState host;
    const Database target(host.Path());
    state.ResumeTiming();
    target.Run("BEGIN");
    words.InsertInto(target);
    parameters.InsertInto(target);
    paths.InsertInto(target);
    target.Run("COMMIT");
  }
}
BENCHMARK(InsertRulesBare)->Args({kDomains, kRules})->UseRealTime()->Unit(benchmark::kMillisecond);

// The checks that a load of as many rules makes: one or two words each.
void CheckWords(benchmark::State& state) {
  const FreshState host;
  TeskAccessInterfaceImpl access;
  const std::string kind = "read";
  for (auto _ : state) {
    for (long rule = 0; rule < kRules; ++rule) {
      const std::string label = Label(rule);
      benchmark::DoNotOptimize(
          access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, label));
      benchmark::DoNotOptimize(
          access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS, kind));
    }
  }
}
BENCHMARK(CheckWords)->UseRealTime()->Unit(benchmark::kMillisecond);

// ---- Showing what is installed ----------------------------------------------------------------

// Sends standard output to a file of its own.
class OutputToFile {
 public:
  explicit OutputToFile(const fs::path& path)
      : saved(dup(STDOUT_FILENO)), file(open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600)) {
    dup2(file, STDOUT_FILENO);
  }
  OutputToFile(const OutputToFile&) = delete;
  OutputToFile& operator=(const OutputToFile&) = delete;
  ~OutputToFile() {
    dup2(saved, STDOUT_FILENO);
    close(saved);
    close(file);
  }

  void StartOver() const {
    if (ftruncate(file, 0) != 0) std::abort();
    lseek(file, 0, SEEK_SET);
  }

 private:
  int saved;
  int file;
};

void DisplayDomains(benchmark::State& state) {
  const ScratchDir scratch(BenchDirs().back());
  const DomainFiles files(state.range(0), state.range(1));
  const FreshState host;
  TeskAccessInterfaceImpl access;
  LoadAsAWhole(files, access);
  const OutputToFile output(scratch.path / "display");
  for (auto _ : state) {
    output.StartOver();
    SecPolicy::DisplayPolicyDomains(access, "");
  }
}
BENCHMARK(DisplayDomains)
    ->Args({kDomains, kRules})
    ->Args({kDomains, kRules / 100})
    ->Args({1, kRules / 100})
    ->Args({400, 400 * (kRules / 100)})
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

void WriteLinesBare(benchmark::State& state) {
  const ScratchDir scratch(BenchDirs().back());
  const DomainFiles files(kDomains, kRules);
  const FreshState host;
  TeskAccessInterfaceImpl access;
  LoadAsAWhole(files, access);
  const fs::path shown = scratch.path / "display";
  {
    const OutputToFile output(shown);
    SecPolicy::DisplayPolicyDomains(access, "");
  }
  std::vector<std::string> lines;
  std::ifstream in(shown);
  for (std::string line; std::getline(in, line);) lines.push_back(line + "\n");

  const OutputToFile output(shown);
  for (auto _ : state) {
    output.StartOver();
    for (const std::string& line : lines) std::cout << line << std::flush;
  }
}
BENCHMARK(WriteLinesBare)->UseRealTime()->Unit(benchmark::kMillisecond);

// The same rules read and written with nothing between: the words of a row are a line, and the rows
// come in the order in which they lie, domain or not.
void WriteRowsBare(benchmark::State& state) {
  const ScratchDir scratch(BenchDirs().back());
  const DomainFiles files(kDomains, kRules);
  const FreshState host;
  TeskAccessInterfaceImpl access;
  LoadAsAWhole(files, access);
  const Database source(host.Path());
  const OutputToFile output(scratch.path / "display");
  for (auto _ : state) {
    output.StartOver();
    source.WriteRows("SELECT granted, word1, word2, word3 FROM rule ORDER BY id");
    source.WriteRows("SELECT granted, parameter_check, first_word FROM parameter_rule ORDER BY id");
    source.WriteRows("SELECT permission, path FROM file_policy ORDER BY id");
  }
}
BENCHMARK(WriteRowsBare)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
  using Work = void (*)(benchmark::State&, const fs::path&);
  const std::pair<const char*, Work> works[] = {{"LabelTree", LabelTree},
                                                {"LabelTreeBare", LabelTreeBare},
                                                {"IndexTree", IndexTree},
                                                {"IndexTreeBare", IndexTreeBare},
                                                {"ReadIndex", ReadIndex}};
  for (const fs::path& dir : BenchDirs()) {
    for (const auto& [name, work] : works) {
      benchmark::RegisterBenchmark((name + dir.string()).c_str(), work, dir)
          ->UseRealTime()
          ->Unit(benchmark::kMillisecond);
    }
  }
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
