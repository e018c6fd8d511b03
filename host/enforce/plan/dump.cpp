#include "host/enforce/plan/dump.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <map>
#include <sstream>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/enforce/plan/port_check.h"
#include "host/enforce/system_calls.h"
#include "policy/capability.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

// In the order of their bits.
constexpr std::array<const char*, 16> kRightNames = {
    "execute",   "write-file", "read-file", "read-dir",  "remove-dir", "remove-file",
    "make-char", "make-dir",   "make-reg",  "make-sock", "make-fifo",  "make-block",
    "make-sym",  "refer",      "truncate",  "ioctl-dev"};

// Decimal as far as people count, then as the headers of the kernel write it.
std::string TextOf(std::uint32_t value) {
  constexpr std::uint32_t kGreatestDecimal = 0xffff;
  std::ostringstream text;
  text << (value > kGreatestDecimal ? "0x" : "");
  text << (value > kGreatestDecimal ? std::hex : std::dec) << value;
  return text.str();
}

std::string TextOf(const ValueRange& range) {
  if (range.first == range.last) return TextOf(range.first);
  return StrCat(TextOf(range.first), "-", TextOf(range.last));
}

template <class Items, class Text>
std::string Join(const Items& items, const char* separator, Text text) {
  std::string joined;
  for (const auto& item : items) joined += (joined.empty() ? "" : separator) + text(item);
  return joined;
}

std::string TextOf(const ArgumentCheck& check) {
  std::string text =
      StrCat(check.half == Half::kUpper ? "upper half of " : "", "argument ", check.argument + 1);
  if (check.mask != 0xffff'ffff) text += StrCat(" & ", TextOf(check.mask));
  if (check.values.empty()) return text + " in nothing";
  return StrCat(text, " in ",
                Join(check.values, " ", [](const ValueRange& range) { return TextOf(range); }));
}

std::string TextOf(const Condition& condition) {
  return Join(condition, " or ", [](const ArgumentCheck& check) { return TextOf(check); });
}

std::string TextOfRefusal(const CallVerdict& verdict) {
  return verdict.refusal == EACCES ? "refused with EACCES" : "refused";
}

std::string TextOf(const CallVerdict& verdict) {
  if (verdict.answer == Answer::kUnknown) return "answered as unknown";
  if (verdict.answer == Answer::kRefused) return TextOfRefusal(verdict);
  if (verdict.answer == Answer::kAllowedWithSecret) return "refused but to enter";
  if (verdict.conditions.empty()) return "allowed";
  return StrCat(
      "allowed where ",
      Join(verdict.conditions, ", and ", [](const Condition& each) { return TextOf(each); }),
      verdict.refusal == EPERM ? "" : ", else " + TextOfRefusal(verdict));
}

std::string TextOf(const char* name, const PortPlan& plan) {
  if (!plan.isHandled) return StrCat(name, ": all ports\n");
  std::string text = StrCat(name, ": ", plan.ports.empty() ? "no port" : "");
  const char* separator = "";
  for (const std::uint16_t port : plan.ports) {
    text += StrCat(separator, port);
    separator = ", ";
  }
  return text + "\n";
}

const char* TextOf(MaskKind kind) {
  return kind == MaskKind::kHidden ? "hidden by a mount" : "mounted so that nothing is executed";
}

}  // namespace

std::string Dump(const CallPlan& plan) {
  std::map<CallVerdict, std::vector<std::string_view>> calls;
  for (const auto& [number, verdict] : plan.verdicts) calls[verdict].push_back(NameOf(number));
  calls.erase({Answer::kRefused});
  std::string text;
  for (auto& [verdict, names] : calls) {
    std::ranges::sort(names);
    text += StrCat(TextOf(verdict), ": ",
                   Join(names, " ", [](std::string_view name) { return std::string(name); }), "\n");
  }
  return text + "refused: all others\n";
}

std::string Dump(const CapabilityPlan& plan) {
  std::string text = "capabilities:";
  const auto names = Policy::Capabilities();
  for (std::size_t number = 0; number < names.size(); ++number) {
    if ((plan.kept >> number & 1) != 0) text += StrCat(" ", names[number]);
  }
  if (plan.kept == 0) text += " none";
  return text + "\n";
}

std::string Dump(const NetPlan& plan) {
  return TextOf(kBindPort, plan.bind) + TextOf(kConnectPort, plan.connect);
}

std::string Dump(const PathPlan& plan) {
  std::string text = "rights to files, each also to everything beneath:\n";
  for (const PathRight& right : plan.rights) {
    text += "  " + right.path + ":";
    for (std::size_t bit = 0; bit < kRightNames.size(); ++bit) {
      if ((right.rights >> bit & 1) != 0) text += std::string(" ") + kRightNames[bit];
    }
    text += '\n';
  }
  for (const Mask& mask : plan.masks) text += StrCat(TextOf(mask.kind), ": ", mask.path, "\n");
  return text;
}

}  // namespace Enforce
