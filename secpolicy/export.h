/// @file
/// What the library shows to programs.

#pragma once

/// Makes a name visible outside libsecpolicy; everything else is hidden.
#define SECPOLICY_EXPORT __attribute__((visibility("default")))
