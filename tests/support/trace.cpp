#include "support/trace.h"

#include <cstdio>
#include <ostream>

namespace SecPolicyTest {

void Trace::Add(const std::string& line) {
  CloseOutput(" unflushed");
  lines.push_back(line);
}

void Trace::Write(const std::string& stream, const char* text, std::size_t size) {
  if (stream != openStream) CloseOutput(" unflushed");
  openStream = stream;
  openText.append(text, size);
}

void Trace::Flush() {
  // A stream that flushes after every piece leaves the line open until its end.
  if (openText.ends_with('\n')) CloseOutput("");
}

const std::vector<std::string>& Trace::Lines() {
  CloseOutput(" unflushed");
  return lines;
}

void Trace::CloseOutput(const char* mark) {
  if (!openText.empty()) lines.push_back(openStream + mark + " " + Quoted(openText));
  openText.clear();
}

CapturedStream::CapturedStream(Trace& trace_, std::ostream& stream_, const std::string& name_)
    : trace(trace_), stream(stream_), original(stream_.rdbuf(this)), name(name_) {}

CapturedStream::~CapturedStream() { stream.rdbuf(original); }

CapturedStream::int_type CapturedStream::overflow(int_type character) {
  const char byte = traits_type::to_char_type(character);
  xsputn(&byte, 1);
  return character;
}

std::streamsize CapturedStream::xsputn(const char* characters, std::streamsize count) {
  const auto size = static_cast<std::size_t>(count);
  text.append(characters, size);
  trace.Write(name, characters, size);
  return count;
}

int CapturedStream::sync() {
  trace.Flush();
  return 0;
}

std::string Quoted(const std::string& text) {
  std::string quoted = "\"";
  for (const char character : text) {
    if (character == '\n') {
      quoted += "\\n";
    } else if (character == '"' || character == '\\') {
      quoted += '\\';
      quoted += character;
    } else if (static_cast<unsigned char>(character) < 0x20) {
      char escape[5];
      std::snprintf(escape, sizeof escape, "\\x%02x", static_cast<unsigned char>(character));
      quoted += escape;
    } else {
      quoted += character;
    }
  }
  return quoted + '"';
}

}  // namespace SecPolicyTest
