#include "host/enforce/module/refusal_question.h"

#include <algorithm>
#include <array>
#include <sstream>

#include "host/enforce/module/module_plan.h"
#include "host/enforce/system_calls.h"
#include "policy/capability.h"

namespace Enforce {
namespace {

using Policy::FileAccess;
using Policy::Question;
using Policy::RuleKind;
using Policy::WordsQuestion;
using Questions = std::vector<Question>;

struct FileUse {
  __u32 bit;
  FileAccess access;
  const char* word;  // of rules for labels
};

constexpr std::array<FileUse, 6> kFileUses = {{
    {kUseRead, FileAccess::kRead, "read"},
    {kUseWrite, FileAccess::kWrite, "write"},
    {kUseExecute, FileAccess::kExecute, "execute"},
    {kUseList, FileAccess::kList, "list"},
    {kUseRemove, FileAccess::kRemove, "remove"},
    {kUseTruncate, FileAccess::kTruncate, "truncate"},
}};

constexpr std::array<const char*, 6> kFileKinds = {"regular", "directory",   "symlink",
                                                   "fifo",    "char_device", "block_device"};
constexpr std::array<const char*, 3> kSocketKinds = {"stream", "dgram", "seqpacket"};

Questions Ask(RuleKind kind, std::string_view word) {
  if (word.empty()) return {};
  return {WordsQuestion{.kind = kind, .words = {std::string(word)}}};
}

Questions AskUse(const ModuleEvent& event, const std::string& path, const EventNames& names) {
  Questions questions;
  for (const auto& [bit, access, word] : kFileUses) {
    if ((event.detail & bit) == 0) continue;
    if (!path.empty()) {
      questions.emplace_back(Policy::FileQuestion{.access = access,
                                                  .path = path,
                                                  .label = names.label,
                                                  .labelIsBuiltIn = names.labelIsBuiltIn});
    } else if (!names.label.empty()) {
      questions.emplace_back(
          WordsQuestion{.kind = RuleKind::kObjectAccess, .words = {names.label, word}});
    }
  }
  return questions;
}

// What is made has the label of its directory, unless a rule says otherwise.
Questions AskByLabel(RuleKind kind, const char* what, const std::string& label) {
  if (label.empty()) return {};
  if (kind == RuleKind::kUnixSocketCreation)
    return {WordsQuestion{.kind = kind, .words = {label, what}}};
  return {WordsQuestion{.kind = kind, .words = {label, label, what}}};
}

template <std::size_t count>
Questions AskCreation(RuleKind kind, const std::array<const char*, count>& kinds,
                      const ModuleEvent& event, const std::string& path, const EventNames& names) {
  if (event.detail >= count) return {};
  if (path.empty()) return AskByLabel(kind, kinds[event.detail], names.label);
  return {Policy::CreationQuestion{.kind = kind,
                                   .what = kinds[event.detail],
                                   .path = path,
                                   .directoryLabel = names.label,
                                   .labelIsBuiltIn = names.labelIsBuiltIn}};
}

Questions AskCapability(const ModuleEvent& event) {
  const auto names = Policy::Capabilities();
  return event.value < names.size() ? Ask(RuleKind::kCapability, names[event.value]) : Questions();
}

// The name that the number has where it was asked by.
Questions AskCall(const ModuleEvent& event) {
  const auto calls = event.detail == kCallsOf32Bits ? SystemCallsOf32Bits() : SystemCalls();
  const auto call = std::ranges::find_if(calls, [&event](const SystemCall& each) {
    return static_cast<std::uint64_t>(each.number) == event.value;
  });
  return call == calls.end() ? Questions() : Ask(RuleKind::kSyscall, call->name);
}

// Requests and flags are known by their bits.
std::string TextOf(std::string_view check, std::uint64_t value) {
  std::ostringstream text;
  if (check == "ioctl_request" || check == "clone_flags") text << "0x" << std::hex;
  text << value;
  return text.str();
}

Questions AskCheck(const ModuleEvent& event) {
  const std::string check(NameOfCheck(event.detail));
  if (check.empty()) return {};
  return {Policy::ParameterQuestion{.check = check, .number = TextOf(check, event.value)}};
}

Questions AskEntry(const EventNames& names) {
  if (names.domain.empty()) return {};
  return {Policy::EntryQuestion{.domain = names.domain, .ways = names.ways}};
}

}  // namespace

bool IsOfNoRule(const ModuleEvent& event) {
  return event.act == kActReachModule || event.act == kActPassPorts || event.act == kActReachSocket;
}

Questions QuestionsOf(const ModuleEvent& event, const std::string& path, const EventNames& names) {
  switch (event.act) {
    case kActUseCapability:
      return AskCapability(event);
    case kActPassValue:
      return AskCheck(event);
    case kActUseFile:
      return AskUse(event, path, names);
    case kActMakeFile:
      return AskCreation(RuleKind::kFileCreation, kFileKinds, event, path, names);
    case kActMakeSocket:
      return AskCreation(RuleKind::kUnixSocketCreation, kSocketKinds, event, path, names);
    case kActCall:
      return AskCall(event);
    case kActEnter:
      return AskEntry(names);
    default:
      return {};
  }
}

}  // namespace Enforce
