// The numbered calls as a kernel answers them: a status, an error number, and never an exception or
// a crash. Arguments are bare numbers, so each is checked for its range and each address is only a
// claim; what is to be written to the caller is tried before anything is changed, so that a call
// that fails has done nothing.
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <limits>
#include <new>
#include <span>
#include <string>
#include <vector>

#include "braxo/lib/exception.h"
#include "host/linux/common/errno_guard.h"
#include "host/linux/common/host_error.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/kernel/user_memory.h"
#include "host/linux/state/host_state.h"
#include "secpolicyhost/mode_param.h"
#include "secpolicyhost/values.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

using Policy::ParameterRange;
using Policy::RuleKind;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_ModeParam;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using Zorvan::Kernel::CallResult;

namespace LinuxHost {
namespace {

using Args = std::span<const std::uint64_t>;

constexpr std::uint32_t kFailure = 0xbad0001;

// The caller's buffer holds fewer policies than there are now; a larger one may do.
constexpr std::uint32_t kBufferTooSmall = 0xbad011f;

// Policies are copied from the caller in pieces of so many, 16 KiB, which fit on any stack.
constexpr std::size_t kPiece = 8;
// 130 MB of the caller's records: a wild number is refused before any of them is read.
constexpr std::uint32_t kMaxBatch = 65'536;

std::uint32_t Unsigned(std::uint64_t argument) {
  if (argument > std::numeric_limits<std::uint32_t>::max()) {
    throw HostError(EINVAL, "number out of range");
  }
  return static_cast<std::uint32_t>(argument);
}

int Signed(std::uint64_t argument) {
  const auto value = static_cast<std::int64_t>(argument);
  if (value < std::numeric_limits<int>::min() || value > std::numeric_limits<int>::max()) {
    throw HostError(EINVAL, "number out of range");
  }
  return static_cast<int>(value);
}

template <class Value>
void Store(std::uint64_t address, const Value& value) {
  WriteUser(address, &value, sizeof value);
}

std::string Path(std::uint64_t address) {
  std::string path = ReadUserText(address, kMaxPolicyPath);
  if (path.empty()) throw HostError(EINVAL, "empty path");
  return path;
}

std::uint32_t CreateDomain(HostState& state, Args args) {
  const std::string name = ReadUserText(args[0], kMaxDomainName);
  const auto defaultRules = static_cast<TeskAccessKsi_DefaultDom>(Signed(args[1]));
  // Tried first: a domain that its creator cannot be told of would be lost.
  Store(args[2], std::uint32_t{0});
  Store(args[2], std::uint32_t{state.Domains().Create(name, defaultRules, true)});
  return 0;
}

std::uint32_t DestroyDomain(HostState& state, Args args) {
  state.Domains().Destroy(Unsigned(args[0]));
  return 0;
}

std::uint32_t UpdateFilePolicy(HostState& state, Args args) {
  state.FilePolicies().Update(Unsigned(args[0]), Path(args[1]), Unsigned(args[2]));
  return 0;
}

std::uint32_t RemoveFilePolicy(HostState& state, Args args) {
  state.FilePolicies().Remove(Unsigned(args[1]), Signed(args[0]), Path(args[2]));
  return 0;
}

TeskAccess_FileRule ToFileRule(const FilePolicy& policy) {
  TeskAccess_FileRule rule{};
  policy.path.copy(rule.path, sizeof rule.path - 1);
  rule.permission = policy.permission;
  return rule;
}

std::uint32_t RetrieveFilePolicies(HostState& state, Args args) {
  const std::uint32_t capacity = Unsigned(args[2]);
  const auto policies = state.FilePolicies().All(Unsigned(args[0]));
  if (policies.size() > capacity) return kBufferTooSmall;
  std::vector<TeskAccess_FileRule> rules;
  std::transform(policies.begin(), policies.end(), std::back_inserter(rules), ToFileRule);
  if (!rules.empty()) WriteUser(args[1], rules.data(), rules.size() * sizeof rules[0]);
  return 0;
}

std::uint32_t CountFilePolicies(HostState& state, Args args) {
  Store(args[1], std::uint32_t{state.FilePolicies().Count(Unsigned(args[0]))});
  return 0;
}

FilePolicy ToFilePolicy(const TeskAccess_FileRule& rule, unsigned int domainId, int world) {
  const std::size_t length = strnlen(rule.path, sizeof rule.path);
  if (length == sizeof rule.path) throw HostError(ENAMETOOLONG, "path without an end");
  return {.domain = {domainId, {}},
          .world = world,
          .path = std::string(rule.path, length),
          .permission = rule.permission};
}

// Says `count` to the caller as soon as it can be said.
std::vector<FilePolicy> TakeFilePolicies(std::uint64_t address, std::uint32_t count,
                                         unsigned int domainId, int world, std::uint64_t told) {
  std::vector<FilePolicy> policies;
  policies.reserve(count);
  std::array<TeskAccess_FileRule, kPiece> piece;
  while (policies.size() < count) {
    const std::size_t size = std::min(kPiece, count - policies.size());
    ReadAndWriteUser(address + policies.size() * sizeof piece[0], piece.data(),
                     size * sizeof piece[0], told, &count, sizeof count);
    for (std::size_t index = 0; index < size; ++index) {
      policies.push_back(ToFilePolicy(piece[index], domainId, world));
    }
  }
  return policies;
}

std::uint32_t AddFilePolicies(HostState& state, Args args) {
  const std::uint32_t count = Unsigned(args[3]);
  if (count == 0 || count > kMaxBatch) throw HostError(EINVAL, "bad number of file policies");
  const unsigned int domainId = Unsigned(args[1]);
  const int world = Signed(args[0]);
  try {
    auto policies = TakeFilePolicies(args[2], count, domainId, world, args[4]);
    for (FilePolicy& policy : policies) policy.line = state.CurrentLine();
    state.FilePolicies().Install(policies);
  } catch (...) {
    Store(args[4], std::uint32_t{0});
    throw;
  }
  return 0;
}

std::uint32_t SetCapability(HostState& state, Args args) {
  const std::string capability = CapabilityWord(args[1]);
  state.Rules().Install(
      {Unsigned(args[0]), {}},
      {.kind = RuleKind::kCapability, .words = {capability}, .verdict = args[2] != 0});
  return 0;
}

ParameterRange ReadRange(std::uint64_t address) {
  TeskAccess_ModeParam mode{};
  ReadUser(address, &mode, sizeof mode);
  if (mode.first > mode.second) throw HostError(EINVAL, "empty parameter range");
  return {mode.first, mode.second};
}

std::uint32_t SetParameterCheck(HostState& state, Args args) {
  const std::string check = ParameterCheckWord(args[1]);
  const ParameterRange range = ReadRange(args[2]);
  Policy::Rule rule = {.kind = RuleKind::kParameterCheck,
                       .words = {check, std::to_string(range.first)},
                       .verdict = args[3] != 0};
  if (range.first != range.last) rule.words[2] = std::to_string(range.last);
  state.ParameterRules().Install({Unsigned(args[0]), {}}, rule);
  return 0;
}

std::uint32_t RemoveParameterCheck(HostState& state, Args args) {
  state.ParameterRules().Remove(Unsigned(args[0]), ParameterCheckWord(args[1]), ReadRange(args[2]));
  return 0;
}

std::uint32_t RetrieveLeakedDomains(HostState& state, Args args) {
  const auto leaked = state.Domains().Leaked();
  const std::size_t filled = std::min<std::uint64_t>(leaked.size(), args[2]);
  if (filled != 0) WriteUser(args[0], leaked.data(), filled * sizeof leaked[0]);
  Store(args[1], static_cast<std::uint32_t>(leaked.size()));
  return 0;
}

std::uint32_t DomainOfWorld(HostState& state, Args args) {
  Store(args[1], std::uint32_t{state.Worlds().DomainOf(Signed(args[0]))});
  return 0;
}

std::uint32_t PlaceWorld(HostState& state, Args args) {
  // Who places itself may not be able to tell the module of its domain afterwards.
  PublishCommitted();
  state.Worlds().Place(Signed(args[0]), Unsigned(args[1]));
  return 0;
}

std::uint32_t DomainName(HostState& state, Args args) {
  state.Refresh();
  const std::string& name = state.Domains().Get(Unsigned(args[0])).name;
  if (args[2] <= name.size()) throw HostError(ERANGE, "buffer too small for the name");
  WriteUser(args[1], name.c_str(), name.size() + 1);
  return 0;
}

std::uint32_t RePointFilePolicies(HostState& state, Args args) {
  state.FilePolicies().RePoint(Path(args[0]), Path(args[1]));
  return 0;
}

enum CallNumber : std::uint32_t {
  kCreateDomain = 0x4059,
  kDestroyDomain = 0x405a,
  kUpdateFilePolicy = 0x405b,
  kRemoveFilePolicy = 0x405c,
  kRetrieveFilePolicies = 0x405d,
  kCountFilePolicies = 0x405e,
  kAddFilePolicies = 0x405f,
  kSetCapability = 0x4061,
  kSetParameterCheck = 0x4062,
  kRetrieveLeakedDomains = 0x4064,
  kDomainOfWorld = 0x4065,
  kDomainName = 0x4066,
  kRePointFilePolicies = 0x4067,
  kRemoveParameterCheck = 0x413e,
  kPlaceWorld = kCallPlaceWorld,
};

// One numbered call: what it answers is its status; it throws HostError for an error.
struct NumberedCall {
  CallNumber number;
  std::size_t argCount;
  std::uint32_t (*run)(HostState& state, Args args);
};

constexpr std::array<NumberedCall, 15> kCalls = {{
    {kCreateDomain, 3, CreateDomain},                  // name, default rules, &id
    {kDestroyDomain, 1, DestroyDomain},                // id
    {kUpdateFilePolicy, 3, UpdateFilePolicy},          // domain, path, permission
    {kRemoveFilePolicy, 3, RemoveFilePolicy},          // world, domain, path
    {kRetrieveFilePolicies, 3, RetrieveFilePolicies},  // domain, policies, capacity
    {kCountFilePolicies, 2, CountFilePolicies},        // domain, &count
    {kAddFilePolicies, 5, AddFilePolicies},            // world, domain, policies, count, &installed
    {kSetCapability, 3, SetCapability},                // domain, capability, grant
    {kSetParameterCheck, 4, SetParameterCheck},        // domain, check, &range, grant
    {kRetrieveLeakedDomains, 3, RetrieveLeakedDomains},  // ids, &count, capacity
    {kDomainOfWorld, 2, DomainOfWorld},                  // world, &domain
    {kDomainName, 3, DomainName},                        // domain, name, capacity
    {kRePointFilePolicies, 2, RePointFilePolicies},      // old path, new path
    {kRemoveParameterCheck, 3, RemoveParameterCheck},    // domain, check, &range
    {kPlaceWorld, 2, PlaceWorld},                        // world, domain
}};

CallResult Run(std::uint32_t number, Args args) {
  const auto* call = std::find_if(kCalls.begin(), kCalls.end(),
                                  [&](const auto& row) { return row.number == number; });
  if (call == kCalls.end()) return {kFailure, -ENOSYS};
  if (args.size() != call->argCount) return {kFailure, -EINVAL};
  const std::uint32_t status = call->run(HostState::Current(), args);
  return {status, status == kBufferTooSmall ? -EAGAIN : 0};
}

}  // namespace
}  // namespace LinuxHost

namespace Zorvan::Kernel {

CallResult Call(std::uint32_t number, std::initializer_list<std::uint64_t> args) {
  const LinuxHost::ErrnoGuard guard;
  const LinuxHost::CommitFollower follower;
  try {
    return LinuxHost::Run(number, args);
  } catch (const LinuxHost::HostError& error) {
    return {LinuxHost::kFailure, -error.Code()};
  } catch (const Braxo::Lib::BraxoException&) {
    // Of the module, which who is in an enforcing domain may not ask, for one.
    return {LinuxHost::kFailure, -EIO};
  } catch (const std::bad_alloc&) {
    return {LinuxHost::kFailure, -ENOMEM};
  }
}

}  // namespace Zorvan::Kernel
