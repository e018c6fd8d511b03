#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "error_list.h"
#include "json.h"
#include "progress_line.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// What LookupLabel answers where there is no such label.
constexpr std::uint32_t kNoSuchLabel = 1;

// One use of the verb: the connection to the host, and the way to the terminal. Throws what the
// host throws.
struct LabelRun {
  // `errorList` gets every error that is written. With `asJson`, a document takes the place of what
  // is printed.
  LabelRun(ErrorList& errorList, bool asJson) : isJson(asJson), errors(errorList) {}

  // Writes a line to standard output, control characters as ^I and the like.
  void Print(const std::string& line);

  // Writes the document, and the findings into it by the name `list`; nothing but for `isJson`.
  void PrintDocument(Json document, const char* list);

  // Writes an error to standard error.
  void Error(const std::string& message);

  // The identifier of the object label `name`, or kNoSuchLabel.
  std::uint32_t FindLabel(const std::string& name);

  // The name of the label `id`, or what can be said of a label that is gone.
  std::string NameOf(std::uint32_t id);

  const bool isJson;
  Json findings = Json::Array();  // for the document: an object for each file
  SecPolicy::TeskAccessInterfaceImpl access;
  ProgressLine progress;
  ErrorList& errors;
};

// Why a file has no label, for the error number `error` of reading it.
std::string WhyNoLabel(int error);

}  // namespace SecPolicyCli
