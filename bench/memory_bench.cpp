// How much memory a load takes, counted where it is asked for: exact, and the same on every run.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <new>
#include <string>

#include "secpolicy/secpolicy.h"

namespace {

std::size_t live = 0;
std::size_t peak = 0;

}  // namespace

// What was asked for stands before each block. What malloc gives instead depends on which of its
// blocks are free, and so on all that was done before.
void* operator new(std::size_t size) {
  auto* const block = static_cast<std::max_align_t*>(std::malloc(sizeof(std::max_align_t) + size));
  if (block == nullptr) throw std::bad_alloc();
  std::memcpy(block, &size, sizeof size);
  live += size;
  peak = std::max(peak, live);
  return block + 1;
}

void operator delete(void* block) noexcept {
  if (block == nullptr) return;
  auto* const start = static_cast<std::max_align_t*>(block) - 1;
  std::size_t size = 0;
  std::memcpy(&size, start, sizeof size);
  live -= size;
  std::free(start);
}

void operator delete(void* block, std::size_t /*size*/) noexcept { operator delete(block); }

namespace {

namespace fs = std::filesystem;

constexpr int kRulesPerFile = 1000;

// What `step` needs at its most above what was there before.
template <class Step>
double PeakOf(Step step) {
  const std::size_t before = live;
  peak = live;
  step();
  return static_cast<double>(peak - before);
}

// A directory of domain policy files, removed at the end.
class DomainFiles {
 public:
  explicit DomainFiles(int count) {
    std::string name = fs::temp_directory_path() / "secpolicy-bench-XXXXXX";
    if (mkdtemp(name.data()) == nullptr) std::abort();
    dir = name;
    for (int file = 0; file < count; ++file) {
      std::ofstream out(dir / std::to_string(file));
      for (int line = 0; line < kRulesPerFile; ++line) {
        out << "-a sensorObjectLabel" << line << " read grant\n";
      }
    }
  }
  DomainFiles(const DomainFiles&) = delete;
  DomainFiles& operator=(const DomainFiles&) = delete;
  ~DomainFiles() { fs::remove_all(dir); }

  fs::path dir;
};

double ParsedFileBytes(const DomainFiles& files) {
  return PeakOf([&] {
    std::map<unsigned int, std::queue<std::string>> parsed;
    SecPolicy::ParseFile(files.dir / "0", parsed);
  });
}

double LoadBytes(const DomainFiles& files) {
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  return PeakOf([&] { SecPolicy::LoadPolicyDomains(files.dir, access); });
}

// A directory with so many files, labelled; the null host lets every label stand.
double LabelTreeBytes(const DomainFiles& files) {
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  return PeakOf([&] { SecPolicy::SetDirLabelRecursive(files.dir, "label", access); });
}

}  // namespace

int main() {
  const DomainFiles few(10);
  const DomainFiles many(100);
  // One parsed file is held at a time, whatever their number; the rules are held until they are
  // set.
  const double parsed = ParsedFileBytes(few);
  const double fewRules = LoadBytes(few) - parsed;
  const double manyRules = LoadBytes(many) - parsed;
  std::printf("{\"bytes_per_rule_10_files\": %.1f, \"bytes_per_rule_100_files\": %.1f, ",
              fewRules / (10 * kRulesPerFile), manyRules / (100 * kRulesPerFile));
  std::printf("\"bytes_per_parsed_line\": %.1f, ", parsed / kRulesPerFile);
  std::printf("\"label_10_files\": %.0f, \"label_100_files\": %.0f}\n", LabelTreeBytes(few),
              LabelTreeBytes(many));
}
