#pragma once

#include <string>

namespace SecPolicy {

class PolicyObserver;

// The observer of what nobody observes.
PolicyObserver& Nobody();

// Throws Braxo::Lib::BraxoException with `message`.
[[noreturn]] void RaiseError(const std::string& message);

// Tells `observer` of an error and reports it as SecpolicyError does.
void ReportError(const std::string& message, PolicyObserver& observer);

// Writes `text` and a line end to standard output and flushes it: display text is promised line by
// line, so that it stands in order with what goes to standard error.
void PrintLine(std::string text = {});

}  // namespace SecPolicy
