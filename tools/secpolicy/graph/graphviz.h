#pragma once

#include <string>

namespace SecPolicyCli {

// Remembers the root directory that this process has now, so that a program of the system can be
// run after another root was entered.
void KeepSystemRoot();

// Draws `dot` as SVG to standard output, by Graphviz of the root that was kept. Throws
// std::runtime_error, with what to do, when Graphviz is not installed or fails.
void DrawSvg(const std::string& dot);

}  // namespace SecPolicyCli
