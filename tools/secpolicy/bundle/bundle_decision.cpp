#include "bundle/bundle_decision.h"

#include <algorithm>
#include <iterator>
#include <tuple>

#include "text/format.h"

namespace SecPolicyCli {
namespace {

constexpr char kWayOut[] = ". --allow-older takes it all the same.";

}  // namespace

std::string NameBundle(const Manifest& manifest) {
  return manifest.name + ", serial " + std::to_string(manifest.serial);
}

std::string WhyNotNewer(const Manifest& installed, const Manifest& offered) {
  if (offered == installed) return "";
  if (offered.name != installed.name) {
    return "it is " + NameBundle(offered) + ", and " + NameBundle(installed) +
           " is installed: of two policies none is newer" + kWayOut;
  }
  if (offered.serial < installed.serial) {
    return "it is older than what is installed: its serial is " + std::to_string(offered.serial) +
           ", and that of what is installed " + std::to_string(installed.serial) + kWayOut;
  }
  if (offered.serial > installed.serial) return "";
  return "it has the serial of what is installed, " + std::to_string(installed.serial) +
         ", and is another" + kWayOut;
}

std::vector<std::string> EditedFiles(const std::vector<BundledFile>& named,
                                     const std::vector<BundledFile>& found) {
  const auto precedes = [](const BundledFile& one, const BundledFile& other) {
    return std::tie(one.path, one.digest) < std::tie(other.path, other.digest);
  };
  std::vector<BundledFile> differing;
  std::ranges::set_symmetric_difference(named, found, std::back_inserter(differing), precedes);
  std::vector<std::string> names;
  for (const BundledFile& file : differing) {
    if (names.empty() || names.back() != file.path) names.push_back(file.path);
  }
  return names;
}

std::string FirstOf(const std::vector<std::string>& names) {
  constexpr std::size_t kShown = 10;
  if (names.size() <= kShown) return ListOf(names, "and");
  std::vector<std::string> words(names.begin(), names.begin() + kShown);
  words.push_back(std::to_string(names.size() - kShown) + " more");
  return ListOf(words, "and");
}

}  // namespace SecPolicyCli
