#pragma once

#include <ostream>
#include <streambuf>

namespace SecPolicyCli {

// Makes everything that goes to `stream` visible, as text/visible.h has it, while this object
// lives: also what the library writes, which holds names as they are. Where `descriptor` is no
// terminal, nothing is changed.
class TerminalGuard : public std::streambuf {
 public:
  TerminalGuard(std::ostream& guarded, int descriptor);
  TerminalGuard(const TerminalGuard&) = delete;
  TerminalGuard& operator=(const TerminalGuard&) = delete;
  ~TerminalGuard() override;

  // Where everything goes, guarded or not.
  std::streambuf& Target() { return *terminal; }

  // What is guarded goes to `other` from now on, which lasts longer than this object.
  void ForwardTo(std::streambuf& other) { terminal = &other; }

 protected:
  int_type overflow(int_type letter) override;
  std::streamsize xsputn(const char* text, std::streamsize size) override;
  int sync() override;

 private:
  std::ostream& stream;
  std::streambuf* const original;
  std::streambuf* terminal;
};

}  // namespace SecPolicyCli
