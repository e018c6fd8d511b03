#pragma once

namespace SecPolicyCli {

// What the lines of a policy file are.
enum class FileRole { kObjectFile, kDomainFile, kTardiskFile, kLabelFile };

}  // namespace SecPolicyCli
