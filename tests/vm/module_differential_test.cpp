// Policies with rules of all kinds by chance, held against the kernel: hunts for an act that works
// although the decision refuses it and no rule is told not to be expressible, and for one that
// fails although it is granted and no rule behind that is told to be narrowed.

#include <arpa/inet.h>
#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <map>
#include <random>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "host/enforce/module/module_calls.h"
#include "host/enforce/supervise/file_descriptor.h"
#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using Enforce::FileDescriptor;
using Policy::FileAccess;
using Policy::InstalledDomain;
using Policy::Question;
using Policy::Rule;
using Policy::RuleKind;
using Words = std::vector<std::string>;

const std::string kRoot = "/tmp/differential";
const Words kDirectories = {"t", "t/a", "t/a/b", "t/a/b/c", "t/d", "t/d/e"};
const Words kFiles = {"t/f",       "t/a/f",     "t/a/g", "t/a/b/f", "t/a/b/g",
                      "t/a/b/c/f", "t/a/b/c/g", "t/d/f", "t/d/g",   "t/d/e/f"};
const Enforce::LabelNumbers kLabels = {{"one", 400}, {"two", 401}, {"three", 402}};
const Words kLabelWords = {"one", "two", "three"};
const Words kFileKinds = {"regular", "directory", "symlink", "fifo", "char_device"};
const std::map<std::string, int> kSocketKinds = {
    {"stream", SOCK_STREAM}, {"dgram", SOCK_DGRAM}, {"seqpacket", SOCK_SEQPACKET}};
const std::map<std::string, Words> kCheckValues = {
    {"socket_family", {"1", "2", "10", "16"}},
    {"socket_type", {"1", "2", "5"}},
    {"bind_port", {"4321", "6514", "8080"}},
    {"connect_port", {"4321", "6514", "8080"}},
    {"ioctl_request", {"0x5412", "0x5450", "0x5451", "0x541b"}},
    {"prctl_option", {"3", "21", "27", "30", "39"}},
    {"clone_flags", {"0", "0x200", "0x400", "0x600", "0x40000"}},
    {"kill_signal", {"0", "17", "23", "28"}},
    {"set_uid", {"7", "1000", "1001"}},
    {"set_gid", {"7", "1000", "1001"}}};
const Words kSets = {"@start",   "@file",    "@clock",  "@memory",   "@io",
                     "@network", "@process", "@signal", "@identity", "@attributes"};
// How the library of C forks, without the signal.
constexpr const char* kForkFlags = "0x1200000";

// ---- What is tried

struct SomeCall {
  const char* name;
  long number;
  std::array<long, 4> arguments;
};

char buffer[512];
// Open before anybody comes into a domain.
int nothing = -1;

long Address(const void* what) { return reinterpret_cast<long>(what); }

// Which do nothing, and of which some come to no hook.
const std::vector<SomeCall>& Calls() {
  static const std::vector<SomeCall> calls = {
      {"close", SYS_close, {-1}},
      {"dup", SYS_dup, {-1}},
      {"epoll_create1", SYS_epoll_create1, {0}},
      {"eventfd2", SYS_eventfd2, {0, 0}},
      {"fchdir", SYS_fchdir, {-1}},
      {"fstat", SYS_fstat, {0, Address(buffer)}},
      {"fsync", SYS_fsync, {-1}},
      {"getcwd", SYS_getcwd, {Address(buffer), sizeof(buffer)}},
      {"getpgid", SYS_getpgid, {0}},
      {"inotify_init1", SYS_inotify_init1, {0}},
      {"listen", SYS_listen, {-1, 1}},
      {"lseek", SYS_lseek, {-1, 0, 0}},
      {"memfd_create", SYS_memfd_create, {Address(""), 0}},
      {"newfstatat", SYS_newfstatat, {AT_FDCWD, Address("/"), Address(buffer), 0}},
      {"pidfd_open", SYS_pidfd_open, {getpid(), 0}},
      {"pipe2", SYS_pipe2, {Address(buffer), 0}},
      {"stat", SYS_stat, {Address("/"), Address(buffer)}},
      {"statx", SYS_statx, {AT_FDCWD, Address("/"), 0, 0}},
      {"sysinfo", SYS_sysinfo, {Address(buffer)}},
      {"timerfd_create", SYS_timerfd_create, {0, 0}},
      {"times", SYS_times, {Address(buffer)}},
      {"uname", SYS_uname, {Address(buffer)}},
  };
  return calls;
}

