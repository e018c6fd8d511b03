#include "usage_error.h"

#include <CLI/App.hpp>

#include "text/suggestion.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// The command, the verb that was asked for, and its kind, as far as they were given.
std::vector<const CLI::App*> LevelsOf(const CLI::App& app) {
  std::vector<const CLI::App*> levels = {&app};
  while (!levels.back()->get_subcommands().empty()) {
    levels.push_back(levels.back()->get_subcommands().front());
  }
  return levels;
}

std::vector<std::string> OptionNames(const std::vector<const CLI::App*>& levels) {
  std::vector<std::string> names;
  for (const CLI::App* level : levels) {
    for (const CLI::Option* option : level->get_options()) {
      for (const std::string& name : option->get_lnames()) names.push_back("--" + name);
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
bool IsMeantAsFormat(const std::string& name, const CLI::App& verb) {
  const CLI::Option* const format = verb.get_option_no_throw("--format");
  return name == "--json" && format != nullptr &&
         format->get_description().find("json") != std::string::npos;
}

std::string DescribeUnknown(const std::string& word, const std::vector<const CLI::App*>& levels) {
  const std::vector<std::string> names = SubcommandNames(*levels.back());
  if (levels.size() == 1) {
    return "there is no verb or option '" + word + "'" +
           DidYouMean(word, word.starts_with('-') ? OptionNames(levels) : names);
  }
  if (word.starts_with('-')) {
    const std::string name = word.substr(0, word.find('='));
    if (levels.back()->get_option_no_throw(name) != nullptr) {
      return "the option '" + name + "' stands behind '" + levels.back()->get_name() + "'";
    }
    const std::string unknown = "there is no option '" + name + "'";
    if (IsMeantAsFormat(name, *levels.back())) return unknown + "; did you mean '--format json'?";
    return unknown + DidYouMean(name, OptionNames(levels));
  }
  if (names.empty()) return "'" + word + "' is one word too many";
  const std::string nearest = DidYouMean(word, names);
  return "there is no '" + levels.back()->get_name() + " " + word + "'" +
         (nearest.empty() ? (names.size() > 1 ? "; there are " : "; there is ") + Join(names)
                          : nearest);
}

std::string DescribeMissingKind(const std::vector<const CLI::App*>& levels) {
  if (levels.size() == 1) return "a verb is required";
  return "one of " + Join(SubcommandNames(*levels.back())) + " is required";
}

// The parser's own words begin with the name of the option, of a flag without its dashes.
std::string DescribeValues(const std::string& message) {
  const auto says = [&](const char* word) { return message.find(word) != std::string::npos; };
  if (says("override")) return "--" + message.substr(0, message.find(' ')) + " takes no value";
  return message.substr(0, message.find(':')) +
         (says("missing") ? " needs a value" : " is given more than once");
}

template <class Kind>
bool Is(const CLI::Error& error) {
  return dynamic_cast<const Kind*>(&error) != nullptr;
}

std::string DescribeProblem(const CLI::App& app, const CLI::Error& error) {
  const std::vector<const CLI::App*> levels = LevelsOf(app);
  const std::vector<std::string> unknown = app.remaining(true);
  const bool isRequired = Is<CLI::RequiredError>(error);
  if ((isRequired || Is<CLI::ExtrasError>(error)) && !unknown.empty()) {
    return DescribeUnknown(unknown.front(), levels);
  }
  if (isRequired && !SubcommandNames(*levels.back()).empty()) return DescribeMissingKind(levels);
  if (Is<CLI::ArgumentMismatch>(error)) return DescribeValues(error.what());
  return error.what();
}

}  // namespace

std::vector<std::string> SubcommandNames(const CLI::App& app) {
  std::vector<std::string> names;
  for (const CLI::App* each : app.get_subcommands([](const CLI::App*) { return true; })) {
    names.push_back(each->get_name());
  }
  return names;
}

std::string CommandOf(const CLI::App& app) {
  std::string command;
  for (const CLI::App* level : LevelsOf(app)) {
    command += (command.empty() ? "" : " ") + level->get_name();
  }
  return command;
}

std::string ExplainUsage(const CLI::App* app, const CLI::Error& error) {
  return "secpolicy: " + VisibleLines(DescribeProblem(*app, error)) + "\n'" + CommandOf(*app) +
         " --help' explains the usage.\n";
}

}  // namespace SecPolicyCli
