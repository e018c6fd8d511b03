#include "load_plan.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

using Lines = std::vector<std::string>;

void WriteSection(const std::string& heading, const Lines& lines, std::ostream& output,
                  std::optional<Color> color = std::nullopt) {
  SecPolicyCli::WriteSection(heading, lines, lines.size(), output, color);
}

std::string Arrow(const std::string& before, const std::string& after) {
  return before + " -> " + (after.empty() ? "(nothing)" : after);
}

}  // namespace

void WritePlanText(const LoadPlan& plan, std::size_t maxLabels, std::ostream& output) {
  Lines newDomains;
  Lines goneDomains;
  Lines added;
  Lines changed;
  Lines removed;
  for (const Policy::DomainDifference& domain : plan.difference.domains) {
    if (domain.IsNew()) newDomains.push_back(domain.name);
    if (domain.IsGone()) goneDomains.push_back(domain.name);
    const std::string prefix = domain.name + ": ";
    for (const Policy::Rule& rule : domain.added) added.push_back(prefix + rule.Text());
    for (const Policy::Rule& rule : domain.removed) removed.push_back(prefix + rule.Text());
    for (const auto& [before, after] : domain.changed) {
      changed.push_back(prefix + Arrow(before.Text(), TextOf(after.verdict)));
    }
  }
  Lines stayingRules;
  for (const auto& [domain, rule] : plan.stayingRules) {
    stayingRules.push_back(domain + ": " + rule.Text());
  }
  Lines labels;
  for (const auto& [path, before, after] : plan.labels) {
    labels.push_back(path + ": " + Arrow(before, after));
  }

  WriteSection("domains to create", newDomains, output, Color::kGood);
  WriteSection("domains to remove", goneDomains, output, Color::kBad);
  WriteSection("objects to add", plan.difference.objectsAdded, output, Color::kGood);
  WriteSection("objects to remove", plan.difference.objectsRemoved, output, Color::kBad);
  WriteSection("rules to add", added, output, Color::kGood);
  WriteSection("rules to change", changed, output, Color::kDoubtful);
  WriteSection("rules to remove", removed, output, Color::kBad);
  WriteSection("files to label anew", labels, maxLabels, output);
  WriteSection("domains that stay installed although no file defines them", plan.stayingDomains,
               output);
  WriteSection("rules that stay installed although found in no file", stayingRules, output);
}

}  // namespace SecPolicyCli
