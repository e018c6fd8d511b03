#include <map>

#include "policy_diff.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Writes the lines of one heading, which is written before the first of them.
class Section {
 public:
  Section(const std::string& title, std::ostream& stream) : heading(title), output(stream) {}

  void Removed(const std::string& text) { Write("- ", text); }
  void Added(const std::string& text) { Write("+ ", text); }

  void Heading() {
    if (!heading.empty()) output << "@@ " << Visible(heading) << '\n';
    heading.clear();
  }

 private:
  void Write(const char* mark, const std::string& text) {
    Heading();
    output << mark << Visible(text) << '\n';
  }

  std::string heading;
  std::ostream& output;
};

// A rule on either side; empty where there is none.
using RulePair = std::pair<std::string, std::string>;

// By what they are about, so that a change stands together.
std::map<std::string, RulePair> PairsOf(const DomainDifference& domain) {
  std::map<std::string, RulePair> pairs;
  for (const std::string& rule : domain.removed) pairs[SubjectOf(rule)] = {rule, ""};
  for (const std::string& rule : domain.added) pairs[SubjectOf(rule)] = {"", rule};
  for (const auto& [before, after] : domain.changed) pairs[SubjectOf(before)] = {before, after};
  return pairs;
}

std::string TitleOf(const DomainDifference& domain, const PolicyDiff& diff) {
  const std::string title = "domain " + domain.name;
  if (domain.IsNew()) return title + " (only in " + diff.after + ")";
  return domain.IsGone() ? title + " (only in " + diff.before + ")" : title;
}

void WriteDomain(const DomainDifference& domain, const PolicyDiff& diff, std::ostream& output) {
  Section section(TitleOf(domain, diff), output);
  section.Heading();
  if (domain.levelBefore != domain.levelAfter) {
    if (!domain.IsNew()) section.Removed("level " + domain.levelBefore);
    if (!domain.IsGone()) section.Added("level " + domain.levelAfter);
  }
  for (const auto& [subject, pair] : PairsOf(domain)) {
    if (!pair.first.empty()) section.Removed(pair.first);
    if (!pair.second.empty()) section.Added(pair.second);
  }
}

}  // namespace

void WriteDiffText(const PolicyDiff& diff, std::ostream& output) {
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
