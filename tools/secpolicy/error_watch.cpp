#include "error_watch.h"

#include <string_view>

namespace SecPolicyCli {
namespace {

constexpr std::string_view kErrorPrefix = "Error: ";

}  // namespace

ErrorWatch::ErrorWatch(std::ostream& watched) : stream(watched), target(watched.rdbuf(this)) {}

ErrorWatch::~ErrorWatch() { stream.rdbuf(target); }

ErrorWatch::int_type ErrorWatch::overflow(int_type letter) {
  if (traits_type::eq_int_type(letter, traits_type::eof())) return traits_type::not_eof(letter);
  Note(traits_type::to_char_type(letter));
  return target->sputc(traits_type::to_char_type(letter));
}

std::streamsize ErrorWatch::xsputn(const char* text, std::streamsize size) {
  for (std::streamsize i = 0; i < size; ++i) {
    Note(text[i]);
  }
  return target->sputn(text, size);
}

int ErrorWatch::sync() { return target->pubsync(); }

void ErrorWatch::Note(char letter) {
  if (letter != '\n') {
    line += letter;
    return;
  }
  if (line.starts_with(kErrorPrefix)) messages.push_back(line.substr(kErrorPrefix.size()));
  line.clear();
}

}  // namespace SecPolicyCli
