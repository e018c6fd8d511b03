#include "terminal_guard.h"

#include <unistd.h>

#include <string>
#include <string_view>

#include "visible.h"

namespace SecPolicyCli {

TerminalGuard::TerminalGuard(std::ostream& guarded, int descriptor)
    : stream(guarded), original(guarded.rdbuf()), terminal(original) {
  if (isatty(descriptor) == 1) stream.rdbuf(this);
}

TerminalGuard::~TerminalGuard() {
  stream.flush();
  stream.rdbuf(original);
}

TerminalGuard::int_type TerminalGuard::overflow(int_type letter) {
  if (traits_type::eq_int_type(letter, traits_type::eof())) return traits_type::not_eof(letter);
  const char character = traits_type::to_char_type(letter);
  return xsputn(&character, 1) == 1 ? letter : traits_type::eof();
}

// Every text is written in one piece, so that no character is cut.
std::streamsize TerminalGuard::xsputn(const char* text, std::streamsize size) {
  const std::string visible = VisibleLines(std::string_view(text, static_cast<std::size_t>(size)));
  const auto visibleSize = static_cast<std::streamsize>(visible.size());
  return terminal->sputn(visible.data(), visibleSize) == visibleSize ? size : 0;
}

int TerminalGuard::sync() { return terminal->pubsync(); }

}  // namespace SecPolicyCli
