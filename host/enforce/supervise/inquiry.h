#pragma once

#include <linux/seccomp.h>

#include <optional>
#include <string>
#include <vector>

#include "host/enforce/supervise/caller.h"
#include "policy/decision.h"

namespace Enforce {

// One call and what it asks, as it is found out. The call and its caller have to last.
class Inquiry {
 public:
  Inquiry(const seccomp_data& asking, const Caller& from) : call(asking), caller(from) {}

  // An argument, as an address or a number of 32 bits.
  std::uint64_t Address(int argument) const { return call.args[argument]; }
  int Number(int argument) const { return static_cast<int>(call.args[argument]); }
  std::uint32_t Word(int argument) const { return static_cast<std::uint32_t>(call.args[argument]); }

  const Caller& From() const { return caller; }

  // As whom the caller acts. Who is gone may do nothing.
  const Credentials& Actor();

  // Where the path leads that an argument is the address of; nothing as of Caller::Resolve.
  std::optional<Place> PlaceOf(int directory, int argument, LastLink lastLink) const;

  // The questions, in the order in which they were asked.
  void AskFile(Policy::FileAccess access, const std::string& path);
  void AskMaking(Policy::RuleKind kind, const char* what, const std::string& path);
  void AskCheck(const char* check, std::uint32_t value);

  // Only of who has it: others are refused it without a domain, too.
  void AskCapability(const char* name);

  std::vector<Policy::Question> Take() && { return std::move(asked); }

 private:
  const seccomp_data& call;
  const Caller& caller;
  std::optional<Credentials> actor;
  std::vector<Policy::Question> asked;
};

}  // namespace Enforce
