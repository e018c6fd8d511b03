#include "completion.h"

#include <cstdlib>
#include <exception>
#include <filesystem>
#include <iostream>
#include <system_error>

#include "host/linux/operation/log_use.h"
#include "root.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

const char* NameOf(OfferedFiles files) {
  switch (files) {
    case OfferedFiles::kFiles:
      return "files";
    case OfferedFiles::kDirectories:
      return "directories";
    case OfferedFiles::kPrograms:
      return "programs";
    case OfferedFiles::kNone:
      break;
  }
  return "words";
}

// A shell hands on what is typed, in which it would replace the name of the home directory.
std::string WithoutTilde(const std::string& path) {
  const char* const home = std::getenv("HOME");
  return path.starts_with("~/") && home != nullptr ? home + path.substr(1) : path;
}

// What lies in the directory that `typed` is in, or is itself when it ends in a slash.
std::vector<OfferedWord> PathsAt(const std::string& typed, OfferedFiles files) {
  const std::string dir = typed.substr(0, typed.rfind('/') + 1);
  std::vector<OfferedWord> paths;
  std::error_code failure;
  std::filesystem::directory_iterator entry(dir.empty() ? "." : dir, failure);
  for (; !failure && entry != std::filesystem::directory_iterator(); entry.increment(failure)) {
    std::error_code unknown;
    const bool isDir = entry->is_directory(unknown);
    if (!isDir && files == OfferedFiles::kDirectories) continue;
    paths.push_back({dir + entry->path().filename().string() + (isDir ? "/" : "")});
  }
  return paths;
}

// What cannot be typed as it is shown is left out.
void WriteWord(const std::string& fixed, const OfferedWord& offered) {
  if (Visible(offered.word) != offered.word) return;
  std::cout << fixed << offered.word;
  if (!offered.meaning.empty()) std::cout << '\t' << Visible(offered.meaning);
  std::cout << '\n';
}

Offer OfferAt(const WordPlace& place, const std::string& typed) {
  Offer offer{.words = place.words};
  if (!place.offering) return offer;
  if (place.root) EnterRoot(WithoutTilde(*place.root));
  offer = place.offering(place.before);
  if (!place.root || offer.files == OfferedFiles::kNone) return offer;
  for (OfferedWord& path : PathsAt(typed.substr(place.fixed.size()), offer.files)) {
    offer.words.push_back(std::move(path));
  }
  offer.files = OfferedFiles::kNone;
  return offer;
}

}  // namespace

ExitCode Complete(CommandLine& line, std::vector<std::string> words) {
  if (words.empty()) words.emplace_back();
  try {
    const LinuxHost::DroppedLog dropped;
    const WordPlace place = line.FindPlace(words);
    const Offer offer = OfferAt(place, words.back());
    std::cout << NameOf(offer.files) << '\n';
    for (const OfferedWord& word : offer.words) WriteWord(place.fixed, word);
  } catch (const std::exception&) {
    return kFailed;
  }
  return kWell;
}

}  // namespace SecPolicyCli
