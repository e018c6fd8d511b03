#include "host/enforce/interpreter.h"

#include <elf.h>
#include <unistd.h>

#include <climits>
#include <cstring>
#include <string_view>

namespace Enforce {
namespace {

constexpr std::string_view kScriptMark = "#!";

// Of a longer line the kernel takes no more.
constexpr std::size_t kScriptLine = 256;

// At most `size` bytes, as far as the file has them.
std::string ReadAt(int file, std::uint64_t place, std::size_t size) {
  std::string bytes(size, '\0');
  const ssize_t count = pread(file, bytes.data(), bytes.size(), static_cast<off_t>(place));
  bytes.resize(count < 0 ? 0 : static_cast<std::size_t>(count));
  return bytes;
}

template <class Record>
bool ReadRecord(int file, std::uint64_t place, Record* record) {
  return pread(file, record, sizeof(Record), static_cast<off_t>(place)) == sizeof(Record);
}

// The first word of the first line.
std::string InterpreterOfScript(int program) {
  const std::string text = ReadAt(program, 0, kScriptLine);
  const std::string_view line = std::string_view(text).substr(0, text.find('\n'));
  const std::size_t first = line.find_first_not_of(" \t", kScriptMark.size());
  if (first == std::string_view::npos) return "";
  return std::string(line.substr(first, line.find_first_of(" \t", first) - first));
}

std::string LoaderOf(int program) {
  Elf64_Ehdr header;
  const bool isProgram = ReadRecord(program, 0, &header) &&
                         std::memcmp(header.e_ident, ELFMAG, SELFMAG) == 0 &&
                         header.e_ident[EI_CLASS] == ELFCLASS64;
  if (!isProgram) return "";
  for (unsigned int number = 0; number < header.e_phnum; ++number) {
    Elf64_Phdr segment;
    if (!ReadRecord(program, header.e_phoff + number * sizeof segment, &segment)) return "";
    if (segment.p_type != PT_INTERP || segment.p_filesz > PATH_MAX) continue;
    const std::string path = ReadAt(program, segment.p_offset, segment.p_filesz);
    return path.substr(0, path.find('\0'));
  }
  return "";
}

}  // namespace

bool IsScript(int program) { return ReadAt(program, 0, kScriptMark.size()) == kScriptMark; }

std::optional<Interpreter> InterpreterOf(int program) {
  const bool isScript = IsScript(program);
  std::string path = isScript ? InterpreterOfScript(program) : LoaderOf(program);
  if (path.empty()) return std::nullopt;
  return Interpreter{.path = std::move(path), .isLoader = !isScript};
}

}  // namespace Enforce
