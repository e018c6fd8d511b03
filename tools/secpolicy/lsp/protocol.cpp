#include "protocol.h"

namespace SecPolicyCli {
namespace {

std::size_t ReadCount(const Json& json, const char* name) {
  const auto number = json.At(name).Number();
  if (number && *number >= 0) return static_cast<std::size_t>(*number);
  throw RequestError(ErrorCode::kInvalidParams, std::string("there is no number '") + name + "'");
}

}  // namespace

Json ToJson(Position position) {
  return {{"line", position.line}, {"character", position.character}};
}

Json ToJson(Range range) { return {{"start", ToJson(range.start)}, {"end", ToJson(range.end)}}; }

Json LocationOf(const std::string& uri, Range range) {
  return {{"uri", uri}, {"range", ToJson(range)}};
}

Json TextEdit(Range range, const std::string& text) {
  return {{"range", ToJson(range)}, {"newText", text}};
}

Position ReadPosition(const Json& json) {
  return {.line = ReadCount(json, "line"), .character = ReadCount(json, "character")};
}

Range ReadRange(const Json& json) {
  return {ReadPosition(json.At("start")), ReadPosition(json.At("end"))};
}

const std::string& ReadString(const Json& json, const char* name) {
  if (const std::string* const text = json.At(name).String()) return *text;
  throw RequestError(ErrorCode::kInvalidParams, std::string("there is no text '") + name + "'");
}

}  // namespace SecPolicyCli
