#pragma once

#include <exception>
#include <memory>
#include <string>

/// Failures.
namespace Braxo::Lib {

/// The body of an event-facility message. Only its handle travels through this system.
struct KweMessageBody;

/// Shared handle to an event-facility message; empty by default.
using KweMessage = std::shared_ptr<KweMessageBody>;

/// The one failure type of the host and of the policy library: a finished message for the user,
/// and optionally the event-facility message that belongs to it.
class __attribute__((visibility("default"))) BraxoException : public std::exception {
 public:
  /// Copies `text`; the event message stays empty.
  explicit BraxoException(const std::string& text) : message(text) {}

  /// Copies the NUL-terminated `text`, which must not be null; the event message stays empty.
  explicit BraxoException(const char* text) : message(text) {}

  /// Copies the text and shares the event message.
  BraxoException(const BraxoException&) = default;

  /// As the copy is made.
  BraxoException& operator=(const BraxoException&) = default;

  virtual ~BraxoException() = default;

  /// The message as a C string, owned by the exception.
  const char* what() const noexcept override { return message.c_str(); }

  /// The event message; empty unless a derived class was given one.
  const KweMessage& Message() const { return kweMessage; }

 protected:
  /// Copies `text` and shares `handle`.
  BraxoException(const std::string& text, const KweMessage& handle)
      : message(text), kweMessage(handle) {}

 private:
  std::string message;
  KweMessage kweMessage;
};

}  // namespace Braxo::Lib