constexpr std::array kMakingDescriptors = {SYS_epoll_create1, SYS_eventfd2,   SYS_inotify_init1,
                                           SYS_memfd_create,  SYS_pidfd_open, SYS_timerfd_create};

// A descriptor that it makes is closed again.
int DoCall(const SomeCall& call) {
  const auto& [first, second, third, fourth] = call.arguments;
  const long result = syscall(call.number, first, second, third, fourth, 0, 0);
  const int error = ErrorOf(result);
  if (call.number == SYS_pipe2 && error == 0) {
    int ends[2];
    memcpy(ends, buffer, sizeof(ends));
    close(ends[0]);
    close(ends[1]);
  } else if (error == 0 && std::ranges::count(kMakingDescriptors, call.number) > 0) {
    close(static_cast<int>(result));
  }
  return error;
}

int Descriptor(long result) {
  const FileDescriptor made(result);
  return made.IsOpen() ? 0 : errno;
}

int Open(const std::string& path, int flags) { return Descriptor(open(path.c_str(), flags)); }

// What lies there does nothing.
int Execute(const std::string& path) {
  const pid_t child = fork();
  if (child < 0) return errno;
  if (child == 0) {
    execl(path.c_str(), "true", nullptr);
    _exit(errno);
  }
  return ResultOf(child);
}

int Make(const std::string& path, const std::string& kind) {
  const char* const name = path.c_str();
  if (kind == "regular") return ErrorOf(mknod(name, S_IFREG | 0666, 0));
  if (kind == "directory") return ErrorOf(mkdir(name, 0777));
  if (kind == "symlink") return ErrorOf(symlink("target", name));
  if (kind == "fifo") return ErrorOf(mkfifo(name, 0666));
  return ErrorOf(mknod(name, S_IFCHR | 0666, 0x103));
}

int MakeSocket(const std::string& path, int type) {
  const FileDescriptor made(socket(AF_UNIX, type, 0));
  if (!made.IsOpen()) return errno;
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  memcpy(address.sun_path, path.data(), path.size());
  return ErrorOf(bind(made.Number(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)));
}

int UsePort(int port, bool binds) {
  const FileDescriptor made(socket(AF_INET, SOCK_STREAM, 0));
  if (!made.IsOpen()) return errno;
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const auto* const where = reinterpret_cast<const sockaddr*>(&address);
  return ErrorOf(binds ? bind(made.Number(), where, sizeof(address))
                       : connect(made.Number(), where, sizeof(address)));
}

int Clone(long flags) {
  const long child = syscall(SYS_clone, flags | SIGCHLD, 0, 0, 0, 0);
  if (child == 0) _exit(0);
  return child < 0 ? errno : ResultOf(static_cast<pid_t>(child));
}

int Pass(const std::string& check, int value) {
  if (check == "socket_family") return Descriptor(socket(value, SOCK_DGRAM, 0));
  if (check == "socket_type") return Descriptor(socket(AF_UNIX, value, 0));
  if (check == "bind_port") return UsePort(value, true);
  if (check == "connect_port") return UsePort(value, false);
  if (check == "ioctl_request") {
    int argument = 0;
    return ErrorOf(ioctl(nothing, static_cast<unsigned long>(value), &argument));
  }
  if (check == "prctl_option") return ErrorOf(prctl(value, 0, 0, 0, 0));
  if (check == "clone_flags") return Clone(value);
  if (check == "kill_signal") return ErrorOf(kill(getpid(), value));
  const auto number = static_cast<unsigned int>(value);
  if (check == "set_uid") return ErrorOf(syscall(SYS_setresuid, -1, -1, number));
  return ErrorOf(syscall(SYS_setresgid, -1, -1, number));
}

struct UsedCapability {
  const char* name;
  const char* call;
  int (*use)();
};

constexpr UsedCapability kCapabilities[] = {
    {"cap_sys_chroot", "chroot", ChangeRoot},
    {"cap_sys_admin", "sethostname", [] { return ErrorOf(sethostname("host", 4)); }},
    {"cap_setgid", "setgroups", [] { return ErrorOf(setgroups(0, nullptr)); }},
    {"cap_sys_nice", "setpriority", [] { return ErrorOf(syscall(SYS_setpriority, 0, 0, -1)); }},
    {"cap_chown", "chown",
     [] { return ErrorOf(syscall(SYS_chown, "/tmp/differential/t/f", 7, -1)); }},
};

