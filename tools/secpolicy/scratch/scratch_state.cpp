#include "scratch_state.h"

#include <filesystem>

namespace SecPolicyCli {
namespace {

constexpr char kState[] = "host.db";

}  // namespace

ScratchState::ScratchState(bool fresh)
    : copyFailure(fresh ? "" : CopyUsedState(directory.File(kState))),
      copied(std::filesystem::exists(directory.File(kState))),
      used(directory.File(kState)) {}

}  // namespace SecPolicyCli
