#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/enforce/module/map_entries.h"
#include "host/enforce/module/module_maps.h"
#include "host/enforce/module/module_plan.h"
#include "host/enforce/module/tardisk_file.h"
#include "policy/level.h"

namespace Enforce {

// A word of the kernel's command line, with which nothing is started.
inline constexpr const char* kModuleOff = "secpolicy.module=off";

// A mounted file system whose files have labels that the module cannot tell, so that it grants
// nothing by them.
struct UnlabelledMount {
  std::string place;
  std::string type;  // "btrfs"
  std::string why;

  bool operator==(const UnlabelledMount&) const = default;
};

// The module: programs that the kernel runs for every process, and what they have been told. They
// stay until they are stopped or the machine is, whether anybody has this object or not. Everything
// throws Braxo::Lib::BraxoException, and takes CAP_SYS_ADMIN or CAP_BPF, outside of all domains.
// Those that publish or set a level at once do so one after the other.
class Module {
 public:
  // Loads and starts the programs, which refuse nothing until something is published. Nothing is
  // left of it when it throws, as it does where programs would not be run, where the kernel is
  // locked down so far that it takes none, and where kModuleOff says so.
  static Module Start();

  // The one that runs; nothing where none does.
  static std::optional<Module> FindRunning();

  // Ends it: from here on nothing is refused, and who was in a domain is in none. The labels of new
  // files are written first, as by WriteLabels(). Does nothing where none runs.
  static void Stop();

  Module(Module&&) noexcept;
  Module& operator=(Module&&) noexcept;
  ~Module();

  // Tells it the rules and levels of all domains; those that are not in the plan refuse everything.
  // The rules and the level of one domain change at once. At the end `generation` is kept: who
  // finds another one than that of the plan knows that this was not completed, and publishes anew.
  void Publish(const ModulePlan& plan, std::uint64_t generation);
  std::uint64_t Generation() const;

  // Tells it all the files that lead to domains by the labels of their tardisks, in place of those
  // that it was told before. There is room for kMostTardiskFiles.
  void TellTardiskFiles(const TardiskFiles& files);

  // Tries anew whether the kernel runs the programs: a process that may nothing has to be refused.
  bool IsRefusing() const;

  // Counts at once for all processes of the domain, whose rules stay.
  void SetLevel(unsigned int domain, Policy::Level level);

  // Puts a process into a domain, with all its threads. Children that it has stay where they are.
  void Place(pid_t process, unsigned int domain);

  // The descriptor of the map by which a process with one thread goes into a domain with the next
  // program that it executes, see EnterWithNextProgram() of kernel.h; for as long as this object
  // lives.
  int EnteringMap() const;

  // The domain that the process is in; nothing when it is in none.
  std::optional<unsigned int> DomainOf(pid_t process) const;

  // Lets it learn the labels of all files of the file systems that are mounted in this mount
  // namespace and were not learned yet, by reading them. Until then it knows the label of no file,
  // and so of those that are mounted later. Returns those of which it cannot learn them.
  std::vector<UnlabelledMount> LearnLabels();

  // Writes the labels of new files, which -f rules have given them in the kernel alone, to the
  // files themselves. Takes CAP_SYS_ADMIN and CAP_DAC_READ_SEARCH. Returns of how many this could
  // not be done, as of those in a file system that lies in memory.
  std::size_t WriteLabels();

  // How much was refused in a domain, or passed in a permissive one, since the module was started.
  ModuleRefusals RefusalsIn(unsigned int domain) const;

 private:
  explicit Module(std::unique_ptr<ModuleMaps> those);

  std::unique_ptr<ModuleMaps> maps;
};

}  // namespace Enforce
