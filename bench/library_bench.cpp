// The library's own work beside bare loops that do only what cannot be left out.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <array>
#include <climits>
#include <filesystem>
#include <fstream>
#include <string_view>
#include <unordered_set>

#include "secpolicy/secpolicy.h"

namespace {

namespace fs = std::filesystem;

using ParsedFile = std::map<unsigned int, std::queue<std::string>>;

constexpr int kFiles = 100;
constexpr int kLinesPerFile = 1000;

// A directory of policy files, removed at the end.
class PolicyFiles {
 public:
  PolicyFiles() : dir(fs::temp_directory_path() / "secpolicy-bench-XXXXXX") {
    std::string name = dir.string();
    if (mkdtemp(name.data()) == nullptr) std::abort();
    dir = name;
    for (int file = 0; file < kFiles; ++file) {
      paths.push_back((dir / std::to_string(file)).string());
      std::ofstream out(paths.back());
      for (int line = 0; line < kLinesPerFile; ++line) {
        out << "-a sensorLabel" << line << " read grant  # sensors\n";
      }
    }
  }
  PolicyFiles(const PolicyFiles&) = delete;
  PolicyFiles& operator=(const PolicyFiles&) = delete;
  ~PolicyFiles() { fs::remove_all(dir); }

  std::vector<std::string> paths;

 private:
  fs::path dir;
};

const PolicyFiles& Files() {
  static const PolicyFiles files;
  return files;
}

void ParseFiles(benchmark::State& state) {
  for (auto _ : state) {
    for (const std::string& path : Files().paths) {
      ParsedFile parsed;
      SecPolicy::ParseFile(path, parsed);
      benchmark::DoNotOptimize(parsed);
    }
  }
}
BENCHMARK(ParseFiles)->Unit(benchmark::kMillisecond);

void ParseFilesBare(benchmark::State& state) {
  for (auto _ : state) {
    for (const std::string& path : Files().paths) {
      ParsedFile parsed;
      std::ifstream file(path);
      std::array<char, 1024> buffer;
      for (unsigned int line = 1; file.getline(buffer.data(), buffer.size()); ++line) {
        std::string_view text(buffer.data());
        text = text.substr(0, text.find('#'));
        std::queue<std::string>& tokens = parsed[line];
        while (!text.empty()) {
          const std::size_t end = std::min(text.find(' '), text.size());
          if (end > 0) tokens.emplace(text.substr(0, end));
          text.remove_prefix(std::min(end + 1, text.size()));
        }
      }
      benchmark::DoNotOptimize(parsed);
    }
  }
}
BENCHMARK(ParseFilesBare)->Unit(benchmark::kMillisecond);

// As many labels of the policy as of the kernel, half of them the same.
struct Labels {
  explicit Labels(long count) {
    for (long i = 0; i < count; ++i) {
      policy.push_back("label" + std::to_string(i));
      kernel["label" + std::to_string(i + count / 2)] = i;
    }
  }
  std::vector<std::string> policy;
  std::map<std::string, long> kernel;
};

void SyncLabels(benchmark::State& state) {
  const Labels labels(state.range(0));
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  for (auto _ : state) {
    SecPolicy::SyncLabelsFromPolicy(labels.policy, labels.kernel,
                                    TeskCtl::Security::TESKACCESS_LABEL_OBJECT, access);
  }
}
BENCHMARK(SyncLabels)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMicrosecond);

// The arguments are copies here too: the interface hands each call its own.
void SyncLabelsBare(benchmark::State& state) {
  const Labels labels(state.range(0));
  for (auto _ : state) {
    const std::vector<std::string> policy = labels.policy;
    const std::map<std::string, long> kernel = labels.kernel;
    const std::unordered_set<std::string> named(policy.begin(), policy.end());
    std::vector<std::string> obsolete;
    for (const auto& [name, value] : kernel) {
      if (!named.contains(name)) obsolete.push_back(name);
    }
    benchmark::DoNotOptimize(obsolete);
  }
}
BENCHMARK(SyncLabelsBare)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMicrosecond);

}  // namespace

int main(int argc, char** argv) {
  // Otherwise the large cases alone would give their memory back after each round, and every round
  // of theirs would be the kernel's work of handing it out again.
  mallopt(M_TRIM_THRESHOLD, INT_MAX);
  mallopt(M_MMAP_MAX, 0);
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
