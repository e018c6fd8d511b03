#include "policy/mention.h"

#include "policy/call_set.h"

namespace Policy {
namespace {

bool Means(WordKind kind, std::string_view ruleWord, std::string_view word) {
  if (kind == WordKind::kPath) return Covers(ruleWord, word);
  if (kind == WordKind::kSyscall) return SpeaksOfCall(ruleWord, word);
  return ruleWord == word;
}

}  // namespace

bool SpeaksOf(const Rule& rule, WordKind kind, std::string_view word) {
  std::size_t index = 0;
  for (const WordKind ruleWord : FormOf(rule.kind).Words()) {
    if (ruleWord == kind && Means(kind, rule.words[index], word)) return true;
    ++index;
  }
  return false;
}

bool Covers(std::string_view rulePath, std::string_view path) {
  if (rulePath == path || rulePath == "/") return true;
  return path.starts_with(rulePath) && (rulePath.ends_with('/') || path[rulePath.size()] == '/');
}

}  // namespace Policy
