#pragma once

#include <sys/types.h>

#include <streambuf>
#include <string>
#include <vector>

#include "host/linux/common/descriptor.h"
#include "size.h"

namespace SecPolicyCli {

// The program that turns pages, and its arguments: what SECPOLICY_PAGER or else PAGER says, split
// at blanks, or less(1). Nothing where that is empty or cat(1).
std::vector<std::string> PagerCommand();

// Takes what is for the terminal that standard output is. What is longer than it is shown by a
// pager; a pager that is left early has shown enough, and one that cannot be started is none. It is
// started outside the root that may be entered later. As long as it takes text, no process may be
// forked that writes.
class Pager : public std::streambuf {
 public:
  // Throws HostError when it cannot be made.
  Pager(std::vector<std::string> command, const TerminalSize& size);
  Pager(const Pager&) = delete;
  Pager& operator=(const Pager&) = delete;
  ~Pager() override;

  // Shows what is not shown yet, and waits until the pager is left. What comes later goes to the
  // terminal. False when it could not be written.
  bool End();

 protected:
  int_type overflow(int_type letter) override;
  std::streamsize xsputn(const char* text, std::streamsize size) override;

 private:
  enum class State { kHolding, kPaging, kDone };

  void CountRows(std::string_view text);
  void StartPaging();

  const TerminalSize terminal;
  State state = State::kHolding;
  std::string held;
  std::size_t rows = 0;
  std::size_t column = 0;
  LinuxHost::Descriptor pipe{-1};
  pid_t child = -1;
};

}  // namespace SecPolicyCli
