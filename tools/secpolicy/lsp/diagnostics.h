#pragma once

#include <functional>
#include <map>
#include <string>

#include "check/diagnostic.h"
#include "json.h"
#include "text_document.h"
#include "workspace.h"

namespace SecPolicyCli {

// What of the text a problem is about; that of a whole file is at its beginning.
Span SpanOf(const Diagnostic& diagnostic, const TextDocument& text);

// A problem as the protocol has it.
Json ToJson(const Diagnostic& diagnostic, const TextDocument& text);

// Tells the editor what is wrong with the files, and nothing twice.
class DiagnosticPublisher {
 public:
  using Publish = std::function<void(const Json& params)>;

  // Publishes the problems of the files that have changed since the last time. Throws what the host
  // throws.
  void Update(Workspace& workspace, const Publish& publish);

 private:
  std::map<std::string, Json> published;  // by URI
};

}  // namespace SecPolicyCli
