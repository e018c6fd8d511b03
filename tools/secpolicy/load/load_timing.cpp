#include "load/load_timing.h"

#include <algorithm>
#include <iomanip>
#include <sstream>

namespace SecPolicyCli {
namespace {

void WriteLine(const std::string& name, LoadTiming::Clock::duration time, std::ostream& text) {
  constexpr int kNameWidth = 18;
  text << std::left << std::setw(kNameWidth) << name << std::fixed << std::setprecision(4)
       << std::chrono::duration<double>(time).count() << " s\n";
}

}  // namespace

void LoadTiming::EndPhase(const std::string& name, Clock::time_point now) {
  const auto known = std::find_if(phases.begin(), phases.end(),
                                  [&](const Phase& phase) { return phase.first == part + name; });
  if (known == phases.end()) {
    phases.emplace_back(part + name, now - lastEnd);
  } else {
    known->second += now - lastEnd;
  }
  lastEnd = now;
}

std::string Describe(const std::vector<LoadTiming::Phase>& phases) {
  std::ostringstream text;
  LoadTiming::Clock::duration sum{};
  for (const auto& [name, time] : phases) {
    WriteLine(name, time, text);
    sum += time;
  }
  WriteLine("all", sum, text);
  return text.str();
}

}  // namespace SecPolicyCli
