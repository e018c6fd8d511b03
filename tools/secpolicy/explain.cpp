#include <iostream>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "check/diagnostic.h"
#include "check/diagnostic_pages.h"
#include "command_line.h"
#include "terminal/size.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// What docs/diagnostics.md says below the heading of the code.
std::string_view PageOf(const std::string& code) {
  const std::string_view pages = kDiagnosticPages;
  const std::string heading = "### `" + code + "`\n\n";
  const std::size_t begin = pages.find(heading) + heading.size();
  return pages.substr(begin, pages.find("\n#", begin) - begin);
}

void ListCodes() {
  constexpr std::size_t kNameWidth = 22;
  constexpr std::size_t kSeverityWidth = 9;
  for (const Code* code : AllCodes()) {
    std::string line = code->name;
    line.resize(kNameWidth, ' ');
    line += SeverityName(code->severity);
    line.resize(kNameWidth + kSeverityWidth, ' ');
    std::cout << FitTerminal(line + code->summary) << '\n';
  }
}

Action Define(Syntax& syntax) {
  const auto code = std::make_shared<std::string>();
  syntax.AddOption("CODE", *code, "The name of a problem, as check writes it behind each")
      .Check(WhyNoCode);
  return [code] {
    if (code->empty()) {
      ListCodes();
    } else {
      std::cout << FitTerminal(std::string(PageOf(*code)));
    }
    return kWell;
  };
}

}  // namespace

const Verb kExplain = {
    "explain",
    "Explain a problem that check has found",
    "Prints what a problem means, what a load does about it and how to mend it.\n"
    "Without CODE, lists all problems.\n"
    "\n"
    "Examples:\n"
    "  secpolicy explain unknown-word\n"
    "  secpolicy explain",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
