// The file: a head of fixed size, then the places, each as the number of bytes that its path begins
// with as the one before, the number of those that follow, the label with the kind in its lowest
// bit, and the bytes; then a checksum. It is read by the machine that wrote it, so words have that
// one's order; numbers within places take as many bytes as they need.
#include "host/enforce/label_index.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"
#include "host/enforce/checksum.h"

namespace Enforce {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

using Magic = std::array<char, 8>;
constexpr Magic kMagic = {'Z', 'o', 'r', 'v', 'L', 'a', 'b', '\n'};
constexpr std::uint32_t kVersion = 1;

struct Head {
  Magic magic = kMagic;
  std::uint32_t version = kVersion;
  std::uint32_t reserved = 0;
  std::uint64_t device = 0;
  std::uint64_t serial = 0;
  std::uint64_t count = 0;  // of places
};

class File {
 public:
  explicit File(int opened) : descriptor(opened) {}
  File(const File&) = delete;
  File& operator=(const File&) = delete;
  ~File() {
    if (descriptor >= 0) close(descriptor);
  }

  int Number() const { return descriptor; }

 private:
  const int descriptor;
};

[[noreturn]] void ThrowErrno(const char* action, const std::string& file) {
  throw BraxoException(
      StrCat("Unable to ", action, " the label index ", file, ": ", std::strerror(errno)));
}

[[noreturn]] void ThrowDamaged(const std::string& file, const char* reason) {
  throw BraxoException(StrCat("The label index ", file, " is damaged (", reason,
                              "). Run \"secpolicy load\", which makes a new one"));
}

template <class Value>
void AppendBytes(std::string& text, const Value& value) {
  text.append(reinterpret_cast<const char*>(&value), sizeof value);
}

// Seven bits a byte, the lowest first; all but the last have the eighth bit set.
void AppendNumber(std::string& text, std::uint64_t number) {
  for (; number >= 0x80; number >>= 7) text += static_cast<char>((number & 0x7f) | 0x80);
  text += static_cast<char>(number);
}

std::size_t SharedBytes(std::string_view one, std::string_view other) {
  const auto end = std::mismatch(one.begin(), one.end(), other.begin(), other.end()).first;
  return static_cast<std::size_t>(end - one.begin());
}

std::string Encode(const IndexedRoot& root, const std::vector<LabelledPlace>& places) {
  std::string text;
  AppendBytes(text, Head{.device = root.device, .serial = root.serial, .count = places.size()});
  std::string_view before;
  for (const LabelledPlace& place : places) {
    const std::size_t shared = SharedBytes(place.path, before);
    AppendNumber(text, shared);
    AppendNumber(text, place.path.size() - shared);
    AppendNumber(text, std::uint64_t{place.label} << 1 | (place.isDirectory ? 1 : 0));
    text.append(place.path, shared);
    before = place.path;
  }
  AppendBytes(text, Checksum(text));
  return text;
}

// Takes an encoded index apart. What is asked for beyond its end is refused.
class Decoder {
 public:
  Decoder(std::string_view encoded, const std::string& shownAs) : rest(encoded), file(shownAs) {}

  template <class Value>
  Value TakeBytes() {
    Value value{};
    std::memcpy(&value, Take(sizeof value).data(), sizeof value);
    return value;
  }

  std::uint64_t TakeNumber() {
    std::uint64_t number = 0;
    for (unsigned int shift = 0; shift < 64; shift += 7) {
      const auto byte = static_cast<unsigned char>(Take(1).front());
      number |= std::uint64_t{byte & 0x7fU} << shift;
      if (byte < 0x80) return number;
    }
    Refuse("a number is too large");
  }

  LabelledPlace TakePlace(std::string_view before) {
    const std::uint64_t shared = TakeNumber();
    const std::uint64_t size = TakeNumber();
    const std::uint64_t labelAndKind = TakeNumber();
    if (shared > before.size() || labelAndKind >> 33 != 0) Refuse("a place is wrong");
    LabelledPlace place = {.path = std::string(before.substr(0, shared)),
                           .label = static_cast<std::uint32_t>(labelAndKind >> 1),
                           .isDirectory = (labelAndKind & 1) != 0};
    place.path += Take(size);
    return place;
  }

  bool IsAtEnd() const { return rest.empty(); }

  [[noreturn]] void Refuse(const char* reason) const { ThrowDamaged(file, reason); }

 private:
  std::string_view Take(std::uint64_t size) {
    if (size > rest.size()) Refuse("it is cut off");
    const std::string_view taken = rest.substr(0, size);
    rest.remove_prefix(size);
    return taken;
  }

