// Hunts names that end a quoted text of a drawing, and drawings that depend on the order of
// drawing.

#include "graph/dot_graph.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using SecPolicyCli::DotGraph;

// What stands between the braces, without the defaults of the first lines.
std::string BodyOf(const DotGraph& graph) {
  const std::string empty = DotGraph().Text();
  const std::string head = empty.substr(0, empty.size() - 2);
  const std::string text = graph.Text();
  EXPECT_TRUE(text.starts_with(head));
  EXPECT_TRUE(text.ends_with("}\n"));
  return text.substr(head.size(), text.size() - head.size() - 2);
}

TEST(DotGraph, QuotesWhatMeansSomethingInQuotes) {
  DotGraph graph;
  graph.AddNode("a\"b\\c\nd\x1b", {{"shape", "box"}, {"label", "x"}});
  EXPECT_EQ(BodyOf(graph), "  \"a\\\"b\\\\c\\nd^[\" [label=\"x\", shape=\"box\"]\n");
}

TEST(DotGraph, IsTheSameInWhateverOrderItWasMade) {
  DotGraph one;
  one.AddNode("b");
  one.AddNode("a");
  one.AddEdge("b", "a", "y");
  one.AddEdge("a", "b", "");
  one.AddEdge("b", "a", "x");
  DotGraph other;
  other.AddEdge("a", "b", "");
  other.AddEdge("b", "a", "x");
  other.AddEdge("b", "a", "y");
  other.AddNode("a");
  other.AddNode("b");
  EXPECT_EQ(one.Text(), other.Text());
  EXPECT_EQ(BodyOf(one),
            "  \"a\"\n  \"b\"\n  \"a\" -> \"b\"\n  \"b\" -> \"a\" [label=\"x\\ny\"]\n");
}

TEST(DotGraph, KnowsItsEdgesByTheirDirection) {
  DotGraph graph;
  graph.AddEdge("a", "b", "x");
  EXPECT_TRUE(graph.HasEdge("a", "b"));
  EXPECT_FALSE(graph.HasEdge("b", "a"));
}

}  // namespace
