#include "metrics.h"

#include <array>
#include <charconv>

namespace SecPolicyCli {
namespace {

// Long enough for the largest double without an exponent.
constexpr std::size_t kLongestNumber = 512;

std::string TextOf(double value) {
  std::array<char, kLongestNumber> digits{};
  const auto end = std::to_chars(digits.begin(), digits.end(), value, std::chars_format::fixed);
  return {digits.data(), end.ptr};
}

std::string Escaped(const std::string& text) {
  std::string escaped;
  for (const char character : text) {
    if (character == '\\' || character == '"') escaped += '\\';
    escaped += character == '\n' ? "\\n" : std::string(1, character);
  }
  return escaped;
}

std::string TextOf(const Sample& sample) {
  std::string text;
  for (const auto& [name, value] : sample.labels) {
    text += (text.empty() ? "{" : ",") + std::string(name) + "=\"" + Escaped(value) + '"';
  }
  if (!text.empty()) text += '}';
  return text + ' ' + TextOf(sample.value) + '\n';
}

}  // namespace

std::string TextOf(std::span<const Gauge> gauges) {
  std::string text;
  for (const Gauge& gauge : gauges) {
    const std::string name = gauge.name;
    text += "# HELP " + name + ' ' + gauge.help + "\n# TYPE " + name + " gauge\n";
    for (const Sample& sample : gauge.samples) text += name + TextOf(sample);
  }
  return text;
}

}  // namespace SecPolicyCli
