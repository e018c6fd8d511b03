#include "json_reader.h"

#include <limits>
#include <nlohmann/json.hpp>
#include <utility>
#include <vector>

namespace SecPolicyCli {
namespace {

constexpr std::size_t kDeepest = 64;

// Builds the document as it is read.
class Builder : public nlohmann::json_sax<nlohmann::json> {
 public:
  bool null() override { return Add(Json()); }
  bool boolean(bool truth) override { return Add(truth); }
  bool number_integer(number_integer_t number) override { return Add(number); }
  bool number_unsigned(number_unsigned_t number) override {
    constexpr auto kHighest = std::numeric_limits<std::int64_t>::max();
    return Add(number > static_cast<number_unsigned_t>(kHighest) ? Json() : Json(number));
  }
  bool number_float(number_float_t /*number*/, const string_t& /*text*/) override {
    return Add(Json());
  }
  bool string(string_t& text) override { return Add(std::move(text)); }
  bool binary(binary_t& /*bytes*/) override { return false; }
  bool start_object(std::size_t /*size*/) override { return Open(Json::Object()); }
  bool start_array(std::size_t /*size*/) override { return Open(Json::Array()); }
  bool key(string_t& name) override {
    open.back().name = std::move(name);
    return true;
  }
  bool end_object() override { return Close(); }
  bool end_array() override { return Close(); }
  bool parse_error(std::size_t /*position*/, const std::string& /*token*/,
                   const nlohmann::detail::exception& failure) override {
    problem = failure.what();
    return false;
  }

  Json document;
  std::string problem;

 private:
  struct Container {
    Json value;
    std::string name = {};  // of the member that comes next
  };

  bool Open(Json empty) {
    if (open.size() == kDeepest) {
      problem = "it is nested too deeply";
      return false;
    }
    open.push_back({std::move(empty)});
    return true;
  }

  bool Close() {
    Json closed = std::move(open.back().value);
    open.pop_back();
    return Add(std::move(closed));
  }

  bool Add(Json value) {
    if (open.empty()) {
      document = std::move(value);
    } else if (open.back().value.IsObject()) {
      open.back().value[open.back().name] = std::move(value);
    } else {
      open.back().value.Append(std::move(value));
    }
    return true;
  }

  std::vector<Container> open;
};

}  // namespace

std::variant<Json, std::string> ReadJson(std::string_view text) {
  Builder builder;
  if (nlohmann::json::sax_parse(text, &builder)) return std::move(builder.document);
  return builder.problem;
}

}  // namespace SecPolicyCli
