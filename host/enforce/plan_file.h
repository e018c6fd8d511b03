#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "host/enforce/plan/plan.h"

// A plan as bytes, for the launcher. They are read again by the same build on the same machine
// only.
namespace Enforce {

// No plan is longer.
constexpr std::size_t kMostPlanBytes = std::size_t{16} << 20;

std::string Serialize(const Plan& plan);

// The plan that Serialize has made the bytes of. False when they are anything else, or a plan that
// contradicts itself; `plan` is undefined then, and `whyNot` says it to people in static text.
bool Parse(std::string_view bytes, Plan* plan, const char** whyNot);

}  // namespace Enforce
