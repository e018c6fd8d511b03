// Hunts metrics that a collector reads as others than they are: a value that ends its label, a
// number in a notation of its own.

#include "monitor/metrics.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using SecPolicyCli::Gauge;
using SecPolicyCli::TextOf;

TEST(Metrics, ThatHaveLabels) {
  const std::vector<Gauge> gauges = {
      {"one", "What it is.", {{{{"a", "x"}, {"b", "y z"}}, 1}, {{{"a", "v"}}, 2}}},
      {"none", "Nothing.", {}}};
  EXPECT_EQ(TextOf(gauges),
            "# HELP one What it is.\n# TYPE one gauge\none{a=\"x\",b=\"y z\"} 1\none{a=\"v\"} 2\n"
            "# HELP none Nothing.\n# TYPE none gauge\n");
}

TEST(Metrics, EscapeWhatWouldEndALabel) {
  const std::vector<Gauge> gauges = {{"one", "It.", {{{{"a", "\"q\" \\ \n"}}, 1}}}};
  EXPECT_EQ(TextOf(gauges), "# HELP one It.\n# TYPE one gauge\none{a=\"\\\"q\\\" \\\\ \\n\"} 1\n");
}

TEST(Metrics, WriteNumbersInFull) {
  const std::vector<Gauge> gauges = {
      {"one", "It.", {{{}, 1795339514}, {{}, 0.25}, {{}, 0}, {{}, 1e15}}}};
  EXPECT_EQ(TextOf(gauges),
            "# HELP one It.\n# TYPE one gauge\none 1795339514\none 0.25\none 0\n"
            "one 1000000000000000\n");
}

}  // namespace
