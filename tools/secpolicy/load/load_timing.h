#pragma once

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace SecPolicyCli {

// Measures the phases of a load: each ends where the library or the host logs that it has. A phase
// that fails half-way counts for the next one.
class LoadTiming {
 public:
  // Does nothing unless `wanted`.
  explicit LoadTiming(bool wanted);
  LoadTiming(const LoadTiming&) = delete;
  LoadTiming& operator=(const LoadTiming&) = delete;

  // Writes the phases and their sum to standard output.
  ~LoadTiming();

  // A phase that nothing is logged of has ended.
  void EndPhase(const std::string& name);

  // The names of the phases from now on begin with `prefix`.
  void BeginPart(const std::string& prefix);

 private:
  using Clock = std::chrono::steady_clock;

  void Note(const std::string& message);
  bool Has(const std::string& name) const;

  const bool isWanted;
  bool isFullLoad = false;
  std::string part;
  Clock::time_point lastEnd;
  std::vector<std::pair<std::string, Clock::duration>> phases;
};

}  // namespace SecPolicyCli