// ---- What has to be granted for it

// As the command looks for it: the file's own, else that of the nearest directory above it.
std::string LabelOf(const std::string& path) {
  for (fs::path at = path;; at = at.parent_path()) {
    std::uint32_t number = 0;
    if (lgetxattr(at.c_str(), "security.bpf.zorvan", &number, sizeof(number)) == sizeof(number)) {
      const auto found =
          std::ranges::find(kLabels, number, [](const auto& one) { return one.second; });
      return found == kLabels.end() ? std::string() : found->first;
    }
    if (at == at.root_path()) return {};
  }
}

Question MayUse(FileAccess access, const std::string& path) {
  return Policy::FileQuestion{access, path, LabelOf(path), false};
}

Question MayMake(RuleKind kind, const std::string& what, const std::string& path) {
  return Policy::CreationQuestion{kind, what, path, LabelOf(fs::path(path).parent_path()), false};
}

Question MayCall(const std::string& call) {
  return Policy::WordsQuestion{RuleKind::kSyscall, {call}};
}

Question MayUse(const std::string& capability) {
  return Policy::WordsQuestion{RuleKind::kCapability, {capability}};
}

Question Passes(const std::string& check, const std::string& value) {
  return Policy::ParameterQuestion{check, value};
}

struct Try {
  std::string what;
  std::vector<Question> questions;
  Act act;
};

class Chance {
 public:
  explicit Chance(unsigned int seed) : engine(seed) {}

  std::size_t Below(std::size_t number) { return engine() % number; }
  bool IsLikely(std::size_t percent) { return Below(100) < percent; }
  const std::string& One(const Words& words) { return words[Below(words.size())]; }
  template <class Map>
  const std::string& OneKey(const Map& map) {
    return std::next(map.begin(), static_cast<std::ptrdiff_t>(Below(map.size())))->first;
  }

 private:
  std::mt19937 engine;
};

std::string Verdict(Chance& chance) { return chance.IsLikely(75) ? " grant" : " revoke"; }

std::string SomePlace(Chance& chance) {
  switch (chance.Below(4)) {
    case 0:
      return kRoot + "/" + chance.One(kDirectories) + "/new";
    case 1:
      return kRoot + "/" + chance.One(kFiles);
    default:
      return kRoot + "/" + chance.One(kDirectories);
  }
}

std::string SomeRule(Chance& chance) {
  constexpr std::string_view kKinds = "rrraaafffuucppppsss";
  switch (kKinds[chance.Below(kKinds.size())]) {
    case 'r':
      return "-r " + SomePlace(chance) + " " +
             chance.One({"", "r", "rw", "rx", "rwx", "w", "rw", "x"});
    case 'a':
      return "-a " + chance.One(kLabelWords) + " " +
             chance.One({"read", "write", "execute", "list", "remove", "truncate"}) +
             Verdict(chance);
    case 'f':
      return "-f " + chance.One(kLabelWords) + " " + chance.One(kLabelWords) + " " +
             chance.One(kFileKinds) + Verdict(chance);
    case 'u':
      return "-u " + chance.One(kLabelWords) + " " + chance.OneKey(kSocketKinds) + Verdict(chance);
    case 'c':
      return std::string("-c ") + kCapabilities[chance.Below(std::size(kCapabilities))].name +
             Verdict(chance);
    case 's': {
      if (chance.IsLikely(50)) return "-s " + chance.One(kSets) + Verdict(chance);
      return std::string("-s ") + Calls()[chance.Below(Calls().size())].name + Verdict(chance);
    }
  }
  const std::string& check = chance.OneKey(kCheckValues);
  return "-p " + check + " " + chance.One(kCheckValues.at(check)) + Verdict(chance);
}

