#pragma once

#include <concepts>
#include <cstdint>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace SecPolicyCli {

// A value of a JSON document. The members of an object keep the order in which they were added.
class Json {
 public:
  using Member = std::pair<std::string, Json>;

  Json();  // null
  Json(std::same_as<bool> auto truth) : Json(OfTruth(truth)) {}
  template <std::integral Number>
  requires(!std::same_as<Number, bool>) Json(Number number)
      : Json(OfNumber(static_cast<std::int64_t>(number))) {}
  Json(const char* text);
  Json(std::string text);
  Json(const std::vector<std::string>& texts);
  Json(std::initializer_list<Member> members);

  Json(const Json& other);
  Json(Json&& other) noexcept;
  Json& operator=(const Json& other);
  Json& operator=(Json&& other) noexcept;
  ~Json();

  static Json Array();
  static Json Object();

  // Adds an element to an array.
  void Append(Json element);

  // The member `name` of an object, which gets it when it has none.
  Json& operator[](const std::string& name);

  // Adds the members of `other`, which has none of those that this object has.
  void Add(const Json& other);

  // The text of the document, indented, with a line end. Bytes that are no UTF-8 are replaced, not
  // refused: a path need not be text.
  std::string Text() const;

  // The same on one line, without a line end.
  std::string Line() const;

  // What is there, for who reads a document: null, nothing or an empty list stands for what is
  // missing or of another type.
  const Json& At(std::string_view name) const;
  std::span<const Json> Elements() const;
  std::optional<bool> Truth() const;
  std::optional<std::int64_t> Number() const;
  const std::string* String() const;
  bool IsNull() const;
  bool IsObject() const;

  bool operator==(const Json& other) const;

 private:
  using Values = std::vector<Json>;
  using Members = std::vector<Member>;
  using Value = std::variant<std::monostate, bool, std::int64_t, std::string, Values, Members>;

  explicit Json(Value content);
  static Json OfTruth(bool truth);
  static Json OfNumber(std::int64_t number);

  void Write(std::string& output, std::optional<std::size_t> indent) const;

  Value value;
};

}  // namespace SecPolicyCli
