#pragma once

#include <cstdint>
#include <exception>
#include <functional>
#include <list>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "braxo/lib/exception.h"
#include "support/trace.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

// The scripted host: the whole host contract in memory, for tests. It is benign by default and
// keeps one ordered trace of everything that the library does; a test states only what is unusual.
//
//   TEST(LoadPolicyObjects, ReportsUnreadableLabelTable) {
//     ScriptedHost host;                               // one at a time; ends with leak checks
//     host.Fail("GetInvalidLabels", Nth(1), "no table");
//     PolicyTree tree({{"objects/base", "toolLabel\n"}});
//     TeskAccessInterfaceImpl access;
//
//     const Transcript run =
//         Record([&] { SecPolicy::LoadPolicyObjects(tree / "objects", access); });
//
//     EXPECT_EQ(run.Text(), Lines({
//         R"(GetKeywordsMap(LABEL))",
//         ...
//         R"(throws Braxo::Lib::BraxoException: Failure in ...)",
//     }));
//   }
//
// clang-format off
// One line of the trace for each:
//
//   host calls, with their arguments and without their results
//     FindDomain("hostDom")
//     ValidateKeyword(OBJECT_ACCESS, "read")
//     LookupLabel("tool", OBJECT)
//     CreateDomain("x", 0)
//     SetSyscallRule({line: 3, domainId: 7, domainName: "hostDom", syscall: "read", grant: true})
//     SetFilePathAccessRules([{line: 0, ...}, {...}])
//     FindOption("/UserVars/X")
//     AdvancedIntegerOption::GetValue("/UserVars/X")
//     GetDesiredUserConfig({"a", "b", "c", "d"}, 0)
//     StoreObject::GetValue("key")
//     SetBootStatus({...}, true)
//     Sysinfo::AddInstancePath("/policy/file")      the inode of a file given to SetTardisk
//
//   objects of the host that come and go
//     TeskAccessInterfaceImpl()   ~TeskAccessInterfaceImpl()
//     Sysinfo(1)                  ~Sysinfo()
//     ~AdvancedOption("/UserVars/X")
//
//   kernel calls: texts and rules are shown, not addresses
//     Call(0x4059, "name", 3, &out)
//     SetXattr("/f", "zorvan.security", 42, 4, 2)   value as a number, size, flags
//
//   the log, but not SyslogIsRunning(), which decides between the two
//     syslog(LOG_ERR, "Error: %s", "message")
//     WriteToKlog("message", "[ERR]")
//
//   the streams
//     stderr "Error: message\n"                     one flushed line
//     stdout "title\n"                              flushed
//     stdout unflushed "a\nb\n"                     not flushed when the next thing happened
// clang-format on
//
// A failing call is in the trace like any other. errno is overwritten by every allocation and by
// every host call that may do so, as long as a ScriptedHost exists.
namespace SecPolicyTest {

using Braxo::Lib::BraxoException;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_KeywordType;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using TeskCtl::Security::TeskAccessLabelType;

// A host's exception that is no BraxoException.
class ForeignException : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// A host's refinement of BraxoException.
class DerivedBraxoException : public BraxoException {
 public:
  using BraxoException::BraxoException;
};

// Selects calls of one name.
struct Which {
  unsigned int nth = 0;                  // 0: every one
  std::optional<std::string> arguments;  // as the trace shows them between the parentheses
};
inline Which Every() { return {}; }
inline Which Nth(unsigned int number) { return {number, {}}; }  // from 1, since the start
inline Which With(std::string arguments) { return {0, std::move(arguments)}; }

struct DomainRecord {
  std::string name;
  std::string level = "enforcing";
  unsigned int state = 0;
  unsigned int refCount = 0;
  unsigned int worldRefCount = 0;
  TeskAccessKsi_DefaultDom dflt = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  bool namedBeforeFailure = false;  // GetCompleteDomainInfo tells the name even when it fails
};

struct InstalledRules {
  std::list<TeskCtl::Security::TeskAccess_FilePathAccessRule> filePathAccess;
  std::list<TeskCtl::Security::TeskAccess_SyscallRule> syscall;
  std::list<TeskCtl::Security::TeskAccess_CapabilityRule> capability;
  std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule> capabilityParam;
  std::list<TeskCtl::Security::TeskAccess_ObjectAccessRule> objectAccess;
  std::list<TeskCtl::Security::TeskAccess_DomTransRule> domTrans;
  std::list<TeskCtl::Security::TeskAccess_FileCreationRule> fileCreation;
  std::list<TeskCtl::Security::TeskAccess_UnixSockCreationRule> unixSockCreation;
};

class ScriptedHost {
 public:
  using KernelCall = std::function<Zorvan::Kernel::CallResult(std::span<const std::uint64_t> args)>;

