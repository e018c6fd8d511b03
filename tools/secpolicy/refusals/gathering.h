#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "host/enforce/module/map_entries.h"

namespace SecPolicyCli {

// Equal refusals: the first of them, and how many came within a second.
struct GatheredRefusal {
  Enforce::ModuleEvent event = {};
  std::string path = {};  // of the file that it was about, if any
  std::uint64_t count = 1;
  std::string programPath = {};  // for who adds it to look up
  std::string parentPath = {};
};

// Gathers refusals, so that whoever is refused much is told of little: equal ones of all processes
// with the same program are one within a second, and of too many different ones only the number is
// kept.
class Gathering {
 public:
  // Of different ones, so many are kept for a second.
  static constexpr std::size_t kMost = 64;

  // Adds a refusal. Returns the new one that begins with it; nothing where it is counted with
  // another. The pointer holds until the next call.
  GatheredRefusal* Add(const Enforce::ModuleEvent& event, std::string_view path);

  bool IsEmpty() const { return gathered.empty(); }

  // Takes those whose second is over at `time`, which is counted as that of events, in order.
  std::vector<GatheredRefusal> TakeUntil(std::uint64_t time);

  // Takes all that there are.
  std::vector<GatheredRefusal> TakeAll();

  // Takes the numbers of those that were too many, by their domains.
  std::map<unsigned int, std::uint64_t> TakeExcess();

 private:
  using Key = std::tuple<unsigned int, unsigned int, unsigned int, std::uint64_t, unsigned int,
                         unsigned int, unsigned int, std::string, std::string>;

  static Key KeyOf(const Enforce::ModuleEvent& event, std::string_view path);

  std::deque<GatheredRefusal> gathered;  // in the order in which they began
  std::map<Key, GatheredRefusal*> byKey;
  std::map<unsigned int, std::uint64_t> excess;
};

}  // namespace SecPolicyCli
