#include <algorithm>
#include <array>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "host/linux/operation/host_words.h"
#include "json.h"
#include "policy/call_set.h"
#include "policy/rule_kind.h"
#include "query/ask.h"
#include "query/question.h"
#include "secpolicy/secpolicy.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Policy::CallSet;
using Policy::WordKind;

struct WordList {
  const char* name;
  WordKind kind;
};

constexpr std::array<WordList, 8> kLists = {{
    {"objects", WordKind::kLabel},
    {"accesses", WordKind::kObjectAccess},
    {"capabilities", WordKind::kCapability},
    {"transitions", WordKind::kTransition},
    {"files", WordKind::kFileKind},
    {"checks", WordKind::kParameterCheck},
    {"calls", WordKind::kSyscall},
    {"sockets", WordKind::kSocketKind},
}};

std::vector<std::string> NamesOfLists() {
  std::vector<std::string> names;
  names.reserve(kLists.size());
  for (const WordList& each : kLists) names.emplace_back(each.name);
  return names;
}

const WordList& FindList(const std::string& name) {
  const auto* const list = std::ranges::find(kLists, name, &WordList::name);
  if (list != kLists.end()) return *list;
  RefuseWord("kind of words", name, NamesOfLists());
}

// Labels are words of the installed policy, and all others of the host.
std::vector<std::string> WordsOf(WordKind kind) {
  const auto table = *FormOf(kind).table;
  const auto found = kind == WordKind::kLabel
                         ? SecPolicy::TeskAccessInterfaceImpl().GetKeywordsMap(table)
                         : LinuxHost::HostWords(table);
  std::vector<std::string> words;
  words.reserve(found.size());
  for (const auto& [word, id] : found) words.push_back(word);
  return words;
}

void WriteText(const std::vector<std::string>& words) {
  for (const std::string& word : words) {
    std::cout << Visible(word);
    if (const CallSet* const set = Policy::FindCallSet(word)) {
      std::cout << ": " << set->purpose << "\n ";
      for (const std::string_view member : set->members) std::cout << ' ' << member;
    }
    std::cout << '\n';
  }
}

Json ToJson(const std::string& word) {
  Json json = {{"word", word}};
  if (const CallSet* const set = Policy::FindCallSet(word)) {
    json["purpose"] = set->purpose;
    json["members"] = std::vector<std::string>(set->members.begin(), set->members.end());
  }
  return json;
}

void WriteJson(const char* kind, const std::vector<std::string>& words) {
  Json list = Json::Array();
  for (const std::string& word : words) list.Append(ToJson(word));
  std::cout << Json{{"schema", "secpolicy.words/1"}, {"kind", kind}, {"words", list}}.Text();
}

void ListKinds() {
  for (const WordList& list : kLists) std::cout << list.name << '\n';
}

ExitCode ListWords(const WordList& list, const std::string& format) {
  const std::vector<std::string> words = WordsOf(list.kind);
  if (format == "json") {
    WriteJson(list.name, words);
  } else {
    WriteText(words);
  }
  return kWell;
}

ExitCode Answer(const std::string& kind, const std::string& format) {
  if (kind.empty()) {
    ListKinds();
    return kWell;
  }
  const WordList& list = FindList(kind);
  if (list.kind != WordKind::kLabel) return ListWords(list, format);
  return Ask("words", [&] { return ListWords(list, format); });
}

Action Define(Syntax& syntax) {
  const auto kind = std::make_shared<std::string>();
  syntax.AddOption("KIND", *kind, "The kind of words; without it, the kinds are listed")
      .Offer(OfferWords(NamesOfLists()));
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Answer(*kind, *format); };
}

}  // namespace

const Verb kWords = {
    "words",
    "List the words that a rule may use, and what the sets among them hold",
    "Prints every word of one kind that this host knows. KIND is one of\n"
    "\n"
    "  objects         labels, behind -a, -d, -f, -u       as policy files declare them\n"
    "  accesses        behind -a LABEL                     read, write, execute, ...\n"
    "  capabilities    behind -c                           cap_chown, ...\n"
    "  transitions     behind -d LABEL DOMAIN              exec, enter, ...\n"
    "  files           behind -f LABEL NEWLABEL            regular, directory, ...\n"
    "  checks          behind -p                           bind_port, ...\n"
    "  calls           behind -s                           system calls, and sets of them: @start, "
    "...\n"
    "  sockets         behind -u LABEL                     stream, dgram, seqpacket\n"
    "\n"
    "Below a set of system calls stand its members.\n"
    "\n"
    "Examples:\n"
    "  secpolicy words calls\n"
    "  secpolicy words capabilities --format json",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
