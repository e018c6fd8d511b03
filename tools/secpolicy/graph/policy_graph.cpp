#include "policy_graph.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <vector>

#include "installed/rule_words.h"

namespace SecPolicyCli {
namespace {

using Attributes = DotGraph::Attributes;

constexpr char kObjectRule[] = "-a";
constexpr char kTransitionRule[] = "-d";
constexpr char kPathRule[] = "-r";
constexpr char kEnforcing[] = "enforcing";
constexpr char kPermissive[] = "permissive";

// Of a long list, what is shown.
constexpr std::size_t kShownLines = 12;

// Rules that are summarised in one box.
struct Summary {
  const char* keyword;
  const char* title;
};

constexpr std::array kSummaries = {
    Summary{"-c", "capabilities"},     Summary{"-f", "files it may create"},
    Summary{"-p", "parameter checks"}, Summary{"-s", "system calls"},
    Summary{"-u", "unix sockets"},
};

std::string Join(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += text.empty() ? word : " " + word;
  return text;
}

// The rules of one kind that grant something.
std::vector<RuleWords> GrantsOf(const InstalledDomain& domain, std::string_view keyword) {
  std::vector<RuleWords> grants;
  for (const InstalledRule& rule : domain.rules) {
    RuleWords words = SplitRule(rule.text);
    if (words.keyword == keyword && words.grant.value_or(true)) grants.push_back(std::move(words));
  }
  return grants;
}

// What is not enforced is not drawn solid.
Attributes LookOf(const InstalledDomain& domain) {
  if (domain.level == kEnforcing) return {};
  return {{"label", domain.name + "\n(" + domain.level + ")"},
          {"style", domain.level == kPermissive ? "rounded,dashed" : "rounded,dotted"}};
}

void DrawTransitions(const InstalledDomain& domain, DotGraph& graph) {
  for (const RuleWords& rule : GrantsOf(domain, kTransitionRule)) {
    graph.AddEdge(domain.name, rule.words.at(1), rule.words.at(0) + ", " + rule.words.at(2));
  }
}

// Names of different things may be equal: everything but domains has its kind in its name.
std::string NodeOf(const std::string& kind, const std::string& name) { return kind + " " + name; }

void DrawObjects(const InstalledDomain& domain, DotGraph& graph) {
  for (const RuleWords& rule : GrantsOf(domain, kObjectRule)) {
    const std::string& object = rule.words.at(0);
    const std::string node = NodeOf("object", object);
    graph.AddNode(node, {{"label", object}, {"shape", "ellipse"}, {"style", "solid"}});
    graph.AddEdge(domain.name, node, rule.words.at(1));
  }
}

void DrawPaths(const InstalledDomain& domain, DotGraph& graph) {
  for (const RuleWords& rule : GrantsOf(domain, kPathRule)) {
    const std::string& permissions = rule.words.at(1);
    if (permissions.empty()) continue;
    const std::string node = NodeOf("path", rule.words.at(0));
    graph.AddNode(node, {{"label", rule.words.at(0)}, {"shape", "folder"}, {"style", "solid"}});
    graph.AddEdge(domain.name, node, permissions);
  }
}

void DrawSummary(const Summary& summary, const InstalledDomain& domain, DotGraph& graph) {
  std::vector<std::string> lines;
  for (const RuleWords& rule : GrantsOf(domain, summary.keyword)) lines.push_back(Join(rule.words));
  if (lines.empty()) return;
  std::sort(lines.begin(), lines.end());
  if (lines.size() > kShownLines) {
    const std::size_t hidden = lines.size() - kShownLines;
    lines.resize(kShownLines);
    lines.push_back("and " + std::to_string(hidden) + " more");
  }
  std::string text = summary.title;
  for (const std::string& line : lines) text += "\n" + line;
  const std::string node = NodeOf("all", summary.title);
  graph.AddNode(node, {{"label", text}, {"shape", "note"}, {"style", "solid"}});
  graph.AddEdge(domain.name, node, "");
}

}  // namespace

DotGraph DrawDomains(const InstalledPolicy& policy) {
  DotGraph graph;
  for (const InstalledDomain& domain : policy.domains) {
    graph.AddNode(domain.name, LookOf(domain));
    DrawTransitions(domain, graph);
  }
  return graph;
}

DotGraph DrawDomain(const InstalledDomain& domain, const InstalledPolicy& policy) {
  DotGraph graph;
  DrawTransitions(domain, graph);
  for (const InstalledDomain& other : policy.domains) {
    const bool isDrawn = other.name == domain.name || graph.HasEdge(domain.name, other.name);
    if (isDrawn) graph.AddNode(other.name, LookOf(other));
  }
  DrawObjects(domain, graph);
  DrawPaths(domain, graph);
  for (const Summary& summary : kSummaries) DrawSummary(summary, domain, graph);
  return graph;
}

}  // namespace SecPolicyCli
