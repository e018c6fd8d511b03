#include "bundle/archive.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>
#include <numeric>

namespace SecPolicyCli {
namespace {

constexpr std::size_t kBlock = 512;
constexpr std::size_t kEndBlocks = 2;

struct Field {
  std::size_t offset;
  std::size_t size;
};

// The header of POSIX's ustar format.
constexpr Field kName = {0, kLongestEntryName};
constexpr Field kMode = {100, 8};
constexpr Field kUser = {108, 8};
constexpr Field kGroup = {116, 8};
constexpr Field kSize = {124, 12};
constexpr Field kTime = {136, 12};
constexpr Field kChecksum = {148, 8};
constexpr Field kType = {156, 1};
constexpr Field kMagic = {257, 8};

constexpr std::size_t kFileMode = 0644;

using Header = std::string;

void Put(Header& header, const Field& field, std::string_view text) {
  header.replace(field.offset, text.size(), text);
}

// With zeros before it and a NUL behind it.
void PutNumber(Header& header, const Field& field, std::size_t number) {
  std::array<char, 32> text{};
  const int digits = static_cast<int>(field.size) - 1;
  const int length = std::snprintf(text.data(), text.size(), "%0*zo", digits, number);
  Put(header, field, {text.data(), static_cast<std::size_t>(length)});
}

std::size_t ChecksumOf(const Header& header) {
  return std::accumulate(
      header.begin(), header.end(), std::size_t{0},
      [](std::size_t sum, char byte) { return sum + static_cast<unsigned char>(byte); });
}

Header HeaderOf(std::string_view name, std::size_t size) {
  Header header(kBlock, '\0');
  Put(header, kName, name);
  PutNumber(header, kMode, kFileMode);
  PutNumber(header, kUser, 0);
  PutNumber(header, kGroup, 0);
  PutNumber(header, kSize, size);
  PutNumber(header, kTime, 0);
  Put(header, kType, "0");
  Put(header, kMagic, std::string_view("ustar\00000", kMagic.size));
  Put(header, kChecksum, "        ");
  PutNumber(header, {kChecksum.offset, kChecksum.size - 1}, ChecksumOf(header));
  header[kChecksum.offset + kChecksum.size - 2] = '\0';
  return header;
}

std::size_t Rounded(std::size_t size) { return (size + kBlock - 1) / kBlock * kBlock; }

std::string_view Get(std::string_view header, const Field& field) {
  const std::string_view text = header.substr(field.offset, field.size);
  return text.substr(0, text.find('\0'));
}

bool IsZero(std::string_view bytes) {
  return std::ranges::all_of(bytes, [](char byte) { return byte == '\0'; });
}

// Reads one entry after the other.
class Reader {
 public:
  explicit Reader(std::string_view archive) : rest(archive) {}

  std::vector<ArchiveEntry> Read() {
    std::vector<ArchiveEntry> entries;
    while (!IsZero(Peek())) entries.push_back(TakeEntry());
    if (rest.size() < kEndBlocks * kBlock) throw BadArchive("it is cut short");
    if (rest.size() > kEndBlocks * kBlock || !IsZero(rest)) {
      throw BadArchive("there is something behind its end");
    }
    return entries;
  }

 private:
  std::string_view Peek() const {
    if (rest.size() < kBlock) throw BadArchive("it is cut short");
    return rest.substr(0, kBlock);
  }

  std::string_view Take(std::size_t size) {
    if (rest.size() < size) throw BadArchive("it is cut short");
    const std::string_view taken = rest.substr(0, size);
    rest.remove_prefix(size);
    return taken;
  }

  static std::size_t SizeIn(std::string_view header) {
    const std::string_view text = Get(header, kSize);
    std::size_t size = 0;
    std::from_chars(text.data(), text.data() + text.size(), size, 8);
    return size;
  }

  ArchiveEntry TakeEntry() {
    const std::string_view header = Take(kBlock);
    const std::string name(Get(header, kName));
    if (Get(header, {kMagic.offset, 5}) != "ustar") throw BadArchive("it is no bundle");
    if (Get(header, kType) != "0") throw BadArchive("its entry " + name + " is no regular file");
    const std::size_t size = SizeIn(header);
    if (name.empty() || header != HeaderOf(name, size)) {
      throw BadArchive("its entry " + name + " is not as 'bundle create' writes it");
    }
    const std::string_view content = Take(Rounded(size));
    if (!IsZero(content.substr(size))) throw BadArchive("there is something behind " + name);
    return {name, std::string(content.substr(0, size))};
  }

  std::string_view rest;
};

}  // namespace

std::string WriteArchive(const std::vector<ArchiveEntry>& entries) {
  std::string archive;
  for (const ArchiveEntry& entry : entries) {
    archive += HeaderOf(entry.name, entry.bytes.size());
    archive += entry.bytes;
    archive.resize(Rounded(archive.size()));
  }
  archive.resize(archive.size() + kEndBlocks * kBlock);
  return archive;
}

std::vector<ArchiveEntry> ReadArchive(std::string_view bytes) { return Reader(bytes).Read(); }

}  // namespace SecPolicyCli
