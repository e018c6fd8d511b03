#include "gathering.h"

#include <cstring>
#include <limits>
#include <utility>

namespace SecPolicyCli {
namespace {

constexpr std::uint64_t kSecond = 1'000'000'000;

}  // namespace

Gathering::Key Gathering::KeyOf(const Enforce::ModuleEvent& event, std::string_view path) {
  return {
      event.domain,     event.act,
      event.detail,     event.value,
      event.label,      event.user,
      event.isRefused,  std::string(event.program, strnlen(event.program, sizeof event.program)),
      std::string(path)};
}

GatheredRefusal* Gathering::Add(const Enforce::ModuleEvent& event, std::string_view path) {
  Key key = KeyOf(event, path);
  const auto equal = byKey.find(key);
  if (equal != byKey.end()) {
    ++equal->second->count;
    return nullptr;
  }
  if (gathered.size() == kMost) {
    ++excess[event.domain];
    return nullptr;
  }
  gathered.push_back({.event = event, .path = std::string(path)});
  byKey.emplace(std::move(key), &gathered.back());
  return &gathered.back();
}

std::vector<GatheredRefusal> Gathering::TakeUntil(std::uint64_t time) {
  std::vector<GatheredRefusal> taken;
  while (!gathered.empty() && gathered.front().event.time + kSecond <= time) {
    GatheredRefusal& first = gathered.front();
    byKey.erase(KeyOf(first.event, first.path));
    taken.push_back(std::move(first));
    gathered.pop_front();
  }
  return taken;
}

std::vector<GatheredRefusal> Gathering::TakeAll() {
  return TakeUntil(std::numeric_limits<std::uint64_t>::max());
}

std::map<unsigned int, std::uint64_t> Gathering::TakeExcess() { return std::exchange(excess, {}); }

}  // namespace SecPolicyCli
