#pragma once

#include <span>
#include <string_view>

namespace SecPolicyCli {

// The texts of files in report/page/, which follow each other.
using PageFiles = std::span<const std::string_view>;

extern const PageFiles kPageFrame;
extern const PageFiles kPageStyle;
extern const PageFiles kPageScript;

}  // namespace SecPolicyCli
