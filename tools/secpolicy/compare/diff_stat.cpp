#include "policy_diff.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// What became of some things of one kind.
struct Tally {
  const char* noun;
  std::size_t removed = 0;
  std::size_t added = 0;
  std::size_t changed = 0;
};

// "2 rules added, 1 rule removed"; empty where nothing became of any.
std::string TextOf(const Tally& tally) {
  std::string text;
  const auto add = [&](std::size_t count, const char* what) {
    if (count == 0) return;
    text += (text.empty() ? "" : ", ") + CountOf(count, tally.noun) + " " + what;
  };
  add(tally.removed, "removed");
  add(tally.added, "added");
  add(tally.changed, "changed");
  return text;
}

std::string TextOf(const Policy::DomainDifference& domain) {
  std::string rules = TextOf(Tally{.noun = "rule",
                                   .removed = domain.removed.size(),
                                   .added = domain.added.size(),
                                   .changed = domain.changed.size()});
  if (domain.IsNew() || domain.IsGone() || domain.levelBefore == domain.levelAfter) return rules;
  const std::string level =
      std::string("level ") + TextOf(*domain.levelBefore) + " -> " + TextOf(*domain.levelAfter);
  return rules.empty() ? level : level + ", " + rules;
}

Tally Count(const std::vector<LabelDifference>& labels) {
  Tally tally{.noun = "line"};
  for (const auto& [path, before, after] : labels) {
    ++(before.empty() ? tally.added : after.empty() ? tally.removed : tally.changed);
  }
  return tally;
}

void WriteLine(const std::string& title, const std::string& text, std::ostream& output) {
  output << Visible(title) << (text.empty() ? "" : ": ") << text << '\n';
}

}  // namespace

void WriteDiffStat(const Comparison& diff, std::ostream& output) {
  for (const Policy::DomainDifference& domain : diff.difference.domains) {
    WriteLine(TitleOf(domain, diff), TextOf(domain), output);
  }
  const std::string objects = TextOf(Tally{.noun = "object",
                                           .removed = diff.difference.objectsRemoved.size(),
                                           .added = diff.difference.objectsAdded.size()});
  if (!objects.empty()) WriteLine("objects", objects, output);
  if (diff.labels && !diff.labels->empty()) {
    WriteLine("file labels", TextOf(Count(*diff.labels)), output);
  }
}

}  // namespace SecPolicyCli
