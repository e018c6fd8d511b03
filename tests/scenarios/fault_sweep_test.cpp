// Every host call of an entry point fails in turn. That the interface object and everything else is
// gone afterwards is checked by the scripted host at the end of each run.

#include <algorithm>
#include <filesystem>
#include <functional>

#include "scenarios/good_host.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

using Strings = std::vector<std::string>;

const BraxoException kSwept("swept");
constexpr char kSweptThrown[] = "throws Braxo::Lib::BraxoException: swept\n";

struct EntryPoint {
  std::string name;
  std::function<void(ScriptedHost&)> prepare;
  std::function<void()> run;

  friend void PrintTo(const EntryPoint& entry, std::ostream* out) { *out << entry.name; }
};

// A run without a fault.
struct CleanRun {
  Strings trace;
  std::vector<std::size_t> calls;  // the places in the trace of the calls that may throw
};

class FaultSweep : public FixedRootsTest {
 protected:
  static CleanRun RunCleanly(const EntryPoint& entry) {
    ScriptedHost host;
    entry.prepare(host);
    const std::size_t before = host.FallibleCalls().size();
    const std::size_t start = host.trace.Lines().size();
    CleanRun clean;
    clean.trace = Record(entry.run).trace;
    for (std::size_t call = before; call < host.FallibleCalls().size(); ++call) {
      clean.calls.push_back(host.FallibleCalls()[call] - start);
    }
    EXPECT_FALSE(clean.calls.empty());
    return clean;
  }

  // Runs `entry` with its `number`-th call failing, from 0.
  template <class Exception>
  static Transcript RunWithFault(const EntryPoint& entry, std::size_t number,
                                 const Exception& exception) {
    ScriptedHost host;
    entry.prepare(host);
    host.FailCall(host.FallibleCalls().size() + number + 1, exception);
    return Record(entry.run);
  }

  // The text of the clean run up to the call at `place`, which is the one that fails.
  static std::string UpTo(const CleanRun& clean, std::size_t place) {
    std::string text;
    for (std::size_t line = 0; line <= place; ++line) text += clean.trace[line] + "\n";
    return text;
  }

  static std::string Disconnected(std::size_t place) { return place == 0 ? "" : kDone; }
};

void OnlyOneTardisk() { std::filesystem::remove("/tardisks/extra.tgz"); }

void PrepareFirst(ScriptedHost& host) { ScriptGoodHost(host); }

void PrepareNext(ScriptedHost& host) {
  ScriptGoodHost(host);
  LoadOnce(host);
}

void PrepareRestore(ScriptedHost& host) {
  host.DeclareWellKnownDomains();
  for (const char* name : {"hostDom", "ioFilterDom", "daemonFrameworkDom"}) {
    host.storedObjects[{"domain_settings", "security", "orin", name}] = {
        {"enforcement_level", "Enforcing"}};
  }
}

const EntryPoint kFirst = {"FirstLoad", PrepareFirst, [] { SecPolicy::LoadPolicy("/policy"); }};
const EntryPoint kNext = {"NextLoad", PrepareNext, [] { SecPolicy::LoadPolicy("/policy"); }};
const EntryPoint kEarly = {"EarlyLoad", PrepareFirst, [] { SecPolicy::LoadPolicyEarly("/early"); }};
const EntryPoint kRestore = {"Restore", PrepareRestore,
                             [] { SecPolicy::RestoreDomainEnforcement(); }};
const EntryPoint kDisplay = {"Display", PrepareNext, [] { SecPolicy::DisplayPolicy(""); }};

// ---- Exceptions that are not the library's: nothing but clearing up follows, and the caller gets
// them.

class ForeignFaultSweep : public FaultSweep, public testing::WithParamInterface<EntryPoint> {};

