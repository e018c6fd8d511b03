#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "json.h"
#include "text_document.h"
#include "words.h"
#include "workspace.h"

namespace SecPolicyCli {

// A place in a file of a policy.
struct Cursor {
  LivePolicy& policy;
  std::string path;
  FileRole role;
  TextDocument text;
  std::size_t line;    // of the library
  std::size_t column;  // in bytes from the beginning of the line
  std::vector<PlacedWord> words;
  const PlacedWord* word;  // of those, the one that it stands in or at; null when there is none

  // Where in the text the word of its line is.
  Range RangeOf(const PlacedWord& placed) const;
};

// The place that the parameters tell, TextDocumentPositionParams of the protocol; null for one in a
// file that is none of a policy. Throws RequestError for parameters that are none, and what the
// host throws.
std::unique_ptr<const Cursor> FindCursor(Workspace& workspace, const Json& params);

// The path of the document that the parameters name; throws as FindCursor does.
std::string PathOfDocument(const Json& params);

// What of the text a word in the line with this number is.
Span SpanInText(const TextDocument& text, std::size_t line, Span word);

}  // namespace SecPolicyCli
