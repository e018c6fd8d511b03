#include "metrics.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

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

void ReplaceFile(const std::string& path, const std::string& text) {
  constexpr mode_t kForAll = 0644;
  constexpr char kCannotWrite[] = "cannot write ";
  const std::filesystem::path wanted = path;
  // Collectors pass over a name without their ending.
  std::string name = wanted.parent_path() / ("." + wanted.filename().string() + ".XXXXXX");
  const LinuxHost::Descriptor file(mkostemp(name.data(), O_CLOEXEC));
  if (!file.IsOpen()) LinuxHost::ThrowErrno(kCannotWrite, path);
  if (LinuxHost::WriteAll(file.Number(), text) && fchmod(file.Number(), kForAll) == 0 &&
      rename(name.c_str(), path.c_str()) == 0) {
    return;
  }
  const int error = errno;
  unlink(name.c_str());
  errno = error;
  LinuxHost::ThrowErrno(kCannotWrite, path);
}

}  // namespace SecPolicyCli