TEST_P(ForeignFaultSweep, EndsAtOnceAndReachesTheCaller) {
  const EntryPoint& entry = GetParam();
  const GoodRoots roots;
  OnlyOneTardisk();
  const CleanRun clean = RunCleanly(entry);

  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    SCOPED_TRACE(clean.trace[place]);
    Transcript run = RunWithFault(entry, number, ForeignException("foreign"));
    EXPECT_EQ(run.exceptionType, "SecPolicyTest::ForeignException");

    const std::size_t done = std::min(place + 1, run.trace.size());
    EXPECT_EQ(
        Strings(run.trace.begin(), run.trace.begin() + static_cast<std::ptrdiff_t>(done)),
        Strings(clean.trace.begin(), clean.trace.begin() + static_cast<std::ptrdiff_t>(place + 1)));
    for (std::size_t line = done; line < run.trace.size(); ++line) {
      EXPECT_EQ(run.trace[line].front(), '~') << run.trace[line];
    }
  }
}

INSTANTIATE_TEST_SUITE_P(EntryPoints, ForeignFaultSweep,
                         testing::Values(kFirst, kNext, kEarly, kRestore, kDisplay),
                         [](const auto& entry) { return entry.param.name; });

// ---- Failures.

struct Section {
  const std::string* text;
  bool guarded;
};

class LoadFaultSweep : public FaultSweep {};

// All domains exist already, so that no section depends on what an earlier one did.
TEST_F(LoadFaultSweep, RunsAllOtherLoadersOrEndsAtOnce) {
  const std::vector<Section> sections = {
      {&kNextLoad.begin, false},   {&kNextLoad.objects, true},    {&kNextLoad.templateDomain, true},
      {&kNextLoad.domains, true},  {&kNextLoad.partners, true},   {&kNextLoad.wellKnown, false},
      {&kNextLoad.tardisks, true}, {&kNextLoad.fileLabels, true},
  };
  const GoodRoots roots;
  const CleanRun clean = RunCleanly(kNext);

  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    SCOPED_TRACE(clean.trace[place]);
    const std::string run = RunWithFault(kNext, number, kSwept).Text();

    std::size_t section = 0;
    std::size_t end = SplitLines(*sections[0].text).size();
    while (end <= place) end += SplitLines(*sections[++section].text).size();
    const std::string start = UpTo(clean, place);
    if (!sections[section].guarded) {
      EXPECT_EQ(run, start + Disconnected(place) + kSweptThrown);
      continue;
    }

    std::string rest;
    for (std::size_t later = section + 1; later < sections.size(); ++later) {
      rest += *sections[later].text;
    }
    rest += kFailed;
    EXPECT_TRUE(run.starts_with(start)) << run;
    EXPECT_TRUE(run.ends_with(rest)) << run;
    ASSERT_GE(run.size(), start.size() + rest.size());
    // What is left is the end of the section, which the driver's report closes.
    const std::string middle = run.substr(start.size(), run.size() - start.size() - rest.size());
    const Strings lines = SplitLines(middle);
    ASSERT_GE(lines.size(), 2u);
    EXPECT_TRUE(lines[lines.size() - 2].starts_with("stderr \"Error: ")) << middle;
    EXPECT_TRUE(lines[lines.size() - 1].starts_with("syslog(LOG_ERR, \"Error: %s\", ")) << middle;
  }
}

// On a fresh kernel a failed load of the domains leaves the well-known ones out, which is the hard
// stop: the caller's own exception shows it.
TEST_F(LoadFaultSweep, NeverSucceedsOnAFreshKernel) {
  const EntryPoint entry = {"", PrepareFirst, [] {
                              try {
                                throw ForeignException("the caller's own");
                              } catch (const ForeignException&) {
                                SecPolicy::LoadPolicy("/policy");
                              }
                            }};
  const GoodRoots roots;
  const CleanRun clean = RunCleanly(entry);

  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    SCOPED_TRACE(clean.trace[place]);
    const Transcript run = RunWithFault(entry, number, kSwept);
    EXPECT_TRUE(run.Text().starts_with(UpTo(clean, place))) << run.Text();
    EXPECT_EQ(std::count(run.trace.begin(), run.trace.end(), "~TeskAccessInterfaceImpl()"),
              place == 0 ? 0 : 1);
    if (run.exceptionType == "SecPolicyTest::ForeignException") {
      EXPECT_EQ(run.exceptionText, "the caller's own");
      const std::string& stop = run.trace[run.trace.size() - 3];
      EXPECT_TRUE(stop.starts_with("stderr \"Error: Failed to fetch domainID for ")) << stop;
    } else {
      EXPECT_EQ(run.exceptionType, "Braxo::Lib::BraxoException");
    }
  }
}

