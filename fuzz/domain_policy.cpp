// A domain policy: what is accepted survives printing and reading again, a refused line takes only
// what follows it, and the kernel gets what was read.

#include "secpolicy/domain/domain_policy.h"

#include <cstdint>
#include <map>
#include <sstream>
#include <string>

#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"
#include "support/memory_file.h"
#include "support/message_of.h"
#include "support/policy_host.h"
#include "support/print.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicy::DomainPolicy;
using SecPolicyTest::MessageOf;
using SecPolicyTest::TeskAccessInterfaceImpl;
using Parsed = std::map<unsigned int, std::queue<std::string>>;

constexpr char kDomain[] = "fuzzDom";
constexpr unsigned int kDomainId = 3;
constexpr std::uint32_t kAddFilePolicyBatch = 0x405f;

template <class Rules>
std::string ShowRules(const DomainPolicy& policy, const std::string& keyword) {
  std::string text;
  for (auto rule : dynamic_cast<const Rules&>(*policy.ruleSets.at(keyword)).rules) {
    rule.line = 0;  // a rule is the same rule on another line
    text += keyword + " " + SecPolicyTest::Print(rule) + "\n";
  }
  return text;
}

std::string ShowPolicy(const DomainPolicy& policy) {
  return ShowRules<SecPolicy::ObjectAccessRules>(policy, "-a") +
         ShowRules<SecPolicy::CapabilityRules>(policy, "-c") +
         ShowRules<SecPolicy::DomTransRules>(policy, "-d") +
         ShowRules<SecPolicy::FileCreationRules>(policy, "-f") +
         ShowRules<SecPolicy::CapabilityParamRules>(policy, "-p") +
         ShowRules<SecPolicy::FilePathAccessRules>(policy, "-r") +
         ShowRules<SecPolicy::SyscallRules>(policy, "-s") +
         ShowRules<SecPolicy::UnixSockCreationRules>(policy, "-u");
}

std::string PrintedText(DomainPolicy& policy, const PolicyHost& host) {
  const std::size_t before = host.StandardOutput().size();
  policy.PrintPolicy();
  return host.StandardOutput().substr(before);
}

Parsed ToLines(const std::string& text) {
  Parsed lines;
  std::istringstream stream(text);
  std::string line;
  for (unsigned int number = 1; std::getline(stream, line); ++number) {
    lines[number] = SecPolicy::ParsePolicyLine(line);
  }
  return lines;
}

void CheckPrinting(DomainPolicy& policy, const PolicyHost& host, TeskAccessInterfaceImpl& access) {
  Parsed lines = ToLines(PrintedText(policy, host));
  DomainPolicy again(kDomain, kDomainId);
  const std::string failure = MessageOf([&] { again.ProcessParsedPolicyFile(access, lines); });
  RequireEqual(failure, "", "a printed rule is accepted");
  RequireEqual(ShowPolicy(again), ShowPolicy(policy), "a printed rule reads as the same rule");
}

// The number of the line that `failure` names.
unsigned int RefusedLine(const std::string& failure) {
  const std::string start = std::string("Error in parsing policy for domain: ") + kDomain + ": ";
  Require(failure.starts_with(start), "a refusal names domain and line: " + failure);
  std::size_t digits = 0;
  const unsigned long line = std::stoul(failure.substr(start.size()), &digits);
  Require(failure.substr(start.size() + digits).starts_with(" : "), "shape of: " + failure);
  return static_cast<unsigned int>(line);
}

// The lines before a refused one are as good as a file of their own.
void CheckRefusal(const std::string& failure, const DomainPolicy& policy, const std::string& path,
                  TeskAccessInterfaceImpl& access) {
  Parsed lines;
  SecPolicy::ParseFile(path, lines);
  const auto refused = lines.find(RefusedLine(failure));
  Require(refused != lines.end(), "the refused line exists: " + failure);
  lines.erase(refused, lines.end());

  DomainPolicy before(kDomain, kDomainId);
  RequireEqual(MessageOf([&] { before.ProcessParsedPolicyFile(access, lines); }), "",
               "the lines before the refused one are accepted");
  RequireEqual(ShowPolicy(policy), ShowPolicy(before), "the rules before the refused line");
}

const SecPolicy::FilePathAccessRules& FilePaths(const DomainPolicy& policy) {
  return dynamic_cast<const SecPolicy::FilePathAccessRules&>(*policy.ruleSets.at("-r"));
}

// What the kernel is to be told of the paths, and the refusal that ends it.
std::string ExpectedPaths(const DomainPolicy& policy, std::string& refusal) {
  std::string text;
  for (const auto& rule : FilePaths(policy).rules) {
    const Permission permission = ReadPermission(rule.permissions);
    refusal = permission.refusal;
    if (!permission.mask) return text;
    // Every path of this host is its own real path.
    for (int entry = 0; entry < 2; ++entry) {
      text += rule.path + " " + std::to_string(*permission.mask) + "\n";
    }
  }
  return text;
}

// Collects the paths that the kernel is told.
void ListenForPaths(PolicyHost& host, std::string& told) {
  host.OnKernelCall(kAddFilePolicyBatch, [&](std::span<const std::uint64_t> args) {
    const auto* rules = reinterpret_cast<const SecPolicyTest::TeskAccess_FileRule*>(args[2]);
    for (const auto& rule : std::span(rules, args[3])) {
      told += std::string(rule.path) + " " + std::to_string(rule.permission) + "\n";
    }
    return Zorvan::Kernel::CallResult{0, 0};
  });
}

// The verdict on each thing that a printed policy names; the latest counts.
std::map<std::string, std::string> Verdicts(const std::string& printed) {
  std::map<std::string, std::string> verdicts;
  std::istringstream stream(printed);
  std::string line;
  while (std::getline(stream, line)) {
    if (line.empty() || line.starts_with("-r ")) continue;
    const std::size_t blank = line.rfind(' ');
    verdicts[line.substr(0, blank)] = line.substr(blank + 1);
  }
  return verdicts;
}

void CheckInstalling(DomainPolicy& policy, PolicyHost& host, TeskAccessInterfaceImpl& access) {
  std::string refusal;
  const std::string expectedPaths = ExpectedPaths(policy, refusal);
  std::string toldPaths;
  ListenForPaths(host, toldPaths);
  RequireEqual(MessageOf([&] { policy.SetPolicy(access); }), refusal, "what ends installing");
  RequireEqual(toldPaths, expectedPaths, "the paths that the kernel is told");

  auto expected = Verdicts(PrintedText(policy, host));
  // Paths stand between the other kinds: a bad one keeps system calls and sockets out.
  if (!refusal.empty()) {
    std::erase_if(expected, [](const auto& verdict) { return verdict.first >= "-r"; });
  }
  DomainPolicy installed(kDomain, kDomainId);
  installed.ReadSystemPolicy(access);
  Require(Verdicts(PrintedText(installed, host)) == expected, "the kernel holds what was read");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const MemoryFile file;
  file.Write(Text(data, size));
  PolicyHost host;
  TeskAccessInterfaceImpl access;

  DomainPolicy policy(kDomain, kDomainId);
  policy.policyFile = file.Path();
  const std::string failure = MessageOf([&] { policy.ParsePolicy(access); });
  if (!failure.empty()) CheckRefusal(failure, policy, file.Path(), access);
  CheckPrinting(policy, host, access);
  RequireEqual(MessageOf([&] { policy.CheckPolicyConstraints(access); }), "", "constraints");
  CheckInstalling(policy, host, access);
  return 0;
}

}  // namespace SecPolicyFuzz
