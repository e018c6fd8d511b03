#include "server.h"

#include <algorithm>
#include <exception>
#include <map>
#include <string>
#include <utility>
#include <variant>

#include "features.h"
#include "json_reader.h"
#include "protocol.h"

namespace SecPolicyCli {
namespace {

using Feature = Json (*)(Workspace& workspace, const Json& params);

const std::map<std::string_view, Feature> kAnswers = {
    {"textDocument/codeAction", FindFixes},        {"textDocument/completion", CompleteWord},
    {"textDocument/definition", FindDefinition},   {"textDocument/documentSymbol", ListSymbols},
    {"textDocument/formatting", FormatDocument},   {"textDocument/hover", Hover},
    {"textDocument/prepareRename", PrepareRename}, {"textDocument/rangeFormatting", FormatDocument},
    {"textDocument/references", FindReferences},   {"textDocument/rename", Rename},
};

Json Capabilities() {
  constexpr int kIncremental = 2;
  return {
      {"positionEncoding", "utf-16"},
      {"textDocumentSync",
       {{"openClose", true}, {"change", kIncremental}, {"save", {{"includeText", false}}}}},
      {"completionProvider", {{"triggerCharacters", std::vector<std::string>{" ", "-", "@", "/"}}}},
      {"hoverProvider", true},
      {"definitionProvider", true},
      {"referencesProvider", true},
      {"documentSymbolProvider", true},
      {"codeActionProvider", {{"codeActionKinds", std::vector<std::string>{"quickfix"}}}},
      {"documentFormattingProvider", true},
      {"documentRangeFormattingProvider", true},
      {"renameProvider", {{"prepareProvider", true}}}};
}

// Asks the editor to tell what others do to the files.
Json WatchFiles() {
  Json watchers = Json::Array();
  watchers.Append({{"globPattern", "**/{objects,domains,fileLabels,tardisks}/**"}});
  Json registrations = Json::Array();
  registrations.Append({{"id", "files"},
                        {"method", "workspace/didChangeWatchedFiles"},
                        {"registerOptions", {{"watchers", watchers}}}});
  return {{"jsonrpc", "2.0"},
          {"id", "watch"},
          {"method", "client/registerCapability"},
          {"params", {{"registrations", registrations}}}};
}

EditorAbilities AbilitiesOf(const Json& capabilities) {
  EditorAbilities abilities;
  const Json& watches = capabilities.At("didChangeWatchedFiles");
  abilities.watchesFiles = watches.At("dynamicRegistration").Truth().value_or(false);
  const Json& workspaceEdit = capabilities.At("workspaceEdit");
  const auto operations = workspaceEdit.At("resourceOperations").Elements();
  abilities.renamesFiles = std::ranges::find(operations, Json("rename")) != operations.end();
  // What renames files takes them in the form of edits that has versions, also where it tells of
  // no other use of it.
  abilities.takesVersions =
      abilities.renamesFiles || workspaceEdit.At("documentChanges").Truth().value_or(false);
  return abilities;
}

}  // namespace

void Server::Receive(std::string_view content) {
  const auto read = ReadJson(content);
  if (const std::string* const problem = std::get_if<std::string>(&read)) {
    SendError(Json(), ErrorCode::kParseError, "the message is no JSON: " + *problem);
    return;
  }
  Handle(std::get<Json>(read));
}

void Server::Handle(const Json& message) {
  const Json& id = message.At("id");
  const std::string* const method = message.At("method").String();
  if (method == nullptr) {
    // Answers have none, and nothing is made of them.
    const bool isAnswer = message.At("method").IsNull() && !id.IsNull();
    if (!isAnswer) SendError(id, ErrorCode::kInvalidRequest, "the message has no method");
    return;
  }
  try {
    if (id.IsNull()) {
      Note(*method, message.At("params"));
    } else {
      const Json result = Answer(*method, message.At("params"));
      send({{"jsonrpc", "2.0"}, {"id", id}, {"result", result}});
    }
  } catch (const RequestError& refusal) {
    if (!id.IsNull()) SendError(id, refusal.code, refusal.what());
  } catch (const std::exception& failure) {
    if (!id.IsNull()) return SendError(id, ErrorCode::kInternalError, failure.what());
    Show(failure.what());
  }
}

Json Server::Answer(const std::string& method, const Json& params) {
  if (phase == Phase::kFresh && method != "initialize") {
    throw RequestError(ErrorCode::kNotInitialized, "the server is not initialized");
  }
  if (phase == Phase::kShutDown) {
    throw RequestError(ErrorCode::kInvalidRequest, "the server is shut down");
  }
  if (method == "initialize") return Initialize(params);
  if (method == "shutdown") {
    phase = Phase::kShutDown;
    return {};
  }
  Update();
  const auto feature = kAnswers.find(method);
  if (feature != kAnswers.end()) return feature->second(workspace, params);
  throw RequestError(ErrorCode::kMethodNotFound, "there is no method " + method);
}

Json Server::Initialize(const Json& params) {
  if (phase != Phase::kFresh) {
    throw RequestError(ErrorCode::kInvalidRequest, "the server is initialized already");
  }
  phase = Phase::kReady;
  workspace.editor = AbilitiesOf(params.At("capabilities").At("workspace"));
  return {{"capabilities", Capabilities()},
          {"serverInfo", {{"name", "secpolicy"}, {"version", SECPOLICY_VERSION}}}};
}

// A notification that is not known may be ignored.
void Server::Note(const std::string& method, const Json& params) {
  if (method == "exit") {
    ending = phase == Phase::kShutDown ? kWell : kFailed;
  } else if (phase != Phase::kReady) {
    return;
  } else if (method == "initialized") {
    if (workspace.editor.watchesFiles) send(WatchFiles());
  } else if (method == "textDocument/didOpen") {
    OpenDocument(params);
  } else if (method == "textDocument/didChange") {
    ChangeDocument(params);
  } else if (method == "textDocument/didClose") {
    CloseDocument(params);
  } else if (method == "textDocument/didSave" || method == "workspace/didChangeWatchedFiles") {
    workspace.Forget();
  }
}

void Server::OpenDocument(const Json& params) {
  const Json& document = params.At("textDocument");
  const std::string& uri = ReadString(document, "uri");
  const auto path = Workspace::PathOf(uri);
  if (!path) return Show(uri + " is not below the root that this server is for");
  workspace.Open(*path, {.uri = uri,
                         .version = document.At("version").Number(),
                         .text = TextDocument(ReadString(document, "text"))});
}

void Server::ChangeDocument(const Json& params) {
  const auto path = Workspace::PathOf(ReadString(params.At("textDocument"), "uri"));
  auto* const document = path ? workspace.Find(*path) : nullptr;
  if (document == nullptr) return;
  for (const Json& change : params.At("contentChanges").Elements()) {
    const std::string& text = ReadString(change, "text");
    if (change.At("range").IsNull()) {
      document->text = TextDocument(text);
    } else {
      document->text.Replace(ReadRange(change.At("range")), text);
    }
  }
  document->version = params.At("textDocument").At("version").Number();
  workspace.Changed(*path);
}

void Server::CloseDocument(const Json& params) {
  const auto path = Workspace::PathOf(ReadString(params.At("textDocument"), "uri"));
  if (path) workspace.Close(*path);
}

void Server::Update() {
  if (phase != Phase::kReady) return;
  try {
    publisher.Update(workspace, [this](const Json& params) {
      send({{"jsonrpc", "2.0"}, {"method", "textDocument/publishDiagnostics"}, {"params", params}});
    });
    shownFailure.clear();
  } catch (const std::exception& failure) {
    // It fails again at each edit until somebody does something about it.
    if (shownFailure == failure.what()) return;
    shownFailure = failure.what();
    Show(shownFailure);
  }
}

void Server::SendError(const Json& id, ErrorCode code, const std::string& message) {
  send({{"jsonrpc", "2.0"},
        {"id", id},
        {"error", {{"code", static_cast<int>(code)}, {"message", message}}}});
}

void Server::Show(const std::string& message) {
  constexpr int kErrorMessage = 1;
  send({{"jsonrpc", "2.0"},
        {"method", "window/showMessage"},
        {"params", {{"type", kErrorMessage}, {"message", "secpolicy: " + message}}}});
}

}  // namespace SecPolicyCli
