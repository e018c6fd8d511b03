#pragma once

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace SecPolicyCli {

// Measures the phases of a load: each begins where the one before it ended.
class LoadTiming {
 public:
  using Clock = std::chrono::steady_clock;
  using Phase = std::pair<std::string, Clock::duration>;

  // The first phase begins at `start`.
  explicit LoadTiming(Clock::time_point start = Clock::now()) : lastEnd(start) {}

  // The phase `name` has ended `now`. One that ends again has gone on.
  void EndPhase(const std::string& name, Clock::time_point now = Clock::now());

  // The names of the phases from now on begin with `prefix`.
  void BeginPart(const std::string& prefix) { part = prefix; }

  // In the order in which they ended for the first time.
  const std::vector<Phase>& Phases() const { return phases; }

 private:
  std::string part;
  Clock::time_point lastEnd;
  std::vector<Phase> phases;
};

// A line for each phase and one for their sum.
std::string Describe(const std::vector<LoadTiming::Phase>& phases);

}  // namespace SecPolicyCli
