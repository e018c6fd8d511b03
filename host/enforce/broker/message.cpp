#include "host/enforce/broker/message.h"

#include <algorithm>
#include <cstring>

namespace Enforce {
namespace {

constexpr std::string_view kPassing[] = {"COLORTERM", "COLUMNS", "LANG",
                                         "LANGUAGE",  "LINES",   "TERM"};
constexpr std::string_view kPassingPrefix = "LC_";

// With these a value can be a path, or a format.
constexpr std::string_view kNotInValues = "/%";

// Goes before the words, each of which ends with a zero.
struct Header {
  std::uint32_t commandWords = 0;
  std::uint32_t variables = 0;
};

void Append(const std::vector<std::string>& words, std::string* bytes) {
  for (const std::string& word : words) bytes->append(word).push_back('\0');
}

// False when there are fewer words than that.
bool Take(std::uint32_t count, std::string_view* unread, std::vector<std::string>* words) {
  for (; count > 0; --count) {
    const std::size_t end = unread->find('\0');
    if (end == std::string_view::npos) return false;
    words->emplace_back(unread->substr(0, end));
    unread->remove_prefix(end + 1);
  }
  return true;
}

}  // namespace

bool MayBeHandedOn(std::string_view variable) {
  const std::size_t nameEnd = variable.find('=');
  if (nameEnd == std::string_view::npos) return false;
  const std::string_view name = variable.substr(0, nameEnd);
  const bool passes = name.starts_with(kPassingPrefix) ||
                      std::ranges::find(kPassing, name) != std::ranges::end(kPassing);
  return passes && variable.find_first_of(kNotInValues) == std::string_view::npos;
}

std::string Serialize(const EntryRequest& request) {
  const Header header = {static_cast<std::uint32_t>(request.command.size()),
                         static_cast<std::uint32_t>(request.environment.size())};
  std::string bytes(reinterpret_cast<const char*>(&header), sizeof(header));
  Append(request.command, &bytes);
  Append(request.environment, &bytes);
  return bytes;
}

bool Parse(std::string_view bytes, EntryRequest* request) {
  *request = {};
  Header header;
  if (bytes.size() < sizeof(header) || bytes.size() > kMostRequestBytes) return false;
  std::memcpy(&header, bytes.data(), sizeof(header));
  bytes.remove_prefix(sizeof(header));
  return header.commandWords > 0 && Take(header.commandWords, &bytes, &request->command) &&
         Take(header.variables, &bytes, &request->environment) && bytes.empty() &&
         std::ranges::all_of(request->environment, MayBeHandedOn);
}

}  // namespace Enforce
