#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

// What the state remembers of the latest load in this boot. Everything throws
// Braxo::Lib::BraxoException when the state cannot be used.
namespace LinuxHost {

class HostState;

struct LoadRecord {
  std::string verb;
  std::string directory;
  std::int64_t time = 0;  // seconds since 1970
  std::string ending;     // "done", "failed" or "stopped"
  std::uint64_t errorCount = 0;
  std::vector<std::string> errors;  // the first kKeptErrors of them
  std::uint64_t removedRules = 0;   // that no file had any more, as their domains
  std::uint64_t removedDomains = 0;
};

// More than anyone reads; a load may report one for each line.
constexpr std::size_t kKeptErrors = 100;

// Takes the place of the earlier record.
void RecordLoad(HostState& state, const LoadRecord& record);

// Empty when nothing was recorded since the boot.
std::optional<LoadRecord> LatestLoad(HostState& state);

// Which bundle is what is installed, by the SHA-256 of its manifest; empty: none. Beside the
// record, as not every load changes it.
void RecordLoadedBundle(HostState& state, const std::string& digest);
std::string LoadedBundle(HostState& state);

}  // namespace LinuxHost
