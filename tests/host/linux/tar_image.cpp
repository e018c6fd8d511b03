#include "tar_image.h"

#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <fstream>

namespace LinuxHostTest {
namespace {

constexpr std::size_t kBlockSize = 512;

// The header of POSIX.1-1988.
struct Header {
  char name[100];
  char mode[8];
  char owner[8];
  char group[8];
  char size[12];
  char time[12];
  char checksum[8];
  char type;
  char target[100];
  char magic[6];
  char version[2];
  char ownerName[32];
  char groupName[32];
  char majorNumber[8];
  char minorNumber[8];
  char prefix[155];
  char padding[12];
};
static_assert(sizeof(Header) == kBlockSize);

template <std::size_t size>
void PutNumber(char (&field)[size], unsigned long value) {
  for (std::size_t index = size - 1; index-- > 0; value /= 8) {
    field[index] = static_cast<char>('0' + value % 8);
  }
}

template <std::size_t size>
void PutText(char (&field)[size], const std::string& text) {
  std::memcpy(field, text.data(), std::min(size, text.size()));
}

unsigned long Checksum(const Header& header) {
  const auto* byte = reinterpret_cast<const unsigned char*>(&header);
  unsigned long sum = 0;
  for (std::size_t index = 0; index < sizeof header; ++index) sum += byte[index];
  return sum;
}

}  // namespace

TarImage& TarImage::File(const std::string& name, const std::string& content, unsigned int mode) {
  return Entry('0', name, "", mode, content);
}

TarImage& TarImage::HardLink(const std::string& name, const std::string& target,
                             const std::string& content) {
  return Entry('1', name, target, 0644, content);
}

TarImage& TarImage::SymbolicLink(const std::string& name, const std::string& target) {
  return Entry('2', name, target, 0777, "");
}

TarImage& TarImage::CharacterDevice(const std::string& name) {
  return Entry('3', name, "", 0666, "");
}

TarImage& TarImage::BlockDevice(const std::string& name) { return Entry('4', name, "", 0666, ""); }

TarImage& TarImage::Directory(const std::string& name, unsigned int mode) {
  return Entry('5', name, "", mode, "");
}

TarImage& TarImage::Fifo(const std::string& name) { return Entry('6', name, "", 0644, ""); }

TarImage& TarImage::Extended(const std::string& key, const std::string& value) {
  // The length counts its own digits.
  const std::string rest = " " + key + "=" + value + "\n";
  std::size_t length = rest.size();
  while (length != rest.size() + std::to_string(length).size()) {
    length = rest.size() + std::to_string(length).size();
  }
  extended += std::to_string(length) + rest;
  return *this;
}

TarImage& TarImage::Entry(char type, const std::string& name, const std::string& target,
                          unsigned int mode, const std::string& content) {
  if (!extended.empty()) Append('x', "extended", "", 0644, extended);
  extended.clear();
  Append(type, name, target, mode, content);
  return *this;
}

void TarImage::Append(char type, const std::string& name, const std::string& target,
                      unsigned int mode, const std::string& content) {
  Header header{};
  PutText(header.name, name);
  PutNumber(header.mode, mode);
  PutNumber(header.owner, geteuid());
  PutNumber(header.group, getegid());
  PutNumber(header.size, content.size());
  PutNumber(header.time, 0);
  header.type = type;
  PutText(header.target, target);
  PutText(header.magic, "ustar");
  PutText(header.version, "00");
  PutNumber(header.majorNumber, 1);
  PutNumber(header.minorNumber, 3);
  std::memset(header.checksum, ' ', sizeof header.checksum);
  PutNumber(header.checksum, Checksum(header));
  bytes.append(reinterpret_cast<const char*>(&header), sizeof header);
  bytes += content;
  bytes.append((kBlockSize - content.size() % kBlockSize) % kBlockSize, '\0');
}

std::string TarImage::Bytes() const { return bytes + std::string(2 * kBlockSize, '\0'); }

void TarImage::Save(const std::filesystem::path& path) const {
  std::ofstream file(path, std::ios::binary);
  file << Bytes() << std::flush;
}

}  // namespace LinuxHostTest
