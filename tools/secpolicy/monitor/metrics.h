#pragma once

#include <span>
#include <string>
#include <utility>
#include <vector>

namespace SecPolicyCli {

// One value of a metric, and the labels that tell it from the others.
struct Sample {
  std::vector<std::pair<const char*, std::string>> labels;
  double value = 0;
};

// A metric that may go up and down. Its name ends in the unit, if there is one.
struct Gauge {
  const char* name;
  const char* help;  // one line
  std::vector<Sample> samples;
};

// The metrics in the text format that Prometheus and its collectors read, version 0.0.4.
std::string TextOf(std::span<const Gauge> gauges);

}  // namespace SecPolicyCli
