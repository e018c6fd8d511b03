#pragma once

#include <cstddef>
#include <iosfwd>

#include "host/linux/operation/boot.h"

namespace SecPolicyCli {

// Write what a boot would do with files: as text, at most `maximum` files under each heading, or as
// a JSON document.
void WriteBootPlanText(const LinuxHost::BootPlan& plan, std::size_t maximum, std::ostream& output);
void WriteBootPlanJson(const LinuxHost::BootPlan& plan, std::ostream& output);

}  // namespace SecPolicyCli
