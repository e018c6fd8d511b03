#include "json.h"

#include <algorithm>
#include <string_view>

#include "text/visible.h"

namespace SecPolicyCli {
namespace {

constexpr std::size_t kIndent = 2;
constexpr std::string_view kReplacement = "\xef\xbf\xbd";  // U+FFFD

// What a text begins with: a character of UTF-8, or bytes that are none, of which those that could
// have become one count as one mistake.
struct Character {
  std::size_t size;
  bool isValid;
};

Character FirstCharacter(std::string_view text) {
  const auto byte = [text](std::size_t index) {
    return index < text.size() ? static_cast<unsigned char>(text[index]) : 0;
  };
  const int lead = byte(0);
  if (lead < 0x80) return {1, true};
  if (lead < 0xc2 || lead > 0xf4) return {1, false};
  // The second byte tells longer forms, surrogates and what is beyond Unicode.
  int lowest = lead == 0xe0 ? 0xa0 : lead == 0xf0 ? 0x90 : 0x80;
  int highest = lead == 0xed ? 0x9f : lead == 0xf4 ? 0x8f : 0xbf;
  const std::size_t size = lead < 0xe0 ? 2 : lead < 0xf0 ? 3 : 4;
  for (std::size_t index = 1; index < size; ++index) {
    if (byte(index) < lowest || byte(index) > highest) return {index, false};
    lowest = 0x80;
    highest = 0xbf;
  }
  return {size, true};
}

void WriteNumber(std::uint32_t character, std::string& output) {
  constexpr char kDigits[] = "0123456789abcdef";
  output += "\\u";
  for (int shift = 12; shift >= 0; shift -= 4) output += kDigits[character >> shift & 0xf];
}

// Every document is safe to show, and says the same.
void WriteCharacter(std::string_view character, std::string& output) {
  if (const auto unsafe = UnsafeNumber(character)) return WriteNumber(*unsafe, output);
  output += character;
}

// The letter that stands for `byte` behind a backslash; 0 when there is none.
char ShortEscape(char byte) {
  constexpr std::string_view kBytes = "\"\\\b\f\n\r\t";
  constexpr std::string_view kLetters = "\"\\bfnrt";
  const std::size_t place = kBytes.find(byte);
  return place == std::string_view::npos ? '\0' : kLetters[place];
}

void WriteByte(char byte, std::string& output) {
  if (const char letter = ShortEscape(byte)) {
    output += '\\';
    output += letter;
  } else {
    WriteCharacter(std::string_view(&byte, 1), output);
  }
}

void WriteText(std::string_view text, std::string& output) {
  output += '"';
  while (!text.empty()) {
    const Character first = FirstCharacter(text);
    if (!first.isValid) {
      output += kReplacement;
    } else if (first.size == 1) {
      WriteByte(text.front(), output);
    } else {
      WriteCharacter(text.substr(0, first.size), output);
    }
    text.remove_prefix(first.size);
  }
  output += '"';
}

// Begins a line; on one line, only sets items apart.
void BreakLine(std::optional<std::size_t> indent, std::string& output) {
  if (indent) output.append("\n").append(*indent, ' ');
}

// Writes `items` between `open` and `close`: with an indent, one to a line.
template <class Items, class WriteItem>
void WriteItems(const Items& items, char open, char close, std::optional<std::size_t> indent,
                std::string& output, WriteItem writeItem) {
  const auto inner = indent ? std::optional(*indent + kIndent) : std::nullopt;
  output += open;
  const char* separator = "";
  for (const auto& item : items) {
    output += separator;
    BreakLine(inner, output);
    writeItem(item, inner);
    separator = ",";
  }
  if (!items.empty()) BreakLine(indent, output);
  output += close;
}

}  // namespace

// All of them are compiled here, once: units that use documents are many.
Json::Json() = default;
Json::Json(Value content) : value(std::move(content)) {}
Json::Json(const char* text) : value(std::string(text)) {}
Json::Json(std::string text) : value(std::move(text)) {}
Json::Json(const std::vector<std::string>& texts) : value(Values(texts.begin(), texts.end())) {}
Json::Json(std::initializer_list<Member> members) : value(Members(members)) {}

Json::Json(const Json& other) = default;
Json::Json(Json&& other) noexcept = default;
Json& Json::operator=(const Json& other) = default;
Json& Json::operator=(Json&& other) noexcept = default;
Json::~Json() = default;

Json Json::OfTruth(bool truth) { return Json(Value(truth)); }
Json Json::OfNumber(std::int64_t number) { return Json(Value(number)); }
Json Json::Array() { return Json(Value(Values())); }
Json Json::Object() { return Json(Value(Members())); }

void Json::Append(Json element) { std::get<Values>(value).push_back(std::move(element)); }

Json& Json::operator[](const std::string& name) {
  Members& members = std::get<Members>(value);
  const auto found = std::find_if(members.begin(), members.end(),
                                  [&](const Member& member) { return member.first == name; });
  if (found != members.end()) return found->second;
  return members.emplace_back(name, Json()).second;
}

void Json::Add(const Json& other) {
  Members& members = std::get<Members>(value);
  const Members& added = std::get<Members>(other.value);
  members.insert(members.end(), added.begin(), added.end());
}

std::string Json::Text() const {
  std::string text;
  Write(text, 0);
  return text + "\n";
}

std::string Json::Line() const {
  std::string text;
  Write(text, std::nullopt);
  return text;
}

const Json& Json::At(std::string_view name) const {
  static const Json missing;
  const Members* const members = std::get_if<Members>(&value);
  if (members == nullptr) return missing;
  const auto found = std::ranges::find(*members, name, &Member::first);
  return found == members->end() ? missing : found->second;
}

std::span<const Json> Json::Elements() const {
  const Values* const values = std::get_if<Values>(&value);
  if (values == nullptr) return {};
  return *values;
}

std::optional<bool> Json::Truth() const {
  const bool* const truth = std::get_if<bool>(&value);
  return truth == nullptr ? std::nullopt : std::optional(*truth);
}

std::optional<std::int64_t> Json::Number() const {
  const std::int64_t* const number = std::get_if<std::int64_t>(&value);
  return number == nullptr ? std::nullopt : std::optional(*number);
}

const std::string* Json::String() const { return std::get_if<std::string>(&value); }

bool Json::IsNull() const { return std::holds_alternative<std::monostate>(value); }

bool Json::IsObject() const { return std::holds_alternative<Members>(value); }

bool Json::operator==(const Json& other) const { return value == other.value; }

void Json::Write(std::string& output, std::optional<std::size_t> indent) const {
  if (const bool* const truth = std::get_if<bool>(&value)) {
    output += *truth ? "true" : "false";
  } else if (const std::int64_t* const number = std::get_if<std::int64_t>(&value)) {
    output += std::to_string(*number);
  } else if (const std::string* const text = std::get_if<std::string>(&value)) {
    WriteText(*text, output);
  } else if (const Values* const values = std::get_if<Values>(&value)) {
    WriteItems(*values, '[', ']', indent, output,
               [&](const Json& element, auto inner) { element.Write(output, inner); });
  } else if (const Members* const members = std::get_if<Members>(&value)) {
    WriteItems(*members, '{', '}', indent, output, [&](const Member& member, auto inner) {
      WriteText(member.first, output);
      output += ": ";
      member.second.Write(output, inner);
    });
  } else {
    output += "null";
  }
}

}  // namespace SecPolicyCli
