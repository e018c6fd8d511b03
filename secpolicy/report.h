#pragma once

#include <string>

namespace SecPolicy {

// Throws Braxo::Lib::BraxoException with `message`.
[[noreturn]] void RaiseError(const std::string& message);

// Writes `text` and a line end to standard output and flushes it: display text is promised line by
// line, so that it stands in order with what goes to standard error.
void PrintLine(std::string text = {});

}  // namespace SecPolicy