// Of what has more than one rule the first one stays.
Words SomeRules(Chance& chance) {
  Words rules;
  for (const std::string& set : kSets)
    if (chance.IsLikely(60)) rules.push_back("-s " + set + " grant");
  if (chance.IsLikely(60)) rules.emplace_back("-s mknodat grant");
  if (chance.IsLikely(40)) rules.emplace_back("-c cap_mknod grant");
  for (std::size_t count = 3 + chance.Below(14); count > 0; --count)
    rules.push_back(SomeRule(chance));
  Words kept;
  std::set<std::string> subjects;
  for (const std::string& rule : rules) {
    if (subjects.insert(rule.substr(0, rule.rfind(' '))).second) kept.push_back(rule);
  }
  return kept;
}

Try TryFile(Chance& chance) {
  const std::string path = kRoot + "/" + chance.One(kFiles);
  switch (chance.Below(5)) {
    case 0:
      return {"read " + path, {MayUse(FileAccess::kRead, path), MayCall("openat")}, [path] {
                return Open(path, O_RDONLY);
              }};
    case 1:
      return {"write " + path, {MayUse(FileAccess::kWrite, path), MayCall("openat")}, [path] {
                return Open(path, O_WRONLY);
              }};
    case 2:
      return {
          "empty " + path,
          {MayUse(FileAccess::kRead, path), MayUse(FileAccess::kTruncate, path), MayCall("openat")},
          [path] { return Open(path, O_RDONLY | O_TRUNC); }};
    case 3:
      return {"truncate " + path,
              {MayUse(FileAccess::kTruncate, path), MayCall("truncate")},
              [path] { return ErrorOf(truncate(path.c_str(), 0)); }};
    default:
      return {"execute " + path,
              {MayUse(FileAccess::kExecute, path), MayCall("execve"), MayCall("clone"),
               Passes("clone_flags", kForkFlags)},
              [path] { return Execute(path); }};
  }
}

Try TryMaking(Chance& chance, bool isRoot) {
  const std::string path =
      kRoot + "/" + chance.One(kDirectories) + "/" + chance.One({"new", "newer"});
  if (chance.IsLikely(30)) {
    const auto& [kind, type] = *kSocketKinds.find(chance.OneKey(kSocketKinds));
    return {"make " + kind + " " + path,
            {MayMake(RuleKind::kUnixSocketCreation, kind, path), MayCall("socket"), MayCall("bind"),
             Passes("socket_family", "1"), Passes("socket_type", std::to_string(type))},
            [path, type = type] { return MakeSocket(path, type); }};
  }
  std::string kind = chance.One(kFileKinds);
  if (!isRoot && kind == "char_device") kind = "fifo";
  const char* const call = kind == "directory" ? "mkdir"
                           : kind == "symlink" ? "symlink"
                                               : "mknodat";
  std::vector<Question> questions = {MayMake(RuleKind::kFileCreation, kind, path), MayCall(call)};
  if (kind == "char_device") questions.push_back(MayUse("cap_mknod"));
  return {"make " + kind + " " + path, questions, [path, kind] { return Make(path, kind); }};
}

Try TryValue(Chance& chance, bool isRoot) {
  const std::string& check = chance.OneKey(kCheckValues);
  const std::string& value = chance.One(kCheckValues.at(check));
  std::vector<Question> questions = {Passes(check, value)};
  const auto also = [&questions](std::initializer_list<Question> more) {
    questions.insert(questions.end(), more);
  };
  if (check == "socket_family") also({MayCall("socket"), Passes("socket_type", "2")});
  if (check == "socket_type") also({MayCall("socket"), Passes("socket_family", "1")});
  if (check.ends_with("_port"))
    also({MayCall("socket"), Passes("socket_family", "2"), Passes("socket_type", "1"),
          MayCall(check == "bind_port" ? "bind" : "connect")});
  if (check == "ioctl_request") also({MayCall("ioctl")});
  if (check == "prctl_option") also({MayCall("prctl")});
  if (check == "clone_flags") also({MayCall("clone")});
  if (check == "kill_signal") also({MayCall("kill")});
  if (check.starts_with("set_")) {
    // Nobody else could do it.
    if (!isRoot) return TryValue(chance, isRoot);
    also({MayCall(check == "set_uid" ? "setresuid" : "setresgid"),
          MayUse(check == "set_uid" ? "cap_setuid" : "cap_setgid")});
  }
  const auto number = static_cast<int>(std::stol(value, nullptr, 0));
  return {"pass " + check + " " + value, questions,
          [check, number] { return Pass(check, number); }};
}

