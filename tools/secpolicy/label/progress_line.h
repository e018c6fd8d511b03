#pragma once

#include <chrono>
#include <cstddef>
#include <string>

namespace SecPolicyCli {

// A line that shows how far a long job is, on standard error when that is a terminal, and nowhere
// else. The line is gone when the job is done.
class ProgressLine {
 public:
  ProgressLine();
  ProgressLine(const ProgressLine&) = delete;
  ProgressLine& operator=(const ProgressLine&) = delete;
  ~ProgressLine() { Clear(); }

  bool IsShown() const { return isShown; }

  // A job begins that does `what`, on `total` files; 0: how many is not known.
  void Begin(const std::string& what, std::size_t total);

  // One more file is done.
  void Step();

  // Takes the line off the terminal, for something else to be written; the next step brings it
  // back.
  void Clear();

  // The latest state of the job, and then no line any more.
  void End();

 private:
  using Clock = std::chrono::steady_clock;

  void Draw();
  std::string Text() const;

  const bool isShown;
  std::string job;
  std::size_t count = 0;
  std::size_t totalCount = 0;
  Clock::time_point start;
  Clock::time_point lastDrawn;
  std::size_t width = 0;  // of what the terminal shows now
};

}  // namespace SecPolicyCli
