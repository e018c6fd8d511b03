#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "diagnostics.h"
#include "json.h"
#include "protocol.h"
#include "verb.h"
#include "workspace.h"

namespace SecPolicyCli {

// A server of the Language Server Protocol 3.17, apart from how messages come and go.
class Server {
 public:
  using Send = std::function<void(const Json& message)>;

  Server(Workspace& files, Send sendMessage) : workspace(files), send(std::move(sendMessage)) {}

  // Does what a message asks for, and answers it if it is a request.
  void Receive(std::string_view content);

  // Tells the editor what has changed since. For when no more messages are there, so that of many
  // edits only the last is checked.
  void Update();

  // How the process is to end, once it was told to.
  std::optional<ExitCode> Ending() const { return ending; }

 private:
  enum class Phase { kFresh, kReady, kShutDown };

  void Handle(const Json& message);
  Json Answer(const std::string& method, const Json& params);
  void Note(const std::string& method, const Json& params);
  Json Initialize(const Json& params);
  void OpenDocument(const Json& params);
  void ChangeDocument(const Json& params);
  void CloseDocument(const Json& params);
  void SendError(const Json& id, ErrorCode code, const std::string& message);
  void Show(const std::string& message);

  Workspace& workspace;
  Send send;
  DiagnosticPublisher publisher;
  Phase phase = Phase::kFresh;
  std::string shownFailure;  // of the latest check
  std::optional<ExitCode> ending;
};

}  // namespace SecPolicyCli