  std::string_view rest;
  const std::string& file;
};

// What the checksum stands behind; refuses all but what Encode() has made.
std::string_view Verified(std::string_view encoded, const std::string& file) {
  Decoder start(encoded, file);
  if (start.TakeBytes<Magic>() != kMagic) start.Refuse("it is something else");
  const auto version = start.TakeBytes<std::uint32_t>();
  if (version != kVersion) {
    throw BraxoException(StrCat("The label index ", file, " has version ", version,
                                ", this program works with version ", kVersion,
                                ". Run \"secpolicy load\", which makes a new one"));
  }
  if (encoded.size() < sizeof(Head) + sizeof(std::uint64_t)) start.Refuse("it is cut off");
  const std::size_t size = encoded.size() - sizeof(std::uint64_t);
  Decoder end(encoded.substr(size), file);
  if (end.TakeBytes<std::uint64_t>() != Checksum(encoded.substr(0, size))) {
    end.Refuse("its checksum is wrong");
  }
  return encoded.substr(0, size);
}

bool IsAscending(const LabelledPlace* before, const LabelledPlace& place) {
  return place.path.starts_with('/') &&
         (before == nullptr || ComesBefore(before->path, place.path));
}

std::string ReadAll(const std::string& file) {
  constexpr int kFlags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  const File opened(open(file.c_str(), kFlags));
  struct stat status {};
  if (opened.Number() < 0 || fstat(opened.Number(), &status) != 0) ThrowErrno("open", file);
  if (!S_ISREG(status.st_mode)) ThrowDamaged(file, "it is no regular file");
  std::string text(static_cast<std::size_t>(status.st_size), '\0');
  for (std::size_t done = 0; done < text.size();) {
    const ssize_t size = read(opened.Number(), text.data() + done, text.size() - done);
    if (size < 0) ThrowErrno("read", file);
    if (size == 0) ThrowDamaged(file, "it is cut off");
    done += static_cast<std::size_t>(size);
  }
  return text;
}

// Removed again unless it was given its name.
class FileInTheMaking {
 public:
  explicit FileInTheMaking(const std::string& target)
      : wanted(target), path(target + ".XXXXXX"), file(mkostemp(path.data(), O_CLOEXEC)) {
    if (file.Number() < 0) ThrowErrno("write", wanted);
  }
  FileInTheMaking(const FileInTheMaking&) = delete;
  FileInTheMaking& operator=(const FileInTheMaking&) = delete;
  ~FileInTheMaking() {
    if (!path.empty()) unlink(path.c_str());
  }

  void Append(std::string_view text) const {
    while (!text.empty()) {
      const ssize_t written = write(file.Number(), text.data(), text.size());
      if (written < 0) ThrowErrno("write", wanted);
      text.remove_prefix(static_cast<std::size_t>(written));
    }
  }

  void TakeName() {
    if (rename(path.c_str(), wanted.c_str()) != 0) ThrowErrno("write", wanted);
    path.clear();
  }

 private:
  const std::string& wanted;
  std::string path;
  const File file;
};

std::string_view DirectoryOf(std::string_view path) {
  const std::size_t slash = path.rfind('/');
  return path.substr(0, std::max<std::size_t>(slash, 1));
}

bool IsBelow(std::string_view path, std::string_view directory) {
  if (directory == "/") return path.size() > 1;
  return path.size() > directory.size() && path[directory.size()] == '/' &&
         path.starts_with(directory);
}

}  // namespace

// A slash is lower than all that names have in them.
bool ComesBefore(std::string_view path, std::string_view other) {
  const std::size_t shared = SharedBytes(path, other);
  if (shared == other.size()) return false;
  if (shared == path.size() || path[shared] == '/') return true;
  return other[shared] != '/' &&
         static_cast<unsigned char>(path[shared]) < static_cast<unsigned char>(other[shared]);
}

LabelIndex::LabelIndex(const IndexedRoot& indexedRoot, std::vector<LabelledPlace> labelledPlaces)
    : root(indexedRoot), places(std::move(labelledPlaces)) {
  const LabelledPlace* before = nullptr;
  for (const LabelledPlace& place : places) {
    if (!IsAscending(before, place)) {
      throw BraxoException("The places of a label index are not in ascending order: " + place.path);
    }
    before = &place;
  }
}

std::uint32_t LabelIndex::LabelOf(std::string_view path) const {
  if (!path.starts_with('/')) return kNotIndexed;
  for (;; path = DirectoryOf(path)) {
    const auto found = std::lower_bound(places.begin(), places.end(), path,
                                        [](const LabelledPlace& place, std::string_view wanted) {
                                          return ComesBefore(place.path, wanted);
                                        });
    if (found != places.end() && found->path == path) return found->label;
    if (path.size() <= 1) return kNotIndexed;
  }
}

std::span<const LabelledPlace> LabelIndex::PlacesBelow(std::string_view directory) const {
  const auto begin = std::upper_bound(places.begin(), places.end(), directory,
                                      [](std::string_view wanted, const LabelledPlace& place) {
                                        return ComesBefore(wanted, place.path);
                                      });
  const auto end = std::partition_point(begin, places.end(), [&](const LabelledPlace& place) {
    return IsBelow(place.path, directory);
  });
  return {begin, end};
}

void LabelIndex::Write(const std::string& file) const {
  FileInTheMaking made(file);
  made.Append(Encode(root, places));
  made.TakeName();
}

LabelIndex LabelIndex::Read(const std::string& file) {
  const std::string encoded = ReadAll(file);
  Decoder decoder(Verified(encoded, file), file);
  const Head head = decoder.TakeBytes<Head>();
  std::vector<LabelledPlace> places;
  while (!decoder.IsAtEnd()) {
    const LabelledPlace* const before = places.empty() ? nullptr : &places.back();
    LabelledPlace place = decoder.TakePlace(before == nullptr ? "" : before->path);
    if (!IsAscending(before, place)) decoder.Refuse("its places are out of order");
    places.push_back(std::move(place));
  }
  if (places.size() != head.count) decoder.Refuse("places are missing");
  return {{.device = head.device, .serial = head.serial}, std::move(places)};
}

}  // namespace Enforce