Try SomeTry(Chance& chance, bool isRoot) {
  switch (chance.Below(10)) {
    case 0:
    case 1:
    case 2:
      return TryFile(chance);
    case 3: {
      const std::string path = kRoot + "/" + chance.One(kDirectories);
      return {"list " + path, {MayUse(FileAccess::kList, path), MayCall("openat")}, [path] {
                return Open(path, O_RDONLY | O_DIRECTORY);
              }};
    }
    case 4:
    case 5:
      return TryMaking(chance, isRoot);
    case 6: {
      const SomeCall& call = Calls()[chance.Below(Calls().size())];
      return {
          std::string("call ") + call.name, {MayCall(call.name)}, [&call] { return DoCall(call); }};
    }
    case 7:
      if (isRoot) {
        const auto& [name, call, use] = kCapabilities[chance.Below(std::size(kCapabilities))];
        return {std::string("use ") + name, {MayUse(name), MayCall(call)}, use};
      }
      [[fallthrough]];
    default:
      return TryValue(chance, isRoot);
  }
}

// ---- What is told of rules

// What the decision says of one domain, and what is told of its rules.
class Oracle {
 public:
  explicit Oracle(const InstalledDomain& asked)
      : domain(asked), hasGaps(!Enforce::GapsByModule(asked).empty()) {
    for (const Enforce::RuleFate& fate : Enforce::FatesByModule(domain, CAP_LAST_CAP)) {
      if (fate.fate != Enforce::Fate::kEnforced) told.insert(fate.rule.Text());
      if (fate.fate == Enforce::Fate::kNotExpressible) surrendered.insert(fate.rule.Text());
    }
  }

  bool Grants(const Try& some) const {
    return std::ranges::all_of(some.questions, [this](const Question& question) {
      return Decide(question, domain).IsAllowed();
    });
  }

  // That it fails although it is granted.
  bool IsToldToFail(const Try& some) const {
    return std::ranges::any_of(some.questions, [this](const Question& question) {
      return IsVotedByOneOf(told, question);
    });
  }

  // That it works although it is refused.
  bool IsToldToWork(const Try& some) const {
    return std::ranges::all_of(some.questions, [this](const Question& question) {
      return Decide(question, domain).IsAllowed() || IsVotedByOneOf(surrendered, question) ||
             IsGap(question);
    });
  }

 private:
  bool IsVotedByOneOf(const std::set<std::string>& rules, const Question& question) const {
    return std::ranges::any_of(Decide(question, domain).votes, [&rules](const Policy::Vote& vote) {
      return rules.contains(vote.rule.Text());
    });
  }

  // A call that no rule is about and that comes to no hook.
  bool IsGap(const Question& question) const {
    const auto* const words = std::get_if<Policy::WordsQuestion>(&question);
    if (!hasGaps || words == nullptr || words->kind != RuleKind::kSyscall) return false;
    const auto atHooks = Enforce::CallsAtHooks();
    return Decide(question, domain).votes.empty() &&
           !std::ranges::binary_search(atHooks, std::string_view(words->words[0]));
  }

  const InstalledDomain& domain;
  const bool hasGaps;
  std::set<std::string> told;
  std::set<std::string> surrendered;
};

struct Tally {
  int granted = 0;
  int refused = 0;
  int narrowed = 0;
  int surrendered = 0;
};

