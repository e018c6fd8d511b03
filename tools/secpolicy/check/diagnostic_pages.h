#pragma once

#include <string_view>

namespace SecPolicyCli {

// docs/diagnostics.md, which has a page for each kind of problem.
extern const std::string_view kDiagnosticPages;

}  // namespace SecPolicyCli
