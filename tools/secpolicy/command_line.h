#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "complete/word_place.h"
#include "verb.h"

// One file knows the library for command lines: its headers cost seconds to compile.
namespace CLI {
class App;
class Option;
}  // namespace CLI

namespace SecPolicyCli {

using Offerings = std::map<const CLI::Option*, Offering>;

// An option or argument that was added to a verb, for what is to be said about it beside its name
// and meaning. It lasts as long as the command line.
class Option {
 public:
  Option(CLI::Option& added, Offerings& all) : option(&added), offerings(&all) {}

  Option& Require(bool isRequired = true);
  Option& NameValue(const char* name);
  Option& ShowDefault();

  // `whyNot` says of a value why it cannot be taken; nothing of one that can.
  Option& Check(std::string (*whyNot)(const std::string& value));

  Option& Need(const Option& other);
  Option& Exclude(const Option& other);

  // What completion offers for a value whose name does not tell, as complete/offer.h has it.
  Option& Offer(const Offering& offering);

  bool IsGiven() const;

 private:
  friend class Syntax;

  CLI::Option* option;
  Offerings* offerings;
};

class Syntax;

// One of several things that a verb does, such as `get` of `label get`.
struct Kind {
  const char* name;
  const char* summary;
  const char* help;  // null: that of the verb
  std::function<Action(Syntax& syntax)> define;
};

// Steps that are due before the root is entered, for the options that they are for.
using Preparations = std::vector<std::pair<const CLI::Option*, void (*)()>>;

// What may stand behind a verb. The values that are handed in have to last until the action is
// done: they become what is given, and stay as they are when nothing is.
class Syntax {
 public:
  Syntax(CLI::App& verb, Offerings& all, Preparations& steps, std::size_t wordsBehindDashes)
      : app(verb), offerings(all), preparations(steps), behindDashes(wordsBehindDashes) {}

  Option AddFlag(const char* name, bool& value, const char* meaning);

  // With dashes in its name an option, without an argument.
  Option AddOption(const char* name, std::string& value, const std::string& meaning);

  // An argument takes all that is there; an option is given once for each value.
  Option AddList(const char* name, std::vector<std::string>& values, const std::string& meaning);

  // Adds --format, how to write `what`; the first of `formats` is taken when it is not given.
  Option AddFormat(std::string& value, const std::string& what,
                   const std::vector<std::string>& formats);

  // Returns an action that does what the kind does that is given.
  Action AddKinds(std::span<const Kind> kinds);

  // Where `option` is given, `step` is done before the root is entered; it may throw as an action.
  void BeforeRoot(const Option& option, void (*step)());

  // The option -v, which may stand anywhere.
  Option Verbose() const;

  // How many words stand behind the first "--", by which arguments that may be left out are told
  // from the words of a command.
  std::size_t WordsBehindDashes() const { return behindDashes; }

 private:
  CLI::App& app;
  Offerings& offerings;
  Preparations& preparations;
  const std::size_t behindDashes;
};

// Verbs that are for one thing, and its name in the list of verbs.
struct VerbGroup {
  const char* name;
  std::vector<const Verb*> verbs;
};

// What the command says about itself.
struct Description {
  const char* about;
  const char* footer;
  const char* version;
};

// The command line as a whole.
class CommandLine {
 public:
  CommandLine(const Description& description, std::span<const VerbGroup> verbGroups);
  CommandLine(const CommandLine&) = delete;
  CommandLine& operator=(const CommandLine&) = delete;
  ~CommandLine();

  // Returns the exit code when there is nothing to do: `show` was given what was asked for, help or
  // the version, or what is wrong with the usage is printed.
  std::optional<ExitCode> Read(int argc, char** argv,
                               const std::function<void(const std::string& text)>& show);

  // What can stand for the last of `words`, which are those behind the command's name and need not
  // be complete.
  WordPlace FindPlace(const std::vector<std::string>& words);

  // What was read.
  std::optional<std::string> Root() const;
  bool IsVerbose() const { return verbose; }
  const std::string& ColorChoice() const { return color; }
  bool IsPagerWanted() const { return !withoutPager; }
  const Verb& AskedVerb() const { return *verb; }
  // The verb and its kind, if it has any: "label get".
  std::string AskedCommand() const;

  // What has to be done before the root is entered.
  void Prepare() const;
  ExitCode Act() const { return action(); }

 private:
  void AddVerb(const Verb& added, const char* group);
  Action Define(const Verb& defined, CLI::App& subcommand);
  CommandForm FormOfKind(const std::vector<std::string>& names);

  std::unique_ptr<CLI::App> app;
  std::span<const VerbGroup> groups;
  Offerings offerings;
  Preparations preparations;
  CLI::Option* rootOption = nullptr;
  std::string root;
  bool verbose = false;
  std::string color = "auto";
  bool withoutPager = false;
  std::size_t wordsBehindDashes = 0;
  const Verb* verb = nullptr;
  Action action;
};

}  // namespace SecPolicyCli
