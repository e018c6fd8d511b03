// What a domain costs: makes plans for the launcher, and is itself the program that runs in one.
//
//   enforce_bench plan FILE DIRECTORY RULES writes|masks|reads|named
//                                                           a plan with so many rules about paths
//                                                           that may be written, also one that
//                                                           hides eight of them; or be read, as
//                                                           all may, or only what a program needs
//                                                           and what is beside DIRECTORY
//   enforce_bench compile COUNT DIRECTORY RULES             makes such a plan so often, and prints
//   the
//                                                           processor time of one in microseconds
//   enforce_bench open COUNT FILE                           opens and closes the file so often
//   enforce_bench landlock COUNT FILE DIRECTORY             the same where Landlock lets all in the
//                                                           directory be read, is not asked about
//                                                           truncation, and nothing else is set up
//   enforce_bench call COUNT                                makes the cheapest system call so often

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/compile.h"
#include "host/enforce/kernel.h"
#include "host/enforce/plan_file.h"
#include "host/enforce/real_file_tree.h"

namespace {

namespace fs = std::filesystem;
namespace Kernel = Enforce::Kernel;
namespace Landlock = Enforce::Landlock;
using Enforce::LabelledPath;
using Policy::Rule;
using Policy::RuleKind;

[[noreturn]] void Fail(const char* what) {
  std::perror(what);
  std::exit(1);
}

Rule Granting(RuleKind kind, const char* word) {
  return {.kind = kind, .words = {word}, .verdict = true};
}

Rule Path(const std::string& path, const char* letters) {
  return {
      .kind = RuleKind::kFilePath, .words = {path}, .verdict = Policy::Permissions::Parse(letters)};
}

void GrantReading(const fs::path& directory, std::string_view kind, std::vector<Rule>* rules) {
  if (kind != "named") return rules->push_back(Path("/", "rx"));
  for (const char* const place : {"/usr", "/etc"}) rules->push_back(Path(place, "rx"));
  rules->push_back(Path(fs::read_symlink("/proc/self/exe").parent_path(), "rx"));
  rules->push_back(Path(directory.parent_path(), "rx"));
}

// The directories that rules are about are made where they are missing.
Policy::InstalledDomain DomainWith(const fs::path& directory, int rules, std::string_view kind) {
  const bool writes = kind == "writes" || kind == "masks";
  Policy::InstalledDomain domain;
  domain.name = "benchDom";
  for (const char* set : {"@start", "@file", "@io", "@network", "@process", "@signal"}) {
    domain.rules.push_back(Granting(RuleKind::kSyscall, set));
  }
  domain.rules.push_back(Granting(RuleKind::kCapability, "cap_kill"));
  for (int port = 0; port < 32; ++port) {
    Rule rule = Granting(RuleKind::kParameterCheck, "bind_port");
    rule.words[1] = std::to_string(8000 + port);
    domain.rules.push_back(std::move(rule));
  }
  GrantReading(directory, kind, &domain.rules);
  for (int number = 0; number < rules; ++number) {
    const fs::path path = directory / std::to_string(number);
    fs::create_directories(path);
    domain.rules.push_back(Path(path, writes ? "rwx" : "rx"));
  }
  return domain;
}

Enforce::CompiledPlan Compile(const Policy::InstalledDomain& domain,
                              const std::vector<LabelledPath>& places) {
  const Enforce::Features features = Enforce::ProbeFeatures();
  Enforce::RealFileTree files;
  return Enforce::Compile(domain, {.features = features, .places = places, .files = files});
}

void WritePlan(const char* file, const fs::path& directory, int rules, std::string_view kind) {
  constexpr std::size_t kMasks = 8;
  Enforce::Plan plan = Compile(DomainWith(directory, rules, kind), {}).plan;
  for (const Enforce::PathRight& right : plan.paths) {
    const bool isMasked = kind == "masks" && plan.masks.size() < kMasks;
    if (isMasked && right.path.starts_with(directory.native())) {
      plan.masks.push_back({right.path, Enforce::MaskKind::kHidden});
    }
  }
  std::ofstream(file, std::ios::binary) << Enforce::Serialize(plan);
  fs::permissions(file, fs::perms(0644));
}

double ProcessorMicroseconds() {
  timespec time{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) * 1e6 + static_cast<double>(time.tv_nsec) / 1e3;
}

void TimeCompile(int count, const fs::path& directory, int rules) {
  const Policy::InstalledDomain domain = DomainWith(directory, rules, "reads");
  const std::vector<LabelledPath> places = {{"/", "label"}};
  Compile(domain, places);
  const double begin = ProcessorMicroseconds();
  for (int turn = 0; turn < count; ++turn) Compile(domain, places);
  std::printf("%.1f\n", (ProcessorMicroseconds() - begin) / count);
}

void OpenOften(int count, const char* path) {
  for (int turn = 0; turn < count; ++turn) {
    const int file = open(path, O_RDONLY | O_CLOEXEC);
    if (file < 0) Fail(path);
    close(file);
  }
}

// What a domain that reads cannot do without: one rule, at which the kernel ends its way up.
void RestrictToReading(const char* directory) {
  const std::uint64_t handled =
      Landlock::AllRights(Kernel::LandlockVersion()) & ~Landlock::kTruncate;
  const int ruleset = Kernel::CreateRuleset({.handledFiles = handled});
  const int place = Kernel::OpenPlace(directory);
  if (ruleset < 0 || place < 0 || prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
      Kernel::AddPath(ruleset, place, Landlock::kReadFile | Landlock::kReadDir) != 0 ||
      Kernel::RestrictSelf(ruleset) != 0) {
    Fail("landlock");
  }
  close(place);
  close(ruleset);
}

void CallOften(int count) {
  for (int turn = 0; turn < count; ++turn) syscall(SYS_getppid);
}

}  // namespace

int main(int count, char** words) {
  const std::string_view verb = count > 1 ? words[1] : "";
  if (verb == "plan" && count == 6) {
    WritePlan(words[2], words[3], std::atoi(words[4]), words[5]);
  } else if (verb == "compile" && count == 5) {
    TimeCompile(std::atoi(words[2]), words[3], std::atoi(words[4]));
  } else if (verb == "open" && count == 4) {
    OpenOften(std::atoi(words[2]), words[3]);
  } else if (verb == "landlock" && count == 5) {
    RestrictToReading(words[4]);
    OpenOften(std::atoi(words[2]), words[3]);
  } else if (verb == "call" && count == 3) {
    CallOften(std::atoi(words[2]));
  } else {
    std::fprintf(stderr, "enforce_bench: the head of its source says how it is used\n");
    return 2;
  }
  return 0;
}
