#pragma once

#include <cstddef>
#include <ostream>
#include <streambuf>
#include <string>
#include <vector>

namespace SecPolicyCli {

// Passes everything on to the buffer of a stream and counts the errors that the library writes to
// it: some entry points return normally after an error, and standard error is where every one of
// them is seen, whichever log the host keeps.
class ErrorWatch : public std::streambuf {
 public:
  // Takes the place of the buffer of `watched` and gives it back at the end of its life.
  explicit ErrorWatch(std::ostream& watched);
  ErrorWatch(const ErrorWatch&) = delete;
  ErrorWatch& operator=(const ErrorWatch&) = delete;
  ~ErrorWatch() override;

  // The number of error lines so far.
  std::size_t Count() const { return messages.size(); }

  // The messages of the errors so far, without what marks them as errors.
  const std::vector<std::string>& Messages() const { return messages; }

 protected:
  int_type overflow(int_type letter) override;
  std::streamsize xsputn(const char* text, std::streamsize size) override;
  int sync() override;

 private:
  void Note(char letter);

  std::ostream& stream;
  std::streambuf* target;
  std::string line;
  std::vector<std::string> messages;
};

}  // namespace SecPolicyCli
