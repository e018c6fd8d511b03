#include "host/linux/state/keyword_tables.h"

#include <linux/capability.h>
#include <seccomp.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <span>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/label_table.h"
#include "policy/call_set.h"
#include "policy/capability.h"
#include "policy/newer_call.h"
#include "policy/rule_kind.h"

using Braxo::Misc::StrCat;
using TeskCtl::Security::TeskAccess_KeywordType;

namespace LinuxHost {
namespace {

// The words of a table in the order of their identifiers, from 0.
using Words = std::span<const std::string>;

// These have the first numbers in the runtime interface, which is older than the others.
constexpr std::array kOldestCapabilities = {
    CAP_CHOWN,      CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH, CAP_FOWNER,     CAP_FSETID,
    CAP_KILL,       CAP_SETGID,       CAP_SETUID,          CAP_SETPCAP,    CAP_NET_BIND_SERVICE,
    CAP_NET_ADMIN,  CAP_NET_RAW,      CAP_IPC_LOCK,        CAP_SYS_MODULE, CAP_SYS_RAWIO,
    CAP_SYS_CHROOT, CAP_SYS_PTRACE,   CAP_SYS_ADMIN,       CAP_SYS_BOOT};

std::vector<std::string> ListCapabilities() {
  const auto names = Policy::Capabilities();
  std::vector<std::string> words;
  words.reserve(names.size());
  for (const int number : kOldestCapabilities) {
    words.emplace_back(names[static_cast<std::size_t>(number)]);
  }
  for (const std::string_view name : names) {
    if (std::ranges::find(words, name) == words.end()) words.emplace_back(name);
  }
  return words;
}

Words CapabilityWords() {
  static const std::vector<std::string> words = ListCapabilities();
  return words;
}

Words ParameterCheckWords() {
  static const std::array<std::string, 10> words = {
      "socket_family", "socket_type", "bind_port",   "connect_port", "ioctl_request",
      "prctl_option",  "clone_flags", "kill_signal", "set_uid",      "set_gid"};
  return words;
}

Words ObjectAccessWords() {
  static const std::array<std::string, 6> words = {"read", "write",  "execute",
                                                   "list", "remove", "truncate"};
  return words;
}

Words TransitionWords() {
  static const std::array<std::string, 3> words = {"exec", kTardiskExec, "enter"};
  return words;
}

Words FileCreationWords() {
  static const std::array<std::string, 6> words = {"regular", "directory",   "symlink",
                                                   "fifo",    "char_device", "block_device"};
  return words;
}

Words SocketCreationWords() {
  static const std::array<std::string, 3> words = {"stream", "dgram", "seqpacket"};
  return words;
}

// What a word of the table is called in messages. Throws for a type that is no table.
const char* NounOf(TeskAccess_KeywordType type) {
  const Policy::WordForm* const form = Policy::FindWordForm(type);
  if (form != nullptr) return form->noun;
  throw HostError(EINVAL, StrCat("unknown keyword table ", static_cast<int>(type)));
}

// The tables that are short lists; empty for the two that are not.
Words ShortList(TeskAccess_KeywordType type) {
  switch (type) {
    case TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY:
      return CapabilityWords();
    case TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK:
      return ParameterCheckWords();
    case TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS:
      return ObjectAccessWords();
    case TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS:
      return TransitionWords();
    case TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION:
      return FileCreationWords();
    case TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION:
      return SocketCreationWords();
    default:
      return {};
  }
}

void AddSystemCalls(int first, int last, std::map<std::string, long>& calls) {
  for (int number = first; number <= last; ++number) {
    char* name = seccomp_syscall_resolve_num_arch(SCMP_ARCH_NATIVE, number);
    if (name == nullptr) continue;
    calls.emplace(name, number);
    std::free(name);
  }
}

// All system calls of Linux, and the sets of them. One that this machine's architecture does not
// have is known by the negative number that libseccomp gives it.
std::map<std::string, long> SystemCalls() {
  // Some 470 are in use; the numbers grow by a few a year, and are the same on all newer machines.
  constexpr int kLastNumber = 1023;
  // The library counts those of other machines down from -10001, some 200 by now.
  constexpr int kFirstForeign = -10'999;
  constexpr int kLastForeign = -10'001;
  // Beyond every number of a call.
  constexpr long kFirstCallSet = 100'000;
  std::map<std::string, long> calls;
  AddSystemCalls(0, kLastNumber, calls);
  AddSystemCalls(kFirstForeign, kLastForeign, calls);
  for (const Policy::NewerCall& newer : Policy::NewerCalls()) {
    calls.emplace(newer.name, newer.number);
  }
  long set = kFirstCallSet;
  for (const Policy::CallSet& each : Policy::CallSets()) calls.emplace(each.name, set++);
  return calls;
}

bool IsSystemCall(std::string_view word) {
  if (Policy::FindCallSet(word) != nullptr) return true;
  if (std::ranges::count(Policy::NewerCalls(), word, &Policy::NewerCall::name) > 0) return true;
  return word.find('\0') == std::string_view::npos &&
         seccomp_syscall_resolve_name(std::string(word).c_str()) != __NR_SCMP_ERROR;
}

std::string WordAt(TeskAccess_KeywordType type, std::uint64_t id) {
  const Words words = ShortList(type);
  if (id >= words.size()) throw HostError(EINVAL, StrCat("unknown ", NounOf(type), " ", id));
  return words[id];
}

}  // namespace

std::map<std::string, long> KeywordTables::All(TeskAccess_KeywordType type) {
  if (type == TeskCtl::Security::TESKACCESS_KEYWORD_LABEL) return labels.All();
  return FixedWords(type);
}

std::map<std::string, long> FixedWords(TeskAccess_KeywordType type) {
  NounOf(type);
  if (type == TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL) return SystemCalls();
  std::map<std::string, long> keywords;
  for (const auto& word : ShortList(type)) {
    keywords.emplace(word, static_cast<long>(keywords.size()));
  }
  return keywords;
}

bool KeywordTables::Has(TeskAccess_KeywordType type, std::string_view word) {
  if (type == TeskCtl::Security::TESKACCESS_KEYWORD_LABEL) {
    return labels.Lookup(word) != kNoLabel || domains.Find(word) != nullptr;
  }
  if (type == TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL) return IsSystemCall(word);
  const Words words = ShortList(type);
  return std::find(words.begin(), words.end(), word) != words.end();
}

std::optional<HostError> KeywordTables::Refusal(TeskAccess_KeywordType type,
                                                std::string_view word) {
  const char* noun = NounOf(type);
  if (Has(type, word)) return std::nullopt;
  return HostError(EINVAL, StrCat("unknown ", noun, " '", word, "'"));
}

std::string CapabilityWord(std::uint64_t id) {
  return WordAt(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY, id);
}

std::string ParameterCheckWord(std::uint64_t id) {
  return WordAt(TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK, id);
}

}  // namespace LinuxHost