  ScriptedHost();
  ScriptedHost(const ScriptedHost&) = delete;
  ScriptedHost& operator=(const ScriptedHost&) = delete;
  // Fails the test when an interface object, sysinfo reader or option object is left.
  ~ScriptedHost();

  // The host that the calls of the contract reach.
  static ScriptedHost& Current();

  // ---- Faults: the call is recorded and then throws. The latest script that fits a call counts.

  void Fail(const std::string& call, const std::string& message) { Fail(call, Every(), message); }
  void Fail(const std::string& call, const Which& which, const std::string& message) {
    FailWith(call, which, BraxoException(message));
  }
  void FailForeign(const std::string& call, const Which& which = Every()) {
    FailWith(call, which, ForeignException("foreign"));
  }
  // Any object can be thrown: std::bad_alloc(), DerivedBraxoException("text"), 42.
  template <class Exception>
  void FailWith(const std::string& call, const Which& which, const Exception& exception) {
    faults.push_back({call, which, std::make_exception_ptr(exception)});
  }

  // SetXattr, GetXattr and RealPath fail for `path` with errno `error`; 0 leaves errno alone.
  void FailErrno(const std::string& call, const std::string& path, int error) {
    errnoFaults[{call, path}] = error;
  }

  // Every kernel call `number` returns `status` and `error`.
  void FailKernelCall(std::uint32_t number, std::uint32_t status, std::int32_t error) {
    OnKernelCall(number, [=](auto) { return Zorvan::Kernel::CallResult{status, error}; });
  }
  // Every kernel call `number` is answered by `answer`, which may write to what `args` point to.
  void OnKernelCall(std::uint32_t number, KernelCall answer) {
    kernelCalls[number] = std::move(answer);
  }

  // The named bool members of the interface return false, after doing their work.
  void ReturnFalse(const std::string& call) { falseResults.insert(call); }

  // Fails the `number`-th (from 1) of all calls that may throw.
  template <class Exception>
  void FailCall(std::size_t number, const Exception& exception) {
    sweepCall = number;
    sweepException = std::make_exception_ptr(exception);
  }
  // The place in the trace, counted from 0, of every call so far that may throw.
  const std::vector<std::size_t>& FallibleCalls() const { return fallibleCalls; }

  // ---- State. The slots start with "hostDom" in slot 0.

  unsigned int DeclareDomain(const std::string& name);  // in the next free slot; returns it
  void DeclareWellKnownDomains();  // globalVMDom 1, ioFilterDom 2, appDom 3, daemonFrameworkDom 4
  std::set<std::string> hiddenDomains;  // FindDomain does not find them
  std::map<unsigned int, DomainRecord> domains;
  std::optional<unsigned int> maxDomains;  // otherwise one more than the highest slot in use

  // The object labels "unlabeled" 2 and "tardiskDefault" 3 exist. A label that was not declared
  // gets the next identifier when it is looked up; one declared with 1 does not exist.
  void DeclareLabel(const std::string& name, unsigned int id,
                    TeskAccessLabelType type = TeskCtl::Security::TESKACCESS_LABEL_OBJECT) {
    labels[type][name] = id;
  }
  std::map<TeskAccessLabelType, std::map<std::string, unsigned int>> labels;
  std::map<TeskAccessLabelType, std::vector<std::string>> invalidLabels;  // GetInvalidLabels
  std::set<std::string> predefinedLabels = {"unlabeled", "tardiskDefault"};
  std::set<std::string> privilegedVms;

  // GetKeywordsMap. Every word is valid; a strict host (`strict`) accepts only words of the tables,
  // knows only declared labels, and answers GetKeywordsMap(LABEL) with the object labels.
  std::map<TeskAccess_KeywordType, std::map<std::string, long>> keywords;
  bool strict = false;

