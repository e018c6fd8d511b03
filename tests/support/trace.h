#pragma once

#include <memory>
#include <streambuf>
#include <string>
#include <vector>

namespace SecPolicyTest {

// One ordered list of lines: everything that the library does to the world outside of it.
class Trace {
 public:
  // Appends a line, after whatever output is still open.
  void Add(const std::string& line);

  // What was written to a standard stream. A line of text that was flushed becomes `stdout
  // "text\n"`; text that was not flushed when the next thing happened becomes `stdout unflushed
  // "text\n"`.
  void Write(const std::string& stream, const char* text, std::size_t size);
  void Flush();

  // The number of lines that are closed.
  std::size_t Size() const { return lines.size(); }

  // Closes the open output and returns the lines.
  const std::vector<std::string>& Lines();

 private:
  void CloseOutput(const char* mark);

  std::vector<std::string> lines;
  std::string openStream;
  std::string openText;
};

// Puts a standard stream's writes and flushes into a trace, and keeps the whole text.
class CapturedStream : public std::streambuf {
 public:
  CapturedStream(Trace& trace, std::ostream& stream, const std::string& name);
  CapturedStream(const CapturedStream&) = delete;
  CapturedStream& operator=(const CapturedStream&) = delete;
  ~CapturedStream() override;

  const std::string& Text() const { return text; }

 protected:
  int_type overflow(int_type character) override;
  std::streamsize xsputn(const char* characters, std::streamsize count) override;
  int sync() override;

 private:
  Trace& trace;
  std::ostream& stream;
  std::streambuf* original;
  std::string name;
  std::string text;
};

// `text` in double quotes, with line ends, quotes and unprintable characters escaped.
std::string Quoted(const std::string& text);

}  // namespace SecPolicyTest
