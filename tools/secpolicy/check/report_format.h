#pragma once

#include <ostream>

#include "diagnostic.h"

namespace SecPolicyCli {

// Write all problems to `output`: for people, with the line and a mark under the words; for
// programs; and for programs that collect the findings of many tools (SARIF 2.1.0).
void WriteText(const DiagnosticList& diagnostics, std::ostream& output);
void WriteJson(const DiagnosticList& diagnostics, std::ostream& output);
void WriteSarif(const DiagnosticList& diagnostics, std::ostream& output);

}  // namespace SecPolicyCli
