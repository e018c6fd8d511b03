#include "host/enforce/supervise/inquiry.h"

#include "policy/capability.h"

namespace Enforce {

const Credentials& Inquiry::Actor() {
  if (!actor) actor = caller.ActsAs().value_or(Credentials());
  return *actor;
}

std::optional<Place> Inquiry::PlaceOf(int directory, int argument, LastLink lastLink) const {
  const auto path = caller.ReadText(call.args[argument]);
  return path ? caller.Resolve(directory, *path, lastLink) : std::nullopt;
}

void Inquiry::AskFile(Policy::FileAccess access, const std::string& path) {
  asked.emplace_back(
      Policy::FileQuestion{.access = access, .path = path, .label = {}, .labelIsBuiltIn = false});
}

void Inquiry::AskMaking(Policy::RuleKind kind, const char* what, const std::string& path) {
  asked.emplace_back(Policy::CreationQuestion{
      .kind = kind, .what = what, .path = path, .directoryLabel = {}, .labelIsBuiltIn = false});
}

void Inquiry::AskCheck(const char* check, std::uint32_t value) {
  asked.emplace_back(Policy::ParameterQuestion{.check = check, .number = std::to_string(value)});
}

void Inquiry::AskCapability(const char* name) {
  const std::uint64_t bit = std::uint64_t{1} << Policy::CapabilityNumber(name).value();
  if ((Actor().capabilities & bit) == 0) return;
  asked.emplace_back(Policy::WordsQuestion{.kind = Policy::RuleKind::kCapability, .words = {name}});
}

}  // namespace Enforce
