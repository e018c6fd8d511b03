#include "command_line.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>
#include <iostream>
#include <sstream>
#include <string_view>

#include "text/format.h"
#include "usage_error.h"

namespace SecPolicyCli {
namespace {

// The first that is no option of all verbs, nor the value of one.
std::vector<std::string>::iterator FirstWord(std::vector<std::string>& words) {
  auto word = words.begin();
  while (word != words.end() && word->starts_with('-')) {
    const bool takesNext = *word == "--root" || *word == "--color";
    word += takesNext && word + 1 != words.end() ? 2 : 1;
  }
  return word;
}

std::vector<const CLI::App*> SubcommandsOf(const CLI::App& app) {
  return app.get_subcommands([](const CLI::App*) { return true; });
}

OptionForm FormOf(const CLI::Option& option, const Offerings& offerings) {
  OptionForm form;
  const std::string type = option.get_type_name();
  // It says what a value may be, too: "FORMAT:{text,json}".
  form.valueName = option.get_positional() ? option.get_name(true) : type.substr(0, type.find(':'));
  for (const std::string& name : option.get_lnames()) form.names.push_back("--" + name);
  for (const std::string& name : option.get_snames()) form.names.push_back("-" + name);
  form.description = option.get_description();
  form.takesValue = option.get_items_expected_max() > 0;
  form.isList = option.get_expected_max() > 1;
  const auto offering = offerings.find(&option);
  if (offering != offerings.end()) form.offering = offering->second;
  return form;
}

CommandForm FormOf(const CLI::App& app, const Offerings& offerings) {
  CommandForm form{.name = app.get_name(), .options = {}, .kinds = {}};
  for (const CLI::Option* option : app.get_options()) {
    form.options.push_back(FormOf(*option, offerings));
  }
  for (const CLI::App* kind : SubcommandsOf(app)) {
    form.kinds.push_back({kind->get_name(), kind->get_description()});
  }
  return form;
}

// The command, the verb that was asked for, and its kind, as far as they were given.
std::vector<const CLI::App*> GivenLevels(const CLI::App& app) {
  std::vector<const CLI::App*> levels = {&app};
  while (!levels.back()->get_subcommands().empty()) {
    levels.push_back(levels.back()->get_subcommands().front());
  }
  return levels;
}

template <class Kind>
bool Is(const CLI::Error& error) {
  return dynamic_cast<const Kind*>(&error) != nullptr;
}

UsageFault FaultOf(const CLI::Error& error) {
  if (Is<CLI::RequiredError>(error)) return UsageFault::kMissing;
  if (Is<CLI::ExtrasError>(error)) return UsageFault::kUnknown;
  return Is<CLI::ArgumentMismatch>(error) ? UsageFault::kValues : UsageFault::kOther;
}

std::string ExplainFailure(const CLI::App* app, const CLI::Error& error) {
  UsageError usage{FaultOf(error), {}, app->remaining(true), error.what()};
  for (const CLI::App* level : GivenLevels(*app)) usage.levels.push_back(FormOf(*level, {}));
  return ExplainUsage(usage);
}

// "help" and nothing at all ask for the list of verbs, "help VERB" for what "VERB --help" tells.
std::vector<std::string> Unabbreviated(std::span<char*> words, const CLI::App& app) {
  std::vector<std::string> plain(words.begin() + 1, words.end());
  if (plain.empty()) return {"--help"};
  const auto help = FirstWord(plain);
  if (help == plain.end() || *help != "help") return plain;
  const auto verb = plain.erase(help);
  if (verb == plain.end()) return {"--help"};
  const std::vector<const CLI::App*> verbs = SubcommandsOf(app);
  const bool isVerb = std::ranges::find(verbs, *verb, &CLI::App::get_name) != verbs.end();
  if (isVerb) plain.emplace_back("--help");
  return plain;
}

CLI::Validator OneOf(const std::vector<std::string>& choices) {
  const auto whyNot = [choices](const std::string& word) -> std::string {
    if (std::ranges::find(choices, word) != choices.end()) return "";
    return "there is no '" + word + "'; there are " + ListOf(choices, "and");
  };
  return {whyNot, ""};
}

}  // namespace

Option& Option::Require(bool isRequired) {
  option->required(isRequired);
  return *this;
}

Option& Option::NameValue(const char* name) {
  option->type_name(name);
  return *this;
}

Option& Option::ShowDefault() {
  option->capture_default_str();
  return *this;
}

Option& Option::Check(std::string (*whyNot)(const std::string& value)) {
  option->check(CLI::Validator(whyNot, ""));
  return *this;
}

Option& Option::Need(const Option& other) {
  option->needs(other.option);
  return *this;
}

Option& Option::Exclude(const Option& other) {
  option->excludes(other.option);
  return *this;
}

Option& Option::Offer(const Offering& offering) {
  offerings->insert_or_assign(option, offering);
  return *this;
}

bool Option::IsGiven() const { return option->count() > 0; }

Option Syntax::AddFlag(const char* name, bool& value, const char* meaning) {
  return {*app.add_flag(name, value, meaning)->disable_flag_override(), offerings};
}

Option Syntax::AddOption(const char* name, std::string& value, const std::string& meaning) {
  return {*app.add_option(name, value, meaning), offerings};
}

Option Syntax::AddList(const char* name, std::vector<std::string>& values,
                       const std::string& meaning) {
  CLI::Option* const list = app.add_option(name, values, meaning);
  if (name[0] == '-') list->allow_extra_args(false);
  return {*list, offerings};
}

Option Syntax::AddFormat(std::string& value, const std::string& what,
                         const std::vector<std::string>& formats) {
  value = formats.front();
  CLI::Option* const format =
      app.add_option("--format", value, "How to write " + what + ": " + ListOf(formats, "or"));
  format->check(OneOf(formats))->type_name("FORMAT")->capture_default_str();
  return Option(*format, offerings).Offer(OfferWords(formats));
}

Action Syntax::AddKinds(std::span<const Kind> kinds) {
  app.require_subcommand(1);
  const auto chosen = std::make_shared<Action>();
  for (const Kind& kind : kinds) {
    CLI::App* const subcommand = app.add_subcommand(kind.name, kind.summary);
    subcommand->group("Subcommands");
    if (kind.help != nullptr) subcommand->footer(kind.help);
    Syntax syntax(*subcommand, offerings, preparations, behindDashes);
    subcommand->parse_complete_callback(
        [chosen, action = kind.define(syntax)] { *chosen = action; });
  }
  return [chosen] { return (*chosen)(); };
}

void Syntax::BeforeRoot(const Option& option, void (*step)()) {
  preparations.emplace_back(option.option, step);
}

// Kinds of a verb have it of the command, too.
Option Syntax::Verbose() const {
  CLI::App* command = app.get_parent();
  while (command->get_parent() != nullptr) command = command->get_parent();
  return {*command->get_option("--verbose"), offerings};
}

CommandLine::CommandLine(const Description& description, std::span<const VerbGroup> verbGroups)
    : app(std::make_unique<CLI::App>(description.about, "secpolicy")), groups(verbGroups) {
  app->require_subcommand(1);
  app->fallthrough();
  app->footer(description.footer);
  app->failure_message(ExplainFailure);
  app->set_version_flag("--version", description.version);
  rootOption = app->add_option("--root", root, "Work below DIR as if it were /; needs no privilege")
                   ->type_name("DIR");
  app->add_flag("-v,--verbose", verbose, "Show the progress on standard error too")
      ->disable_flag_override();
  const std::vector<std::string> choices = {"auto", "always", "never"};
  offerings.emplace(app->add_option("--color", color, "Show colors: " + ListOf(choices, "or"))
                        ->check(OneOf(choices))
                        ->type_name("WHEN"),
                    OfferWords(choices));
  app->add_flag("--no-pager", withoutPager, "Show long output without a pager")
      ->disable_flag_override();
  for (const VerbGroup& group : groups) {
    for (const Verb* each : group.verbs) AddVerb(*each, group.name);
  }
}

CommandLine::~CommandLine() = default;

// Only the verb that is asked for gets its options: to define them all would slow every start.
void CommandLine::AddVerb(const Verb& added, const char* group) {
  CLI::App* const subcommand = app->add_subcommand(added.name, added.summary);
  subcommand->group(group);
  subcommand->preparse_callback([this, &added, subcommand](std::size_t /*rest*/) {
    subcommand->footer(added.help);
    action = Define(added, *subcommand);
    verb = &added;
  });
}

Action CommandLine::Define(const Verb& defined, CLI::App& subcommand) {
  Syntax syntax(subcommand, offerings, preparations, wordsBehindDashes);
  return defined.define(syntax);
}

CommandForm CommandLine::FormOfKind(const std::vector<std::string>& names) {
  CLI::App* level = app.get();
  for (const std::string& name : names) level = level->get_subcommand(name);
  if (names.size() == 1) {
    for (const VerbGroup& group : groups) {
      const auto found = std::ranges::find(group.verbs, names.front(), &Verb::name);
      // The values of options belong to the action.
      if (found != group.verbs.end()) action = Define(**found, *level);
    }
  }
  return FormOf(*level, offerings);
}

WordPlace CommandLine::FindPlace(const std::vector<std::string>& words) {
  const auto enter = [this](const std::vector<std::string>& names) { return FormOfKind(names); };
  return SecPolicyCli::FindPlace(FormOf(*app, offerings), enter, words);
}

std::optional<ExitCode> CommandLine::Read(
    int argc, char** argv, const std::function<void(const std::string& text)>& show) {
  const std::span<char*> words(argv, static_cast<std::size_t>(argc));
  const auto dashes = std::ranges::find(words, std::string_view("--"));
  wordsBehindDashes =
      static_cast<std::size_t>(std::max<std::ptrdiff_t>(words.end() - dashes - 1, 0));
  try {
    std::vector<std::string> plain = Unabbreviated(words, *app);
    std::ranges::reverse(plain);  // as the parser wants them
    app->parse(std::move(plain));
    return std::nullopt;
  } catch (const CLI::ParseError& error) {
    std::ostringstream text;
    const bool isWell = app->exit(error, text, std::cerr) == 0;
    if (isWell) show(text.str());
    return isWell ? kWell : kUsage;
  }
}

std::optional<std::string> CommandLine::Root() const {
  if (rootOption->count() == 0) return std::nullopt;
  return root;
}

void CommandLine::Prepare() const {
  if (verb->prepare != nullptr) verb->prepare();
  for (const auto& [option, step] : preparations) {
    if (option->count() > 0) step();
  }
}

std::string CommandLine::AskedCommand() const {
  std::vector<std::string> names;
  for (const CLI::App* level : GivenLevels(*app)) names.push_back(level->get_name());
  names.erase(names.begin());
  return CommandOf(names);
}

}  // namespace SecPolicyCli
