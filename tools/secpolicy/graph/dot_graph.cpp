#include "dot_graph.h"

#include <algorithm>

#include "text/visible.h"

namespace SecPolicyCli {
namespace {

constexpr char kHead[] =
    "digraph secpolicy {\n"
    "  rankdir=LR\n"
    "  node [shape=box, style=rounded, fontname=\"sans-serif\"]\n"
    "  edge [fontname=\"sans-serif\", fontsize=10]\n";

// Line feeds stay line breaks; what else could mean something inside the quotes is escaped.
std::string Quote(const std::string& text) {
  std::string quoted = "\"";
  for (std::string_view rest = text; !rest.empty();) {
    const std::string_view character = TakeCharacter(rest);
    if (character == "\n") {
      quoted += "\\n";
      continue;
    }
    if (character == "\"" || character == "\\") quoted += '\\';
    AppendVisible(quoted, character);
  }
  return quoted + "\"";
}

std::string Format(const DotGraph::Attributes& attributes) {
  if (attributes.empty()) return "";
  std::string text;
  for (const auto& [name, value] : attributes) {
    text += text.empty() ? " [" : ", ";
    text += name + "=" + Quote(value);
  }
  return text + "]";
}

std::string JoinLines(std::vector<std::string> lines) {
  std::sort(lines.begin(), lines.end());
  std::string text;
  for (const std::string& line : lines) text += text.empty() ? line : "\n" + line;
  return text;
}

}  // namespace

void DotGraph::AddNode(const std::string& id, Attributes attributes) {
  nodes.insert_or_assign(id, std::move(attributes));
}

void DotGraph::AddEdge(const std::string& from, const std::string& to, const std::string& label) {
  std::vector<std::string>& labels = edges[{from, to}];
  if (!label.empty()) labels.push_back(label);
}

std::string DotGraph::Text() const {
  std::string text = kHead;
  for (const auto& [id, attributes] : nodes) {
    text += "  " + Quote(id) + Format(attributes) + "\n";
  }
  for (const auto& [edge, labels] : edges) {
    Attributes attributes;
    if (!labels.empty()) attributes["label"] = JoinLines(labels);
    text += "  " + Quote(edge.first) + " -> " + Quote(edge.second) + Format(attributes) + "\n";
  }
  return text + "}\n";
}

}  // namespace SecPolicyCli
