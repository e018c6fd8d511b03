#pragma once

#include "json.h"
#include "workspace.h"

// What an editor can ask for, by the parameters and results of the protocol. All throw RequestError
// for parameters that are none, and what the host throws.
namespace SecPolicyCli {

// textDocument/completion: the words that can stand at the cursor.
Json CompleteWord(Workspace& workspace, const Json& params);

// textDocument/hover: what the rule at the cursor says, and what else speaks of its words.
Json Hover(Workspace& workspace, const Json& params);

// textDocument/definition: where a label is declared, or the file of a domain.
Json FindDefinition(Workspace& workspace, const Json& params);

// textDocument/references: where the word at the cursor stands, in all files.
Json FindReferences(Workspace& workspace, const Json& params);

// textDocument/prepareRename and textDocument/rename: of labels and domains.
Json PrepareRename(Workspace& workspace, const Json& params);
Json Rename(Workspace& workspace, const Json& params);

// textDocument/formatting and textDocument/rangeFormatting.
Json FormatDocument(Workspace& workspace, const Json& params);

// textDocument/codeAction: what mends the problems of a range.
Json FindFixes(Workspace& workspace, const Json& params);

// textDocument/documentSymbol: the lines of a file.
Json ListSymbols(Workspace& workspace, const Json& params);

}  // namespace SecPolicyCli
