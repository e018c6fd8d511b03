#pragma once

#include <string>
#include <string_view>
#include <variant>

#include "json.h"

// The only file that knows the library for JSON is json_reader.cpp: its header costs seconds to
// compile.
namespace SecPolicyCli {

// Reads a document. Returns what is wrong with it instead when it is none, or is nested too deeply.
// A number that is no integer becomes null: nothing that is asked for is one.
std::variant<Json, std::string> ReadJson(std::string_view text);

}  // namespace SecPolicyCli
