#include "load/load_timing.h"

#include <algorithm>
#include <array>
#include <iomanip>
#include <iostream>
#include <sstream>
#include <string_view>

#include "host/linux/operation/log_use.h"

namespace SecPolicyCli {
namespace {

struct PhaseEnd {
  std::string_view message;  // how it begins
  const char* phase;
};

constexpr char kDomains[] = "domains";
constexpr char kTardisks[] = "tardisks";

// Nothing is logged at the very end of the tardisks: the files of labels have been read by then.
constexpr std::array kPhaseEnds = {
    PhaseEnd{"Unpacked tardisk ", "unpacking"},
    PhaseEnd{"Objects defined and obsolete objects removed", "objects"},
    PhaseEnd{"Error in defining some objects", "objects"},
    PhaseEnd{"Domain policies set", kDomains},
    PhaseEnd{"Error in setting the policy for some domains", kDomains},
    PhaseEnd{"Parsed all file label mappings", kTardisks},
    PhaseEnd{"Error in parsing some file label mappings.", kTardisks},
    PhaseEnd{"Set all file labels", "file labels"},
    PhaseEnd{"Error in setting some file labels.", "file labels"},
};

void WriteLine(const std::string& name, std::chrono::steady_clock::duration time) {
  constexpr int kNameWidth = 18;
  std::ostringstream line;
  line << std::left << std::setw(kNameWidth) << name << std::fixed << std::setprecision(4)
       << std::chrono::duration<double>(time).count() << " s\n";
  std::cout << line.str();
}

}  // namespace

LoadTiming::LoadTiming(bool wanted) : isWanted(wanted), lastEnd(Clock::now()) {
  if (isWanted) LinuxHost::WatchLog([this](const std::string& message) { Note(message); });
}

LoadTiming::~LoadTiming() {
  if (!isWanted) return;
  LinuxHost::WatchLog({});
  Clock::duration sum{};
  for (const auto& [name, time] : phases) {
    WriteLine(name, time);
    sum += time;
  }
  WriteLine("all", sum);
}

void LoadTiming::EndPhase(const std::string& name) {
  if (!isWanted) return;
  const Clock::time_point now = Clock::now();
  const auto phase = std::find_if(phases.begin(), phases.end(),
                                  [&](const auto& known) { return known.first == part + name; });
  if (phase == phases.end()) {
    phases.emplace_back(part + name, now - lastEnd);
  } else {
    phase->second += now - lastEnd;
  }
  lastEnd = now;
}

void LoadTiming::BeginPart(const std::string& prefix) { part = prefix; }

bool LoadTiming::Has(const std::string& name) const {
  return std::any_of(phases.begin(), phases.end(),
                     [&](const auto& known) { return known.first == part + name; });
}

void LoadTiming::Note(const std::string& message) {
  if (message.starts_with("Using policy dir ")) isFullLoad = true;
  for (const PhaseEnd& end : kPhaseEnds) {
    if (!message.starts_with(end.message)) continue;
    // An early load has no tardisks.
    if (end.phase == kTardisks && !isFullLoad) return;
    const bool isPartners = end.phase == kDomains && Has(kDomains);
    return EndPhase(isPartners ? "partner domains" : end.phase);
  }
}

}  // namespace SecPolicyCli
