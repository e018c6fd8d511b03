#pragma once

#include <string>
#include <vector>

namespace SecPolicyCli {

// Makes `directory` the root directory of this process, for good: every path that the library and
// the host use is looked up below it. An ordinary user enters it inside a user namespace of its
// own. Throws Braxo::Lib::BraxoException when that cannot be done.
void EnterRoot(const std::string& directory);

// How this command is called with `words`, each as ShellWord has it, for the root that was entered,
// in quotes:
// "'secpolicy --root DIR boot'".
std::string Call(const std::string& words);

// The path by which a file below the root that was entered is known to whom the command is for.
std::string OutsidePath(const std::string& path);

// What lies below the root that was entered where `path`, as it is known outside, leads there;
// empty when nothing does.
std::string PathBelowRoot(const std::string& path);

// The absolute paths by which the root that was entered is known outside: as it was given, and
// without links. None while none was entered.
const std::vector<std::string>& PlacesOfRoot();

// What to try after a failure that the rights of the user can explain; nothing for root, and for
// who has entered a root of its own.
std::string AdviseOnPrivilege();

// The same where all that can be said is that the root which was entered is another user's.
std::string AdviseOnForeignRoot();

// The message of a failure with what AdviseOnPrivilege() says behind it.
std::string WithAdvice(const std::string& failure);

}  // namespace SecPolicyCli
