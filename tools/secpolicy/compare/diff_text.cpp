#include <map>

#include "policy_diff.h"
#include "terminal/color.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Policy::DomainDifference;

// Writes the lines of one heading, which is written before the first of them.
class Section {
 public:
  Section(const std::string& title, std::ostream& stream) : heading(title), output(stream) {}

  void Removed(const std::string& text) { Write(Color::kBad, "- " + Visible(text)); }
  void Added(const std::string& text) { Write(Color::kGood, "+ " + Visible(text)); }

  void Heading() {
    if (heading.empty()) return;
    output << Painted{Color::kPlace, "@@ " + Visible(heading)} << '\n';
    heading.clear();
  }

 private:
  void Write(Color color, const std::string& line) {
    Heading();
    output << Painted{color, line} << '\n';
  }

  std::string heading;
  std::ostream& output;
};

// A rule on either side; empty where there is none.
using RulePair = std::pair<std::string, std::string>;

// By what they are about, so that a change stands together.
std::map<Policy::Rule, RulePair, Policy::BySubject> PairsOf(const DomainDifference& domain) {
  std::map<Policy::Rule, RulePair, Policy::BySubject> pairs;
  for (const Policy::Rule& rule : domain.removed) pairs[rule] = {rule.Text(), ""};
  for (const Policy::Rule& rule : domain.added) pairs[rule] = {"", rule.Text()};
  for (const auto& [before, after] : domain.changed) pairs[before] = {before.Text(), after.Text()};
  return pairs;
}

std::string LevelLine(Policy::Level level) { return std::string("level ") + TextOf(level); }

void WriteDomain(const DomainDifference& domain, const Comparison& diff, std::ostream& output) {
  Section section(TitleOf(domain, diff), output);
  section.Heading();
  if (domain.levelBefore != domain.levelAfter) {
    if (!domain.IsNew()) section.Removed(LevelLine(*domain.levelBefore));
    if (!domain.IsGone()) section.Added(LevelLine(*domain.levelAfter));
  }
  for (const auto& [subject, pair] : PairsOf(domain)) {
    if (!pair.first.empty()) section.Removed(pair.first);
    if (!pair.second.empty()) section.Added(pair.second);
  }
}

}  // namespace

std::string TitleOf(const DomainDifference& domain, const Comparison& diff) {
  const std::string title = "domain " + domain.name;
  if (domain.IsNew()) return title + " (only in " + diff.after + ")";
  return domain.IsGone() ? title + " (only in " + diff.before + ")" : title;
}

void WriteDiffText(const Comparison& diff, std::ostream& output) {
  if (diff.IsSame()) return;
  output << "--- " << Visible(diff.before) << "\n+++ " << Visible(diff.after) << '\n';
  for (const DomainDifference& domain : diff.difference.domains) WriteDomain(domain, diff, output);

  Section objects("objects", output);
  for (const std::string& name : diff.difference.objectsRemoved) objects.Removed(name);
  for (const std::string& name : diff.difference.objectsAdded) objects.Added(name);

  if (!diff.labels) return;
  Section labels("file labels", output);
  for (const auto& [path, before, after] : *diff.labels) {
    if (!before.empty()) labels.Removed(path + " " + before);
    if (!after.empty()) labels.Added(path + " " + after);
  }
}

}  // namespace SecPolicyCli
