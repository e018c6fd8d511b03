#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace SecPolicyCli {

// A directed graph in the DOT language. The same nodes and edges give the same text, in whatever
// order they were added.
class DotGraph {
 public:
  // An attribute and its value: {"shape", "box"}.
  using Attributes = std::map<std::string, std::string>;

  // Adds the node `id`, which is its text too unless there is an attribute "label".
  void AddNode(const std::string& id, Attributes attributes = {});

  // Adds an edge between two nodes. The labels of an edge stand below each other; an empty one is
  // none.
  void AddEdge(const std::string& from, const std::string& to, const std::string& label);

  bool HasEdge(const std::string& from, const std::string& to) const {
    return edges.contains({from, to});
  }

  // The text of the graph.
  std::string Text() const;

 private:
  using Edge = std::pair<std::string, std::string>;

  std::map<std::string, Attributes> nodes;
  std::map<Edge, std::vector<std::string>> edges;
};

}  // namespace SecPolicyCli