class EarlyLoadFaultSweep : public FaultSweep {};

TEST_F(EarlyLoadFaultSweep, ReportsAndRunsNoLaterLoader) {
  const std::vector<const std::string*> sections = {&kEarlyLoad.begin, &kEarlyLoad.objects,
                                                    &kEarlyLoad.domains, &kEarlyLoad.fileLabels};
  const GoodRoots roots;
  const CleanRun clean = RunCleanly(kEarly);

  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    SCOPED_TRACE(clean.trace[place]);
    const Transcript run = RunWithFault(kEarly, number, kSwept);
    EXPECT_EQ(run.exceptionType, "") << run.exceptionText;
    EXPECT_TRUE(run.Text().starts_with(UpTo(clean, place))) << run.Text();

    std::size_t section = 0;
    std::size_t end = SplitLines(*sections[0]).size();
    while (end <= place) end += SplitLines(*sections[++section]).size();
    for (std::size_t later = section + 1; later < sections.size(); ++later) {
      for (const std::string& line : SplitLines(*sections[later])) {
        EXPECT_EQ(std::count(run.trace.begin(), run.trace.end(), line), 0) << line;
      }
    }

    ASSERT_GE(run.trace.size(), 3u);
    EXPECT_TRUE(run.trace.end()[-2].starts_with("stderr \"Error: ")) << run.Text();
    EXPECT_EQ(run.trace.end()[-3],
              place == 0 ? "TeskAccessInterfaceImpl()" : "~TeskAccessInterfaceImpl()");
  }
}

class RestoreFaultSweep : public FaultSweep {};

TEST_F(RestoreFaultSweep, ReportsAndEndsTheWalk) {
  const CleanRun clean = RunCleanly(kRestore);
  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    SCOPED_TRACE(clean.trace[place]);
    EXPECT_EQ(RunWithFault(kRestore, number, kSwept).Text(),
              UpTo(clean, place) + Disconnected(place) + Reported("swept") + "returns\n");
  }
}

class DisplayFaultSweep : public FaultSweep {};

// Tables that cannot be read end the display; a domain, a kind of rule or a label is left out.
TEST_F(DisplayFaultSweep, ShowsTheRestOrEndsAtOnce) {
  const GoodRoots roots;
  OnlyOneTardisk();
  const CleanRun clean = RunCleanly(kDisplay);
  const std::string afterDomains = DisplayedObjects() + DisplayedTardisks() + kDone + "returns\n";

  for (std::size_t number = 0; number < clean.calls.size(); ++number) {
    const std::size_t place = clean.calls[number];
    const std::string& call = clean.trace[place];
    SCOPED_TRACE(call);
    const std::string run = RunWithFault(kDisplay, number, kSwept).Text();
    const std::string start = UpTo(clean, place);

    if (call.starts_with("GetCompleteDomainInfo(")) {
      EXPECT_TRUE(run.starts_with(start + Reported("Failed to get policy for domain :swept")))
          << run;
      EXPECT_TRUE(run.ends_with(afterDomains)) << run;
    } else if (call.find("Rules(") != std::string::npos) {
      EXPECT_TRUE(run.starts_with(start + Reported("swept"))) << run;
      EXPECT_TRUE(run.ends_with(afterDomains)) << run;
    } else if (call.starts_with("GetLabel(")) {
      EXPECT_EQ(run, start +
                         Reported("Error in reading tardisk label: (/tardisks/base.tgz): swept") +
                         kDone + "returns\n");
    } else {
      EXPECT_EQ(run, start + Disconnected(place) + kSweptThrown);
    }
  }
}

}  // namespace
}  // namespace SecPolicyTest
