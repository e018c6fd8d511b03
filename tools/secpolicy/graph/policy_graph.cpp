#include "policy_graph.h"

#include <algorithm>
#include <span>
#include <string>
#include <vector>

#include "policy/decision.h"

namespace SecPolicyCli {
namespace {

using Attributes = DotGraph::Attributes;
using Policy::InstalledDomain;
using Policy::InstalledPolicy;
using Policy::Level;
using Policy::Rule;
using Policy::RuleKind;

// Of a long list, what is shown.
constexpr std::size_t kShownLines = 12;

std::string Join(std::span<const std::string> words) {
  std::string text;
  for (const std::string& word : words) text += text.empty() ? word : " " + word;
  return text;
}

// The rules of one kind that grant something.
std::vector<const Rule*> GrantsOf(const InstalledDomain& domain, RuleKind kind) {
  std::vector<const Rule*> grants = RulesOf(domain, kind);
  std::erase_if(grants, [](const Rule* rule) { return !rule->Grants(); });
  return grants;
}

// What is not enforced is not drawn solid.
Attributes LookOf(const InstalledDomain& domain) {
  if (domain.level == Level::kEnforcing) return {};
  return {{"label", domain.name + "\n(" + TextOf(domain.level) + ")"},
          {"style", domain.level == Level::kPermissive ? "rounded,dashed" : "rounded,dotted"}};
}

void DrawTransitions(const InstalledDomain& domain, DotGraph& graph) {
  for (const Rule* const rule : GrantsOf(domain, RuleKind::kDomainTransition)) {
    const auto& [object, target, kind] = rule->words;
    graph.AddEdge(domain.name, target, object + ", " + kind);
  }
}

// Names of different things may be equal: everything but domains has its kind in its name.
std::string NodeOf(const std::string& kind, const std::string& name) { return kind + " " + name; }

void DrawObjects(const InstalledDomain& domain, DotGraph& graph) {
  for (const Rule* const rule : GrantsOf(domain, RuleKind::kObjectAccess)) {
    const std::string& object = rule->words[0];
    const std::string node = NodeOf("object", object);
    graph.AddNode(node, {{"label", object}, {"shape", "ellipse"}, {"style", "solid"}});
    graph.AddEdge(domain.name, node, rule->words[1]);
  }
}

void DrawPaths(const InstalledDomain& domain, DotGraph& graph) {
  for (const Rule* const rule : GrantsOf(domain, RuleKind::kFilePath)) {
    const std::string& path = rule->words[0];
    const std::string node = NodeOf("path", path);
    graph.AddNode(node, {{"label", path}, {"shape", "folder"}, {"style", "solid"}});
    graph.AddEdge(domain.name, node, TextOf(rule->verdict));
  }
}

void DrawList(const Policy::RuleForm& form, const InstalledDomain& domain, DotGraph& graph) {
  std::vector<std::string> lines;
  for (const Rule* const rule : GrantsOf(domain, form.kind)) lines.push_back(Join(rule->Words()));
  if (lines.empty()) return;
  std::sort(lines.begin(), lines.end());
  if (lines.size() > kShownLines) {
    const std::size_t hidden = lines.size() - kShownLines;
    lines.resize(kShownLines);
    lines.push_back("and " + std::to_string(hidden) + " more");
  }
  std::string text = form.listTitle;
  for (const std::string& line : lines) text += "\n" + line;
  const std::string node = NodeOf("all", form.listTitle);
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
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    if (form.listTitle != nullptr) DrawList(form, domain, graph);
  }
  return graph;
}

}  // namespace SecPolicyCli
