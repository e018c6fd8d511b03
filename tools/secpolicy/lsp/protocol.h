#pragma once

#include <stdexcept>
#include <string>

#include "json.h"
#include "text_document.h"

// Values of the protocol as JSON.
namespace SecPolicyCli {

// The codes of JSON-RPC and of the protocol for what is wrong with a message.
enum class ErrorCode {
  kParseError = -32700,
  kInvalidRequest = -32600,
  kMethodNotFound = -32601,
  kInvalidParams = -32602,
  kInternalError = -32603,
  kNotInitialized = -32002,
  kRequestFailed = -32803,
};

// A request cannot be answered; the message says why.
class RequestError : public std::runtime_error {
 public:
  RequestError(ErrorCode errorCode, const std::string& message)
      : std::runtime_error(message), code(errorCode) {}

  ErrorCode code;
};

Json ToJson(Position position);
Json ToJson(Range range);

// {"uri": …, "range": …}
Json LocationOf(const std::string& uri, Range range);

// {"range": …, "newText": …}
Json TextEdit(Range range, const std::string& text);

// These throw RequestError when there is no such value.
Position ReadPosition(const Json& json);
Range ReadRange(const Json& json);
const std::string& ReadString(const Json& json, const char* name);

}  // namespace SecPolicyCli
