#pragma once

#include <functional>
#include <string>
#include <vector>

#include "command_line.h"
#include "host/linux/common/descriptor.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {

struct EntryOptions {
  bool bestEffort = false;
};

// Adds --best-effort to `syntax`.
void AddEntryOptions(Syntax& syntax, EntryOptions& options);

// What has to be done for an entry before the root is entered.
void PrepareEntry();

// What is to be started, and the domain that it is started in, by its name or its number.
struct Entry {
  std::string domain;
  std::vector<std::string> command;
  LinuxHost::Descriptor program{-1};  // of what was judged; else the command says what it is
  std::string programPath = {};       // its real path
  std::vector<std::string> environment = {};  // variables in place of those of this process
  bool isForAnother = false;                  // who waits for its end, and at whose end it ends
};

// The variables of the program of the entry: those of this process, but for that of its own broker,
// with the entry's in place of those that have the same names.
std::vector<std::string> EnvironmentOf(const Entry& entry);

// Becomes the program of the entry, or runs and watches it where the domain is permissive. Whoever
// may not read the state enters by a published plan. Returns only then, and where nothing was
// started, with what to end with; why has been told.
ExitCode EnterDomain(const std::string& verb, const Entry& entry, const EntryOptions& options);

// The same for the entry that `find` finds in what is installed.
ExitCode EnterDomain(const std::string& verb,
                     const std::function<Entry(SecPolicy::TeskAccessInterfaceImpl&)>& find,
                     const EntryOptions& options);

}  // namespace SecPolicyCli
