#include "scratch_state.h"

namespace SecPolicyCli {
namespace {

constexpr char kState[] = "host.db";

std::optional<LinuxHost::StateCopy> CopyUnless(bool fresh, const std::string& to) {
  if (fresh) return std::nullopt;
  return LinuxHost::CopyUsedState(to);
}

}  // namespace

ScratchState::ScratchState(bool fresh)
    : copy(CopyUnless(fresh, directory.File(kState))), used(directory.File(kState)) {}

std::string ScratchState::WhyNoCopy() const {
  if (copy == LinuxHost::StateCopy::kMissing) return "nothing is installed";
  if (copy == LinuxHost::StateCopy::kForbidden) return "this user may not read the installed state";
  return "";
}

}  // namespace SecPolicyCli
