#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "host/linux/common/descriptor.h"

namespace LinuxHost {

// Hands out bytes piece by piece.
class ByteSource {
 public:
  virtual ~ByteSource() = default;

  // The next piece, which holds until the next call; empty after the last one. Throws HostError
  // with the bare reason when there are none to be had.
  virtual std::string_view Read() = 0;
};

// The bytes of a tardisk image as they were before compression (gzip, bzip2, xz, zstd or none).
// Its end is reached only if every check sum and length that the compression keeps is right, and
// the file holds nothing else.
class TardiskStream : public ByteSource {
 public:
  // Throws HostError with the bare reason when the image cannot be opened, or is a link.
  explicit TardiskStream(const std::string& image);

  std::string_view Read() override;

  // How many bytes were read so far, and at which of them only zeros begin.
  std::uint64_t Size() const { return size; }
  std::uint64_t ZerosFrom() const { return zerosFrom; }

 private:
  const Descriptor file;
  std::unique_ptr<ByteSource> source;
  std::uint64_t size = 0;
  std::uint64_t zerosFrom = 0;
};

}  // namespace LinuxHost
