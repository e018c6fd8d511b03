// Numbered kernel calls of the Linux host: whatever the number and the arguments, it answers with
// success or an error, writes only where it was told to, and its state stays whole.
//
// An input is a program, one call a line: the number in hexadecimal, then the arguments.
//   42  -1  0xff     a number              self             the number of this process
//   t:TEXT           text with its NUL     u:TEXT           text without, where memory ends
//   c:TEXT           text, not writable    g                an address of nothing
//   o:SIZE           room for an answer    m:FIRST,LAST     a range of parameters
//   r:PERMISSION:PATH[;PERMISSION:PATH]... file policies

#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <list>
#include <sstream>
#include <string>
#include <vector>

#include "host/linux/state/host_state.h"
#include "secpolicyhost/mode_param.h"
#include "secpolicyhost/values.h"
#include "support/caller_memory.h"
#include "support/message_of.h"
#include "support/reference_reader.h"
#include "support/require.h"
#include "support/temporary_directory.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_ModeParam;
using TeskCtl::Security::TeskAccessInterfaceImpl;

constexpr std::size_t kMostArguments = 6;
constexpr std::uint32_t kGetDomainName = 0x4066;

// A call, and what its arguments are: "n" a number, "r" the address of what is read, "w" of four
// bytes to write, "c" of as many units to write as the argument `capacity` says.
struct Signature {
  std::uint32_t number;
  std::string_view arguments;
  std::size_t capacity = 0;
  std::uint64_t unit = 0;
};
constexpr Signature kSignatures[] = {
    {0x4059, "rnw"},
    {0x405a, "n"},
    {0x405b, "nrn"},
    {0x405c, "nnr"},
    {0x405d, "ncn", 2, sizeof(TeskAccess_FileRule)},
    {0x405e, "nw"},
    {0x405f, "nnrnw"},
    {0x4061, "nnn"},
    {0x4062, "nnrn"},
    {0x4064, "cwn", 2, sizeof(std::uint32_t)},
    {0x4065, "nw"},
    {kGetDomainName, "ncn", 2, 1},
    {0x4067, "rr"},
    {0x413e, "nnr"},
    {LinuxHost::kCallPlaceWorld, "nn"},
};

const Signature* Find(std::uint32_t number) {
  for (const Signature& signature : kSignatures) {
    if (signature.number == number) return &signature;
  }
  return nullptr;
}

// A connection of our own to the host's state, to look at it from outside.
class StateWitness {
 public:
  StateWitness() {
    Require(sqlite3_open_v2(getenv("SECPOLICY_HOST_STATE"), &database, SQLITE_OPEN_READONLY,
                            nullptr) == SQLITE_OK,
            "the state is a database");
  }
  StateWitness(const StateWitness&) = delete;
  StateWitness& operator=(const StateWitness&) = delete;
  ~StateWitness() { sqlite3_close(database); }

  // The first column of the first row, empty when there is none.
  std::string Ask(const std::string& query) {
    sqlite3_stmt* statement = nullptr;
    Require(sqlite3_prepare_v2(database, query.c_str(), -1, &statement, nullptr) == SQLITE_OK,
            query);
    std::string answer;
    if (sqlite3_step(statement) == SQLITE_ROW) {
      answer = reinterpret_cast<const char*>(sqlite3_column_text(statement, 0));
    }
    sqlite3_finalize(statement);
    return answer;
  }

  // Changes whenever another connection changes anything.
  std::string Version() { return Ask("PRAGMA data_version"); }

 private:
  sqlite3* database = nullptr;
};

// The state's directory, in the directory for temporary files, for as long as the process lives.
class StateDirectory {
 public:
  StateDirectory() {
    setenv("SECPOLICY_HOST_STATE", (directory / "host.db").c_str(), 1);
    LinuxHost::HostState::Current();
  }

 private:
  SecPolicyTest::TemporaryDirectory directory;
};

// Words that are no number are 0.
std::uint64_t Number(const std::string& word) { return std::strtoull(word.c_str(), nullptr, 0); }

std::string RangeBytes(const std::string& text) {
  const std::size_t comma = std::min(text.find(','), text.size());
  const TeskAccess_ModeParam range{Number(text.substr(0, comma)),
                                   Number(text.substr(std::min(comma + 1, text.size())))};
  return {reinterpret_cast<const char*>(&range), sizeof range};
}

