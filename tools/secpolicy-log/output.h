#pragma once

#include <cstdint>
#include <deque>
#include <string>

#include "explainer.h"

namespace SecPolicyLog {

// Where refusals are told: on standard output, to the journal where it listens, and in the file of
// the latest ones.
class Output {
 public:
  explicit Output(bool isJson);

  void Tell(const ExplainedRefusal& refusal);

  // Tells that so many refusals in the domain were not told.
  void TellUntold(const std::string& domain, std::uint64_t count);

  // Has all arrive that was told. Throws Braxo::Lib::BraxoException when it cannot.
  void Flush();

 private:
  const bool isJson;
  std::deque<std::string> latest;  // as JSON
  bool isNoted = true;
};

}  // namespace SecPolicyLog
