#include "process_paths.h"

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <optional>
#include <sstream>
#include <string>

namespace SecPolicyLog {
namespace {

constexpr std::uint64_t kSecond = 1'000'000'000;

// What tells a process from a later one with its number.
struct ProcessFacts {
  unsigned int parent = 0;
  std::uint64_t start = 0;  // in clock ticks since the machine was started
};

std::string PlaceOf(unsigned int process, const char* name) {
  return "/proc/" + std::to_string(process) + "/" + name;
}

std::optional<ProcessFacts> FactsOf(unsigned int process) {
  std::ifstream file(PlaceOf(process, "stat"));
  std::string text;
  std::getline(file, text);
  // The second field is the program's name in parentheses, which may hold anything.
  const std::size_t nameEnd = text.rfind(')');
  if (nameEnd == std::string::npos) return std::nullopt;
  std::istringstream fields(text.substr(nameEnd + 1));
  ProcessFacts facts;
  std::string skipped;
  fields >> skipped >> facts.parent;
  for (int field = 5; field < 22; ++field) fields >> skipped;
  fields >> facts.start;
  if (!fields) return std::nullopt;
  return facts;
}

bool IsStill(const Enforce::ModuleEvent& event) {
  static const auto ticks = static_cast<std::uint64_t>(sysconf(_SC_CLK_TCK));
  const auto facts = FactsOf(event.process);
  return facts && facts->parent == event.parent &&
         facts->start == event.started / (kSecond / ticks);
}

std::string ProgramOf(unsigned int process) {
  std::error_code error;
  const std::filesystem::path program =
      std::filesystem::read_symlink(PlaceOf(process, "exe"), error);
  return error ? "" : program.native();
}

}  // namespace

// A process that is the same behind it was the same before, and so was its parent.
void AddProgramPaths(SecPolicyCli::GatheredRefusal& refusal) {
  const std::string program = ProgramOf(refusal.event.process);
  const std::string parent = ProgramOf(refusal.event.parent);
  if (!IsStill(refusal.event)) return;
  refusal.programPath = program;
  refusal.parentPath = parent;
}

}  // namespace SecPolicyLog
