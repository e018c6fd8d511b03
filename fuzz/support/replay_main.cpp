// Runs a fuzz target on inputs that are kept: the files named, and those in the directories named.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);
extern "C" __attribute__((weak)) int LLVMFuzzerInitialize(int* argc, char*** argv);

namespace {

using std::filesystem::path;

std::vector<path> ListInputs(int argc, char** argv) {
  std::vector<path> inputs;
  for (int index = 1; index < argc; ++index) {
    if (!std::filesystem::is_directory(argv[index])) {
      inputs.emplace_back(argv[index]);
      continue;
    }
    for (const auto& entry : std::filesystem::directory_iterator(argv[index])) {
      inputs.push_back(entry.path());
    }
  }
  std::sort(inputs.begin(), inputs.end());
  return inputs;
}

void Replay(const path& input) {
  // Named first: a violated expectation ends the process.
  std::fprintf(stderr, "%s\n", input.c_str());
  std::ifstream file(input, std::ios::binary);
  const std::vector<char> bytes{std::istreambuf_iterator<char>(file), {}};
  LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
}

}  // namespace

int main(int argc, char** argv) {
  if (LLVMFuzzerInitialize != nullptr) LLVMFuzzerInitialize(&argc, &argv);
  const std::vector<path> inputs = ListInputs(argc, argv);
  if (inputs.empty()) {
    std::fprintf(stderr, "usage: %s FILE-OR-DIRECTORY...; there is no input\n", argv[0]);
    return 2;
  }
  for (const path& input : inputs) Replay(input);
  std::fprintf(stderr, "%zu inputs replayed\n", inputs.size());
  return 0;
}
