#include "progress_line.h"

#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "braxo/misc/strcat.h"
#include "terminal/size.h"

namespace SecPolicyCli {
namespace {

using Braxo::Misc::StrCat;

constexpr std::chrono::milliseconds kBetweenDrawings{100};
constexpr std::size_t kStepsBetweenLooks = 64;  // at the clock
constexpr std::size_t kBarWidth = 16;

// Not by way of a stream: the errors on it are counted line by line, and this is no line of them.
void WriteTerminal(const std::string& text) {
  [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, text.data(), text.size());
}

std::string Bar(std::size_t count, std::size_t total) {
  const std::size_t full = std::min(count * kBarWidth / total, kBarWidth);
  return "[" + std::string(full, '#') + std::string(kBarWidth - full, '.') + "]";
}

std::string Minutes(std::size_t seconds) {
  const std::size_t rest = seconds % 60;
  return StrCat(seconds / 60, rest < 10 ? ":0" : ":", rest);
}

}  // namespace

ProgressLine::ProgressLine() : isShown(isatty(STDERR_FILENO) == 1) {}

void ProgressLine::Begin(const std::string& what, std::size_t total) {
  job = what;
  count = 0;
  totalCount = total;
  start = Clock::now();
  if (isShown) Draw();
}

void ProgressLine::Step() {
  ++count;
  if (!isShown || count % kStepsBetweenLooks != 0) return;
  if (Clock::now() - lastDrawn >= kBetweenDrawings) Draw();
}

void ProgressLine::End() {
  if (isShown) Draw();
  Clear();
}

void ProgressLine::Clear() {
  if (width == 0) return;
  WriteTerminal("\r" + std::string(width, ' ') + "\r");
  width = 0;
}

void ProgressLine::Draw() {
  // The last column stays free: some terminals go to the next line after it.
  const TerminalSize size = SizeOfTerminal(STDERR_FILENO).value_or(TerminalSize());
  const std::string text = Text().substr(0, size.columns - 1);
  const std::size_t rest = width - std::min(width, text.size());
  WriteTerminal("\r" + text + std::string(rest, ' '));
  width = text.size() + rest;
  lastDrawn = Clock::now();
}

std::string ProgressLine::Text() const {
  const double seconds = std::chrono::duration<double>(Clock::now() - start).count();
  const double rate = seconds > 0 ? static_cast<double>(count) / seconds : 0;
  const std::string pace = StrCat(static_cast<std::size_t>(rate), " files/s");
  if (totalCount == 0) return StrCat(job, " ", count, " files, ", pace);
  std::string text =
      StrCat(job, " ", Bar(count, totalCount), " ", count, "/", totalCount, " files, ", pace);
  if (count == 0 || rate <= 0) return text;
  const double left = static_cast<double>(totalCount - std::min(count, totalCount)) / rate;
  return StrCat(text, ", ", Minutes(static_cast<std::size_t>(std::lround(left))), " left");
}

}  // namespace SecPolicyCli
