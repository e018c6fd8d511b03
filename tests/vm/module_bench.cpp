// What the module costs: hunts for what became dear for everybody by what only some need. Made for
// a machine whose clock counts instructions, as one of scripts/vm-test --count: there a nanosecond
// is one, and figures are the same each time. Prints a table, and fails where a limit is passed.

#include <fcntl.h>
#include <linux/capability.h>
#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <exception>
#include <functional>
#include <iostream>
#include <string>
#include <vector>

#include "enforce/domain_of.h"
#include "host/enforce/module/module.h"

namespace {

using Enforce::Module;

constexpr const char* kListener = "/run/module_bench";
constexpr unsigned int kMeasured = 7;

void Require(bool isDone, const char* what) {
  if (isDone) return;
  perror(what);
  _exit(1);
}

double Now() {
  return std::chrono::duration<double, std::nano>(
             std::chrono::steady_clock::now().time_since_epoch())
      .count();
}

// ---- What is measured

void Open() { Require(close(open("/etc/passwd", O_RDONLY | O_CLOEXEC)) == 0, "open"); }

void Read() {
  static const int file = open("/etc/passwd", O_RDONLY | O_CLOEXEC);
  char byte = 0;
  Require(pread(file, &byte, 1, 0) == 1, "read");
}

void Stat() {
  struct stat status = {};
  Require(stat("/etc/passwd", &status) == 0, "stat");
}

void AwaitSuccess(pid_t child, const char* what) {
  int status = 0;
  Require(waitpid(child, &status, 0) == child && status == 0, what);
}

void Fork() {
  const pid_t child = fork();
  if (child == 0) _exit(0);
  AwaitSuccess(child, "fork");
}

void Execute() {
  const pid_t child = vfork();
  if (child == 0) {
    execl("/bin/busybox", "true", nullptr);
    _exit(1);
  }
  AwaitSuccess(child, "execute");
}

void Prctl() { Require(prctl(PR_GET_DUMPABLE) >= 0, "prctl"); }

void Connect() {
  const int made = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(2000);
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  Require(connect(made, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0, "connect");
  close(made);
}

sockaddr_un AddressOfListener() {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::copy_n(kListener, std::char_traits<char>::length(kListener), address.sun_path);
  return address;
}

void ConnectToPath() {
  const int made = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const sockaddr_un address = AddressOfListener();
  Require(connect(made, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0,
          "connect to a path");
  close(made);
}

struct Work {
  const char* name;
  double limit;         // of what it costs with the module beside without; 0: it is only told
  double limitByPaths;  // the same where rules are about paths
  int number;           // in one turn, which timers should rarely meet
  void (*once)();
};
constexpr std::array kWorks = {
    Work{"open and close a file", 1.10, 1.40, 100, Open},
    Work{"read a byte", 1.05, 1.05, 500, Read},
    Work{"look at a file's status", 1.10, 1.10, 100, Stat},
    Work{"fork", 1.10, 1.10, 3, Fork},
    Work{"execute a program", 1.05, 0, 3, Execute},
    Work{"connect a new socket", 1.15, 1.15, 100, Connect},
    Work{"the same, to a path", 1.15, 0, 100, ConnectToPath},
    Work{"prctl", 0, 0, 1000, Prctl},
};
using Costs = std::array<double, kWorks.size()>;

constexpr int kTurns = 25;

// Not the mean, as some turns are interrupted, and some meet what was put off before.
double CostOf(const Work& work) {
  std::array<double, kTurns> costs = {};
  work.once();
  for (double& cost : costs) {
    const double began = Now();
    for (int index = 0; index < work.number; ++index) work.once();
    cost = (Now() - began) / work.number;
  }
  std::ranges::nth_element(costs, costs.begin() + kTurns / 4);
  return costs[kTurns / 4];
}

Costs SmallerOf(const Costs& first, const Costs& second) {
  Costs smaller = {};
  std::ranges::transform(first, second, smaller.begin(),
                         [](double one, double other) { return std::min(one, other); });
  return smaller;
}

// Whom all connect to. Who is not taken out of its queue in time blocks others.
class Listener {
 public:
  Listener() {
    const sockaddr_un address = AddressOfListener();
    Require(bind(made, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0, "bind");
    Require(listen(made, 4096) == 0, "listen");
  }

  void TakeAll() const {
    while (true) {
      const int taken = accept(made, nullptr, nullptr);
      if (taken < 0) return;
      close(taken);
    }
  }

 private:
  int made = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
};

// A process that does all this when it is told. It is made while this program is small: to fork a
// big one takes longer.
class Measurer {
 public:
  Measurer() {
    Require(pipe(orders) == 0 && pipe(results) == 0, "pipe");
    process = fork();
    Require(process >= 0, "fork");
    if (process == 0) Serve();
  }

  pid_t Process() const { return process; }

  Costs Measure(const Listener& listener) const {
    Costs costs = {};
    Require(write(orders[1], "", 1) == 1, "write");
    Require(read(results[0], costs.data(), sizeof(costs)) == sizeof(costs), "measure");
    listener.TakeAll();
    return costs;
  }

 private:
  [[noreturn]] void Serve() const {
    char order = 0;
    close(orders[1]);
    if (read(orders[0], &order, 1) != 1) _exit(1);
    Costs costs = {};
    std::ranges::transform(kWorks, costs.begin(), CostOf);
    _exit(write(results[1], costs.data(), sizeof(costs)) == sizeof(costs) ? 0 : 1);
  }

  int orders[2] = {};
  int results[2] = {};
  pid_t process = -1;
};

// ---- Policies

const Enforce::LabelNumbers kLabels = [] {
  constexpr unsigned int kFirst = 1000;
  Enforce::LabelNumbers numbers;
  for (unsigned int number = kFirst; number < kFirst + 70; ++number)
    numbers["label" + std::to_string(number)] = number;
  return numbers;
}();

// As many of each kind of check as there is room for, and some about labels.
std::vector<std::string> ManyRules() {
  std::vector<std::string> rules;
  for (const char* const check :
       {"socket_family", "socket_type", "prctl_option", "ioctl_request"}) {
    for (int value = 0; value < Enforce::kMostModuleRanges; ++value)
      rules.push_back("-p " + std::string(check) + " " + std::to_string(2 * value) + " grant");
  }
  for (const auto& [label, number] : kLabels) rules.push_back("-a " + label + " read grant");
  return rules;
}

// The files of a file system are labelled as its root is.
void LabelFiles() {
  for (const char* const root : {"/", "/dev", "/run"}) {
    Require(setxattr(root, "security.bpf.zorvan", &kLabels.begin()->second, sizeof(unsigned int),
                     0) == 0,
            "label");
  }
}

// kMeasured has these rules, and all others many.
std::vector<Policy::InstalledDomain> DomainsWith(const std::vector<std::string>& rules) {
  std::vector<Policy::InstalledDomain> domains(Enforce::kModuleDomains,
                                               EnforceTest::DomainOf(ManyRules()));
  domains[kMeasured] = EnforceTest::DomainOf(rules);
  for (unsigned int id = 0; id < domains.size(); ++id) domains[id].id = id;
  return domains;
}

std::size_t NumberOfRules(const std::vector<Policy::InstalledDomain>& domains) {
  std::size_t number = 0;
  for (const Policy::InstalledDomain& domain : domains) number += domain.rules.size();
  return number;
}

// What the measured works take, and a little that they do not.
const std::vector<std::string> kRules = {
    "-c cap_chown grant",
    "-p socket_family 1 2 grant",
    "-p socket_family 10 grant",
    "-p socket_type 1 2 grant",
    "-p prctl_option 3 4 grant",
    "-p prctl_option 15 16 grant",
    "-a label1000 read grant",
    "-a label1000 execute grant",
    "-a label1000 write grant",
    "-s @start grant",
    "-s @file grant",
    "-s @io grant",
    "-s @network grant",
    "-s @process grant",
    "-s @attributes grant",
};

// Some of them beneath the directory of what is opened.
std::vector<std::string> RulesByPaths() {
  std::vector<std::string> rules = kRules;
  for (const char* const rule :
       {"-r / r", "-r /usr rx", "-r /bin rx", "-r /run rw", "-r /etc/ssl r"})
    rules.push_back(rule);
  return rules;
}

// ---- The table

struct Column {
  std::string name;
  Costs costs;
  double Work::*limit = &Work::limit;
};

bool ShowRow(std::size_t row, const Costs& without, const std::vector<Column>& columns) {
  const Work& work = kWorks[row];
  bool isKept = true;
  printf("| %s | %.0f |", work.name, without[row]);
  for (const auto& [name, costs, limit] : columns) {
    const double ratio = costs[row] / without[row];
    const bool isExceeded = work.*limit != 0 && ratio > work.*limit;
    printf(isExceeded ? " **%.3f** |" : " %.3f |", ratio);
    isKept = isKept && !isExceeded;
  }
  printf(work.limit != 0 ? " %.2f |\n" : " |\n", work.limit);
  return isKept;
}

bool ShowTable(const Costs& without, const std::vector<Column>& columns) {
  std::string line = "|---|---|";
  printf("| | without |");
  for (const Column& column : columns) {
    printf(" %s |", column.name.c_str());
    line += "---|";
  }
  printf(" limit |\n%s---|\n", line.c_str());
  bool isKept = true;
  for (std::size_t row = 0; row < kWorks.size(); ++row)
    isKept = ShowRow(row, without, columns) && isKept;
  return isKept;
}

bool ShowCost(const char* name, double cost, double limit) {
  printf("%s: %.0f, limit %.0f%s\n", name, cost, limit, cost > limit ? ": exceeded" : "");
  return cost <= limit;
}

double CostOfOnce(const std::function<void()>& work) {
  const double began = Now();
  work();
  return Now() - began;
}

// The kernel takes its time for what ended.
void Stop() {
  Module::Stop();
  sleep(5);
}

// Of what else is done at the start of a machine the kernel would wait for some.
double CostOfStart() {
  sleep(5);
  const double cost = CostOfOnce([] { Module::Start(); });
  Stop();
  return cost;
}

bool Bench() {
  const Listener listener;
  const Measurer before;
  const Measurer outside;
  const Measurer disabled;
  const Measurer enforced;
  const Measurer enforcedByPaths;
  const Measurer after;
  // What a stopped module leaves behind would count as if it were the kernel's own.
  const Costs first = before.Measure(listener);
  const double start = CostOfStart();

  Module module = Module::Start();
  LabelFiles();
  module.LearnLabels();
  const std::vector<Policy::InstalledDomain> domains = DomainsWith(kRules);
  const Enforce::ModulePlan plan = Enforce::PlanModule(domains, CAP_LAST_CAP, kLabels);
  const double publication = CostOfOnce([&module, &plan] { module.Publish(plan, 1); });

  std::vector<Column> columns;
  columns.push_back({"in no domain", outside.Measure(listener)});
  module.Place(disabled.Process(), kMeasured);
  module.SetLevel(kMeasured, Policy::Level::kDisabled);
  columns.push_back({"disabled", disabled.Measure(listener)});
  module.Place(enforced.Process(), kMeasured);
  module.SetLevel(kMeasured, Policy::Level::kEnforcing);
  columns.push_back({"enforcing", enforced.Measure(listener)});
  module.Publish(Enforce::PlanModule(DomainsWith(RulesByPaths()), CAP_LAST_CAP, kLabels), 2);
  module.Place(enforcedByPaths.Process(), kMeasured);
  columns.push_back({"by paths", enforcedByPaths.Measure(listener), &Work::limitByPaths});
  Stop();
  // A machine gets quicker for a while.
  const bool isCheap = ShowTable(SmallerOf(first, after.Measure(listener)), columns);
  const std::size_t rules = NumberOfRules(domains);
  printf("%zu domains with %zu rules\n", domains.size(), rules);
  const bool isStartedSoon = ShowCost("to start it", start, 2e9);
  return ShowCost("to publish a rule", publication / static_cast<double>(rules), 1500) &&
         isStartedSoon && isCheap;
}

}  // namespace

int main() {
  try {
    return Bench() ? 0 : 1;
  } catch (const std::exception& exception) {
    std::cerr << "module_bench: " << exception.what() << "\n";
    return 1;
  }
}
