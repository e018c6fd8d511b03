#include "usage_error.h"

#include <algorithm>
#include <iterator>

#include "text/suggestion.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Levels = std::vector<CommandForm>;

std::vector<std::string> OptionNames(const Levels& levels) {
  std::vector<std::string> names;
  for (const CommandForm& level : levels) {
    for (const OptionForm& option : level.options) {
      std::ranges::copy_if(option.names, std::back_inserter(names),
                           [](const std::string& name) { return name.starts_with("--"); });
    }
  }
  return names;
}

std::string Join(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
  return text;
}

std::string DidYouMean(const std::string& word, const std::vector<std::string>& known) {
  const std::string nearest = NearestWord(word, known);
  return nearest.empty() ? "" : "; did you mean '" + nearest + "'?";
}

// What other commands call the option.
bool IsMeantAsFormat(const std::string& name, const CommandForm& verb) {
  const OptionForm* const format = verb.FindOption("--format");
  return name == "--json" && format != nullptr &&
         format->description.find("json") != std::string::npos;
}

std::string DescribeUnknown(const std::string& word, const Levels& levels) {
  const std::vector<std::string> names = levels.back().KindNames();
  if (levels.size() == 1) {
    return "there is no verb or option '" + word + "'" +
           DidYouMean(word, word.starts_with('-') ? OptionNames(levels) : names);
  }
  if (word.starts_with('-')) {
    const std::string name = word.substr(0, word.find('='));
    if (levels.back().FindOption(name) != nullptr) {
      return "the option '" + name + "' stands behind '" + levels.back().name + "'";
    }
    const std::string unknown = "there is no option '" + name + "'";
    if (IsMeantAsFormat(name, levels.back())) return unknown + "; did you mean '--format json'?";
    return unknown + DidYouMean(name, OptionNames(levels));
  }
  if (names.empty()) return "'" + word + "' is one word too many";
  const std::string nearest = DidYouMean(word, names);
  return "there is no '" + levels.back().name + " " + word + "'" +
         (nearest.empty() ? (names.size() > 1 ? "; there are " : "; there is ") + Join(names)
                          : nearest);
}

std::string DescribeMissingKind(const Levels& levels) {
  if (levels.size() == 1) return "a verb is required";
  return "one of " + Join(levels.back().KindNames()) + " is required";
}

// The parser's own words begin with the name of the option, of a flag without its dashes.
std::string DescribeValues(const std::string& message) {
  const auto says = [&](const char* word) { return message.find(word) != std::string::npos; };
  if (says("override")) return "--" + message.substr(0, message.find(' ')) + " takes no value";
  return message.substr(0, message.find(':')) +
         (says("missing") ? " needs a value" : " is given more than once");
}

std::string DescribeProblem(const UsageError& error) {
  const bool isMissing = error.fault == UsageFault::kMissing;
  if ((isMissing || error.fault == UsageFault::kUnknown) && !error.unknown.empty()) {
    return DescribeUnknown(error.unknown.front(), error.levels);
  }
  if (isMissing && !error.levels.back().kinds.empty()) return DescribeMissingKind(error.levels);
  if (error.fault == UsageFault::kValues) return DescribeValues(error.message);
  return error.message;
}

std::vector<std::string> NamesOf(const Levels& levels) {
  std::vector<std::string> names;
  for (const CommandForm& level : levels) names.push_back(level.name);
  return names;
}

}  // namespace

std::string CommandOf(const std::vector<std::string>& names) {
  std::string command;
  for (const std::string& name : names) command += (command.empty() ? "" : " ") + name;
  return command;
}

std::string ExplainUsage(const UsageError& error) {
  return "secpolicy: " + VisibleLines(DescribeProblem(error)) + "\n'" +
         CommandOf(NamesOf(error.levels)) + " --help' explains the usage.\n";
}

}  // namespace SecPolicyCli
