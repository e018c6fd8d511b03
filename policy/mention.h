#pragma once

#include <string_view>

#include "policy/rule.h"

namespace Policy {

// True for a rule that has something to say of what `word` stands for: a rule with that word; for a
// system call, a set with it; for a path, a rule about it or about a directory above it.
bool SpeaksOf(const Rule& rule, WordKind kind, std::string_view word);

// True when a rule about `rulePath` is about `path`: that is the same path, or beneath it.
bool Covers(std::string_view rulePath, std::string_view path);

}  // namespace Policy
