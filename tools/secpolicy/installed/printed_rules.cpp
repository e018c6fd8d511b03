#include "printed_rules.h"

#include <iostream>
#include <sstream>
#include <utility>

#include "secpolicy/domain/policy_rules.h"

namespace SecPolicyCli {
namespace {

// Takes the place of the buffer of standard output and keeps what is written, flush by flush: a
// rule is written and flushed at once, so a path that holds a line feed stays one rule.
class RuleCapture : public std::stringbuf {
 public:
  RuleCapture() : std::stringbuf(std::ios_base::out), standardOutput(std::cout.rdbuf(this)) {}
  RuleCapture(const RuleCapture&) = delete;
  RuleCapture& operator=(const RuleCapture&) = delete;
  ~RuleCapture() override { std::cout.rdbuf(standardOutput); }

  std::vector<std::string> texts;

 protected:
  int sync() override {
    std::string text = str();
    str("");
    if (text.ends_with('\n')) text.pop_back();
    if (!text.empty()) texts.push_back(std::move(text));
    return 0;
  }

 private:
  std::streambuf* standardOutput;
};

}  // namespace

std::vector<std::string> PrintedRules(SecPolicy::PolicyRules& rules) {
  RuleCapture capture;
  rules.PrintRules();
  return std::move(capture.texts);
}

}  // namespace SecPolicyCli
