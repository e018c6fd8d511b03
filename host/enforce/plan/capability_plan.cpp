#include "host/enforce/plan/capability_plan.h"

#include <algorithm>
#include <array>
#include <iterator>

#include "braxo/misc/strcat.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::Rule;
using std::string_view_literals::operator""sv;

namespace Enforce {
namespace {

// In the order of Linux's numbers, from 0.
constexpr std::array kCapabilities = {"cap_chown"sv,
                                      "cap_dac_override"sv,
                                      "cap_dac_read_search"sv,
                                      "cap_fowner"sv,
                                      "cap_fsetid"sv,
                                      "cap_kill"sv,
                                      "cap_setgid"sv,
                                      "cap_setuid"sv,
                                      "cap_setpcap"sv,
                                      "cap_linux_immutable"sv,
                                      "cap_net_bind_service"sv,
                                      "cap_net_broadcast"sv,
                                      "cap_net_admin"sv,
                                      "cap_net_raw"sv,
                                      "cap_ipc_lock"sv,
                                      "cap_ipc_owner"sv,
                                      "cap_sys_module"sv,
                                      "cap_sys_rawio"sv,
                                      "cap_sys_chroot"sv,
                                      "cap_sys_ptrace"sv,
                                      "cap_sys_pacct"sv,
                                      "cap_sys_admin"sv,
                                      "cap_sys_boot"sv,
                                      "cap_sys_nice"sv,
                                      "cap_sys_resource"sv,
                                      "cap_sys_time"sv,
                                      "cap_sys_tty_config"sv,
                                      "cap_mknod"sv,
                                      "cap_lease"sv,
                                      "cap_audit_write"sv,
                                      "cap_audit_control"sv,
                                      "cap_setfcap"sv,
                                      "cap_mac_override"sv,
                                      "cap_mac_admin"sv,
                                      "cap_syslog"sv,
                                      "cap_wake_alarm"sv,
                                      "cap_block_suspend"sv,
                                      "cap_audit_read"sv,
                                      "cap_perfmon"sv,
                                      "cap_bpf"sv,
                                      "cap_checkpoint_restore"sv};

std::uint64_t BitOf(unsigned int number) { return std::uint64_t{1} << number; }

std::uint64_t BitOf(const Rule& rule) {
  const std::optional<unsigned int> number = CapabilityNumber(rule.words[0]);
  return number ? BitOf(*number) : 0;
}

// Those that one rule grants and none revokes.
std::uint64_t GrantedBy(const std::vector<const Rule*>& rules) {
  std::uint64_t granted = 0;
  std::uint64_t revoked = 0;
  for (const Rule* const rule : rules) (rule->Grants() ? granted : revoked) |= BitOf(*rule);
  return granted & ~revoked;
}

RuleFate FateOf(const Rule& rule, std::uint64_t lost, std::uint64_t known) {
  const std::uint64_t bit = BitOf(rule);
  const bool isKnown = (bit & known) != 0;
  if (!rule.Grants() || (isKnown && (bit & lost) == 0)) return {rule, Fate::kEnforced, {}};
  return {rule, Fate::kNarrowed,
          StrCat(isKnown ? "this user has not " : "this kernel has no ", rule.words[0])};
}

}  // namespace

std::optional<unsigned int> CapabilityNumber(std::string_view name) {
  const auto* const found = std::ranges::find(kCapabilities, name);
  if (found == kCapabilities.end()) return std::nullopt;
  return static_cast<unsigned int>(std::distance(kCapabilities.begin(), found));
}

std::string_view CapabilityName(unsigned int number) {
  return number < kCapabilities.size() ? kCapabilities[number] : std::string_view();
}

CapabilityPlan PlanCapabilities(const Policy::InstalledDomain& domain, std::uint64_t callers,
                                unsigned int last) {
  const std::vector<const Rule*> rules = RulesOf(domain, Policy::RuleKind::kCapability);
  const std::uint64_t granted = GrantedBy(rules);
  const std::uint64_t known = BitOf(last + 1) - 1;
  CapabilityPlan plan{granted & known & callers, {}};
  for (const Rule* const rule : rules) {
    plan.fates.push_back(FateOf(*rule, granted & ~plan.kept, known));
  }
  return plan;
}

}  // namespace Enforce