// A path longer than its room has no end there.
std::string RuleBytes(const std::string& text) {
  std::string bytes;
  std::istringstream rules(text);
  std::string rule;
  while (std::getline(rules, rule, ';')) {
    const std::size_t colon = std::min(rule.find(':'), rule.size());
    TeskAccess_FileRule record{};
    record.permission = static_cast<unsigned int>(Number(rule.substr(0, colon)));
    const std::string path = rule.substr(std::min(colon + 1, rule.size()));
    std::memcpy(record.path, path.data(), std::min(path.size(), sizeof record.path));
    bytes.append(reinterpret_cast<const char*>(&record), sizeof record);
  }
  return bytes;
}

std::uint64_t Argument(const std::string& word, CallerMemory& memory) {
  if (word == "self") return static_cast<std::uint64_t>(getpid());
  if (word == "g") return memory.Nowhere();
  const std::string value = word.size() < 2 ? "" : word.substr(2);
  if (word.starts_with("t:")) return memory.Place(value + '\0');
  if (word.starts_with("u:")) return memory.Place(value);
  if (word.starts_with("c:")) return memory.PlaceConstant(value + '\0');
  if (word.starts_with("o:")) return memory.Place(std::string(Number(value) % 16'384, '\x5a'));
  if (word.starts_with("m:")) return memory.Place(RangeBytes(value));
  if (word.starts_with("r:")) return memory.Place(RuleBytes(value));
  return Number(word);
}

// A number in place of an address could be one of this process's own: it is made one that no
// process has.
std::uint64_t Harmless(std::uint64_t address, const std::string& word) {
  constexpr std::uint64_t kFirstPage = 4096;
  const bool isPlaced = word == "g" || (word.size() > 1 && word[1] == ':');
  return isPlaced || address < kFirstPage ? address : address | std::uint64_t{1} << 63;
}

std::vector<std::uint64_t> Arguments(const Words& words, const Signature* signature,
                                     CallerMemory& memory) {
  std::vector<std::uint64_t> arguments;
  for (std::size_t index = 1; index < words.size() && index <= kMostArguments; ++index) {
    std::uint64_t value = Argument(words[index], memory);
    const bool isAddress = signature != nullptr && index <= signature->arguments.size() &&
                           signature->arguments[index - 1] != 'n';
    if (isAddress) value = Harmless(value, words[index]);
    arguments.push_back(value);
  }
  return arguments;
}

Zorvan::Kernel::CallResult Call(std::uint32_t number, const std::vector<std::uint64_t>& a) {
  using Zorvan::Kernel::Call;
  switch (a.size()) {
    case 0:
      return Call(number, {});
    case 1:
      return Call(number, {a[0]});
    case 2:
      return Call(number, {a[0], a[1]});
    case 3:
      return Call(number, {a[0], a[1], a[2]});
    case 4:
      return Call(number, {a[0], a[1], a[2], a[3]});
    case 5:
      return Call(number, {a[0], a[1], a[2], a[3], a[4]});
    default:
      return Call(number, {a[0], a[1], a[2], a[3], a[4], a[5]});
  }
}

// What the call may write to its argument `index`, in bytes.
std::uint64_t MostWritten(const Signature& signature, std::size_t index,
                          const std::vector<std::uint64_t>& arguments) {
  switch (signature.arguments[index]) {
    case 'w':
      return sizeof(std::uint32_t);
    case 'c': {
      const std::uint64_t capacity = arguments[signature.capacity];
      return std::min(capacity, std::uint64_t{1} << 32) * signature.unit;
    }
    default:
      return 0;
  }
}

void CheckMemory(const Signature& signature, const std::vector<std::uint64_t>& arguments,
                 const CallerMemory& memory, const std::string& call) {
  for (std::size_t index = 0; index < arguments.size(); ++index) {
    Require(memory.Written(arguments[index]) <= MostWritten(signature, index, arguments),
            "a call writes only its answer: " + call);
  }
}

// Where there is such a domain, and room for its name, the call tells it.
void CheckName(const std::vector<std::uint64_t>& arguments, std::uint32_t status,
               const CallerMemory& memory, StateWitness& witness, const std::string& call) {
  const std::string name =
      arguments[0] > UINT32_MAX
          ? ""
          : witness.Ask("SELECT name FROM domain WHERE id = " + std::to_string(arguments[0]));
  const std::size_t room = std::min<std::uint64_t>(memory.RoomAt(arguments[1]), arguments[2]);
  Require(status != 0 || !name.empty(), "only a domain has a name: " + call);
  Require(status == 0 || name.empty() || room <= name.size(), "the name is told: " + call);
  if (status == 0) {
    RequireEqual(reinterpret_cast<const char*>(arguments[1]), name, "the name: " + call);
  }
}

void RunCall(const Words& words, CallerMemory& memory, StateWitness& witness) {
  const auto number = static_cast<std::uint32_t>(std::strtoul(words[0].c_str(), nullptr, 16));
  const Signature* signature = Find(number);
  const std::vector<std::uint64_t> arguments = Arguments(words, signature, memory);
  const std::string before = witness.Version();

  errno = EXFULL;
  const auto [status, error] = Call(number, arguments);
  const std::string call = Show(words);
  Require(errno == EXFULL, "a call leaves errno alone: " + call);
  Require(status == 0 ? error == 0 : error < 0, "a failure has an error, a success none: " + call);
  if (signature == nullptr) Require(error == -ENOSYS, "an unknown call is told so: " + call);
  const bool rightCount = signature != nullptr && arguments.size() == signature->arguments.size();
  if (!rightCount) Require(status != 0, "a wrong number of arguments is refused: " + call);
  if (rightCount) CheckMemory(*signature, arguments, memory, call);
  if (rightCount && number == kGetDomainName) CheckName(arguments, status, memory, witness, call);
  if (status != 0) Require(witness.Version() == before, "a failed call changes nothing: " + call);
  memory.Clear();
}

template <class Rule>
void ReadRules(unsigned int id, TeskAccessInterfaceImpl& access,
               void (TeskAccessInterfaceImpl::*get)(unsigned int, std::list<Rule>&)) {
  std::list<Rule> rules;
  (access.*get)(id, rules);
}

// Everything that the state holds can be shown.
void ReadEverything() {
  TeskAccessInterfaceImpl access;
  for (unsigned int id = 0; id < access.GetMaxDomains(); ++id) {
    std::string name, level;
    unsigned int state = 0, refCount = 0, worldRefCount = 0;
    TeskCtl::Security::TeskAccessKsi_DefaultDom dflt{};
    if (!access.GetCompleteDomainInfo(id, name, level, state, refCount, worldRefCount, dflt)) {
      continue;
    }
    unsigned int found = 0;
    Require(access.FindDomain(name, &found) && found == id, "a domain is found by its name");
    ReadRules(id, access, &TeskAccessInterfaceImpl::GetFilePathAccessRules);
    ReadRules(id, access, &TeskAccessInterfaceImpl::GetCapabilityRules);
    ReadRules(id, access, &TeskAccessInterfaceImpl::GetCapabilityParamRules);
    ReadRules(id, access, &TeskAccessInterfaceImpl::GetDomTransRules);
  }
}

void CheckState(StateWitness& witness) {
  RequireEqual(witness.Ask("PRAGMA integrity_check"), "ok", "the state is whole");
  RequireEqual(witness.Ask("SELECT name FROM domain WHERE id = 0"), "hostDom", "the start domain");
  RequireEqual(witness.Ask("SELECT count(*) FROM domain WHERE id NOT BETWEEN 0 AND 511 OR "
                           "length(CAST(name AS BLOB)) NOT BETWEEN 1 AND 63"),
               "0", "domains out of bounds");
  for (const char* table : {"rule", "parameter_rule", "file_policy", "world", "role"}) {
    RequireEqual(witness.Ask(std::string("SELECT count(*) FROM ") + table +
                             " WHERE domain_id NOT IN (SELECT id FROM domain)"),
                 "0", "entries of domains that are gone");
  }
  RequireEqual(MessageOf(ReadEverything), "", "reading the state");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const StateDirectory directory;
  static StateWitness witness;
  static CallerMemory memory;
  LinuxHost::HostState::Current().Reset();

  std::istringstream program{std::string(Text(data, size))};
  std::string line;
  while (std::getline(program, line)) {
    const Words words = ReadLine(line);
    if (!words.empty()) RunCall(words, memory, witness);
  }
  CheckState(witness);
  return 0;
}

}  // namespace SecPolicyFuzz
