#pragma once

#include <functional>
#include <memory>
#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Adds --format text|json to `syntax`; its value is "text" when it is not given.
std::shared_ptr<const std::string> AddAnswerFormat(Syntax& syntax);

// Runs `answer` for the verb `verb`. Where nothing is installed it says so and returns
// `withoutState`.
ExitCode Ask(const std::string& verb, const std::function<ExitCode()>& answer,
             ExitCode withoutState = kFailed);

}  // namespace SecPolicyCli