class ModuleDifferential : public ModuleTest {
 protected:
  static constexpr unsigned int kFirst = 40;
  static constexpr unsigned int kDomains = 8;
  static constexpr int kTries = 60;
  static constexpr unsigned int kRounds = 4;

  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->LearnLabels();
    if (nothing < 0) nothing = open("/dev/null", O_RDONLY | O_CLOEXEC);
  }

  void LayOut(Chance& chance) {
    module->Publish({}, 1);
    umask(0);
    fs::remove_all(kRoot);
    for (const std::string& directory : kDirectories)
      fs::create_directories(kRoot + "/" + directory);
    for (const std::string& file : kFiles) Restore(file);
    for (int count = 0; count < 6; ++count) {
      const std::string& place = chance.One(chance.IsLikely(50) ? kDirectories : kFiles);
      const std::uint32_t number = kLabels.at(chance.One(kLabelWords));
      ASSERT_EQ(setxattr((kRoot + "/" + place).c_str(), "security.bpf.zorvan", &number,
                         sizeof(number), 0),
                0);
    }
  }

  // In place, so that it keeps its label.
  static void Restore(const std::string& file) {
    const std::string path = kRoot + "/" + file;
    const FileDescriptor made(open(path.c_str(), O_CREAT | O_WRONLY | O_TRUNC, 0777));
    const FileDescriptor program(open(ProgramOfNothing().c_str(), O_RDONLY));
    std::array<char, 1 << 16> bytes = {};
    for (ssize_t size = 0; (size = read(program.Number(), bytes.data(), bytes.size())) > 0;)
      ASSERT_EQ(write(made.Number(), bytes.data(), static_cast<std::size_t>(size)), size);
  }

  // It ends with 7.
  static std::string ProgramOfNothing() {
    return fs::read_symlink("/proc/self/exe").parent_path() / "domain_well";
  }

  static void RemoveMade() {
    for (const std::string& directory : kDirectories) {
      for (const char* const name : {"/new", "/newer"}) {
        std::error_code ignored;
        fs::remove(kRoot + "/" + directory + name, ignored);
      }
    }
  }

  static std::vector<InstalledDomain> SomeDomains(Chance& chance) {
    std::vector<InstalledDomain> domains;
    for (unsigned int number = 0; number < kDomains; ++number) {
      domains.push_back(DomainOf(SomeRules(chance)));
      domains.back().id = kFirst + number;
    }
    return domains;
  }

  void Judge(const Try& some, const Oracle& oracle, int error, const std::string& where) {
    const bool works = error != EPERM && error != EACCES;
    const bool isGranted = oracle.Grants(some);
    if (works && isGranted) {
      ++tally.granted;
    } else if (works) {
      ++tally.surrendered;
      EXPECT_TRUE(oracle.IsToldToWork(some)) << where << ": works, and is refused: " << some.what;
    } else if (isGranted) {
      ++tally.narrowed;
      EXPECT_TRUE(oracle.IsToldToFail(some))
          << where << ": fails with " << error << ", and is granted: " << some.what;
    } else {
      ++tally.refused;
    }
  }

  void TryIn(const InstalledDomain& domain, Chance& chance, bool isRoot, const std::string& where) {
    const Oracle oracle(domain);
    std::vector<Try> tries;
    for (int count = 0; count < kTries; ++count) tries.push_back(SomeTry(chance, isRoot));
    std::size_t next = 0;
    bool isReady = isRoot;
    const Worker worker([&] {
      if (!std::exchange(isReady, true)) return BecomeUser();
      return tries[next++].act();
    });
    if (!isRoot) {
      ASSERT_EQ(worker.Do(), 0);
    }
    module->Place(worker.Process(), domain.id);
    for (const Try& some : tries) {
      Judge(some, oracle, worker.Do(), where);
      RemoveMade();
    }
    for (const std::string& file : kFiles) Restore(file);
  }

  void TryAll(unsigned int firstSeed, bool isRoot) {
    for (unsigned int seed = firstSeed; seed < firstSeed + kRounds; ++seed) {
      Chance chance(seed);
      LayOut(chance);
      const std::vector<InstalledDomain> domains = SomeDomains(chance);
      module->Publish(PlanModule(domains, CAP_LAST_CAP, kLabels), 2);
      for (const InstalledDomain& domain : domains)
        TryIn(domain, chance, isRoot, "seed " + std::to_string(seed) + ", " + TextOf(domain));
    }
    printf("%d granted, %d refused, %d narrowed, %d surrendered\n", tally.granted, tally.refused,
           tally.narrowed, tally.surrendered);
    EXPECT_GT(tally.granted, 300);
    EXPECT_GT(tally.refused, 600);
  }

 private:
  static std::string TextOf(const InstalledDomain& domain) {
    std::string text = "domain " + std::to_string(domain.id) + ":\n";
    for (const Rule& rule : domain.rules) text += rule.Text() + "\n";
    return text;
  }

  Tally tally;
};

TEST_F(ModuleDifferential, RootMayWhatIsGranted) { TryAll(1, true); }

TEST_F(ModuleDifferential, AUserMayWhatIsGranted) { TryAll(1001, false); }

}  // namespace
}  // namespace EnforceTest
