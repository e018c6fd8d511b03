#pragma once

#include <functional>

namespace SecPolicyCli {

class Syntax;

enum ExitCode : int {
  kWell = 0,
  kFailed = 1,
  kUsage = 2,
  kStopped = 3,        // the library stopped the load: a well-known domain is missing
  kNotConfined = 126,  // as of a shell that finds a program and cannot start it
  kNoProgram = 127     // as of one that finds none
};

// What a verb does when the command line has been read and the root has been entered.
using Action = std::function<ExitCode()>;

// One verb of the command.
struct Verb {
  const char* name;
  const char* summary;  // one line of the list of verbs
  const char* help;     // what a user has to know, with an example

  // Adds what may stand behind the verb to `syntax` and returns the verb's action, which keeps the
  // values.
  Action (*define)(Syntax& syntax);

  // What has to be done before the root is entered, if anything; may throw as an action may.
  void (*prepare)() = nullptr;

  // Its output may be longer than a terminal.
  bool isLong = false;
};

extern const Verb kInit;
extern const Verb kNew;
extern const Verb kExplain;
extern const Verb kBoot;
extern const Verb kCheck;
extern const Verb kLsp;
extern const Verb kLoad;
extern const Verb kLoadEarly;
extern const Verb kBundle;
extern const Verb kRestore;
extern const Verb kDisplay;
extern const Verb kDiff;
extern const Verb kSave;
extern const Verb kHistory;
extern const Verb kSaved;
extern const Verb kRollback;
extern const Verb kSettings;
extern const Verb kGraph;
extern const Verb kReport;
extern const Verb kLabel;
extern const Verb kModule;
extern const Verb kStatus;
extern const Verb kDrift;
extern const Verb kDomain;
extern const Verb kFilePolicy;
extern const Verb kCapability;
extern const Verb kParamCheck;
extern const Verb kRun;
extern const Verb kExec;
extern const Verb kObserve;
extern const Verb kFeatures;
extern const Verb kWhoCan;
extern const Verb kRules;
extern const Verb kPath;
extern const Verb kWhy;
extern const Verb kWords;

}  // namespace SecPolicyCli
