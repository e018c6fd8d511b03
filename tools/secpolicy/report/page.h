#pragma once

#include <string>

#include "json.h"

namespace SecPolicyCli {

// The page of a report: one HTML document with its script, its style and its data, that loads
// nothing and lets nothing else run.
std::string MakePage(const std::string& title, const Json& report);

}  // namespace SecPolicyCli
