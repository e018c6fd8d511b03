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
  } catch (const Braxo::Lib::BraxoException& failure) {
    observer.OnProblem({.file = file, .reason = failure.what()});
    throw;
  }
}

// The lines of a policy file that have words, by number.
using ParsedLines = std::map<unsigned int, std::queue<std::string>>;

// Runs `readLine` on the words of each line of the policy file `file`, with a problem in which it
// notes what it looks at. The problem of a line that cannot be read is told, and the BraxoException
// passes on.
template <class ReadLine>
void ReadLines(const std::string& file, ParsedLines& lines, PolicyObserver& observer,
               ReadLine readLine) {
  for (auto& [line, words] : lines) {
    if (words.empty()) continue;
    Problem problem{.file = file, .line = line};
    try {
      readLine(words, problem);
    } catch (const Braxo::Lib::BraxoException&) {
      observer.OnProblem(problem);
      throw;
    }
  }
}

// As above, of a file that is parsed first.
template <class ReadLine>
void ReadLines(const std::string& file, PolicyObserver& observer, ReadLine readLine) {
  ParsedLines lines;
  TellFailure(file, observer, [&] { ParseFile(file, lines); });
  ReadLines(file, lines, observer, readLine);
}

// Tells that a phase of a load begins, and at the end of its life that the phase ends.
class PhaseOfLoad {
 public:
  PhaseOfLoad(LoadPhase begun, PolicyObserver& told) : phase(begun), observer(told) {
    observer.OnBegin(phase);
  }
  PhaseOfLoad(const PhaseOfLoad&) = delete;
  PhaseOfLoad& operator=(const PhaseOfLoad&) = delete;
  ~PhaseOfLoad() { observer.OnEnd(phase); }

 private:
  const LoadPhase phase;
  PolicyObserver& observer;
};

}  // namespace SecPolicy
