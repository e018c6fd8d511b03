#pragma once

#include <map>
#include <queue>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// Runs `step`. A BraxoException is reported by its message; anything else passes through. Returns
// whether the step succeeded.
template <class Step>
bool CarryOn(PolicyObserver& observer, Step step) {
  try {
    step();
    return true;
  } catch (const Braxo::Lib::BraxoException& failure) {
    ReportError(failure.what(), observer);
    return false;
  }
}

// Runs `step` on every one of `items` as CarryOn does, so that a bad one does not stop the others.
// Returns whether all succeeded.
template <class Items, class Step>
bool ForEachCarryOn(Items& items, PolicyObserver& observer, Step step) {
  bool allSucceeded = true;
  for (auto& item : items) {
    if (!CarryOn(observer, [&] { step(item); })) allSucceeded = false;
  }
  return allSucceeded;
}

// Runs `step`. A BraxoException is told as a problem of `file` and passes on.
template <class Step>
void TellFailure(const std::string& file, PolicyObserver& observer, Step step) {
  try {
    step();
  } catch (const LineFailure& failure) {
    Problem problem = failure.problem;
    problem.file = file;
    observer.OnProblem(problem);
    RaiseError(failure.what());
  } catch (const Braxo::Lib::BraxoException& failure) {
    observer.OnProblem({.file = file, .reason = failure.what()});
    throw;
  }
}

// Runs `readLine` on the number and the words of each line of the policy file `file` that has any.
// A failure is told, and passes on.
template <class ReadLine>
void ReadLines(const std::string& file, PolicyObserver& observer, ReadLine readLine) {
  TellFailure(file, observer, [&] {
    std::map<unsigned int, std::queue<std::string>> lines;
    ParseFile(file, lines);
    for (auto& [line, words] : lines) {
      if (!words.empty()) readLine(line, words);
    }
  });
}

// Tells at the end of its life that a phase of a load ends.
class PhaseOfLoad {
 public:
  PhaseOfLoad(LoadPhase begun, PolicyObserver& told) : phase(begun), observer(told) {}
  PhaseOfLoad(const PhaseOfLoad&) = delete;
  PhaseOfLoad& operator=(const PhaseOfLoad&) = delete;
  ~PhaseOfLoad() { observer.OnEnd(phase); }

 private:
  const LoadPhase phase;
  PolicyObserver& observer;
};

}  // namespace SecPolicy