  // What Get…Rules append; Set…Rule adds to it, and replaces a rule that names the same thing.
  std::map<unsigned int, InstalledRules> rules;

  std::vector<std::string> tardiskLaunchDomains = {"hostDom", "daemonFrameworkDom"};
  std::string tardiskExecEventKeyword = "tardisk_exec";
  std::string defaultTardiskLabel = "tardiskDefault";
  std::string defaultTardiskDomain = "appDom";

  // The attribute of each path, raw. A path without one carries the label "unlabeled".
  std::map<std::string, std::string> attributes;
  void SetAttribute(const std::string& path, std::uint32_t id);

  // RealPath: the path itself where nothing is set. Only the empty path cannot be resolved.
  std::map<std::string, std::string> realPaths;

  // The tardisk name in the inode record of the existing file `path`; for other inodes the default.
  void SetTardisk(const std::string& path, const std::string& name);
  // The whole record; one shorter than 548 bytes leaves the rest of the reader's buffer as it is.
  void SetInodeRecord(const std::string& path, const std::string& record);
  std::string defaultTardiskName;

  bool syslogRunning = true;

  void SetOption(const std::string& path, long value) { options[path] = value; }
  void SetNonIntegerOption(const std::string& path) { options[path] = std::nullopt; }
  std::map<std::string, std::optional<long>> options;

  using Components = std::vector<std::string>;  // four
  std::map<Components, std::map<std::string, std::string>> storedObjects;

  // File_Exists and File_IsDirectory look at the real files unless something else is set.
  enum class FileKind { kMissing, kFile, kDirectory };
  std::map<std::string, FileKind> fileKinds;

  // ---- What happened.

  Trace trace;
  std::string StandardOutput() const { return standardOutput.Text(); }
  std::string StandardError() const { return standardError.Text(); }

  // ---- For the implementation of the contract.

  // Records a call that may throw, and throws when that is scripted.
  void Enter(const std::string& call, const std::string& arguments);
  // Records a call that does not throw.
  void Note(const std::string& call, const std::string& arguments);
  bool Result(const std::string& call) const { return !falseResults.contains(call); }
  std::optional<int> ErrnoFault(const std::string& call, const std::string& path) const;
  Zorvan::Kernel::CallResult AnswerKernelCall(std::uint32_t number,
                                              std::span<const std::uint64_t> args);
  unsigned int LabelId(const std::string& name, TeskAccessLabelType type);
  std::string InodeName(unsigned long inode) const;
  std::string InodeRecord(unsigned long inode) const;

  int aliveInterfaces = 0;
  int aliveReaders = 0;
  int aliveOptions = 0;

 private:
  struct Fault {
    std::string call;
    Which which;
    std::exception_ptr exception;
  };
  struct Inode {
    std::string path;
    std::string record;
  };

  std::vector<Fault> faults;
  std::map<std::string, unsigned int> callCounts;
  std::map<std::pair<std::string, std::string>, int> errnoFaults;
  std::map<std::uint32_t, KernelCall> kernelCalls;
  std::set<std::string> falseResults;
  std::map<unsigned long, Inode> inodes;
  std::vector<std::size_t> fallibleCalls;
  std::size_t sweepCall = 0;
  std::exception_ptr sweepException;
  CapturedStream standardOutput;
  CapturedStream standardError;
};

// What a function did: the lines it added to the trace, and how it ended.
struct Transcript {
  std::vector<std::string> trace;
  std::string exceptionType;  // "Braxo::Lib::BraxoException"; empty: it returned
  std::string exceptionText;  // what(), where there is one

  // The trace, then "returns" or "throws Braxo::Lib::BraxoException: message"; each line ended.
  std::string Text() const;
  // Only what was reported and printed: the lines of syslog, WriteToKlog, stderr and stdout, and
  // the end.
  std::string Reports() const;
};

// Runs `function` against the current host.
Transcript Record(const std::function<void()>& function);

// The lines joined, each with a line end: what Transcript::Text() is compared with.
std::string Lines(std::initializer_list<std::string> lines);

}  // namespace SecPolicyTest
