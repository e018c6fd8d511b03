#pragma once

#include "json.h"
#include "report_source.h"

namespace SecPolicyCli {

// The report for its page: texts once each in "strings", rules by column, and the answers to all
// that can be asked, so that the page decides nothing.
Json ReportToJson(const ReportSource& source);

}  // namespace SecPolicyCli
