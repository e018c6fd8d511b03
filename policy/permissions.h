#pragma once

#include <string>
#include <string_view>

namespace Policy {

// What can be done with a path; the bits of a file policy.
enum class Permission : unsigned int { kRead = 0x1, kWrite = 0x2, kExecute = 0x10 };

// What may be done with a path.
class Permissions {
 public:
  static constexpr unsigned int kAllBits = 0x13;

  Permissions() = default;
  explicit Permissions(unsigned int fileRuleBits) : bits(fileRuleBits) {}

  // Reads letters of "rwx". Throws BraxoException for any other and for one that stands twice.
  static Permissions Parse(std::string_view letters);

  bool IsEmpty() const { return bits == 0; }
  bool Has(Permission permission) const { return (bits & Bit(permission)) != 0; }
  Permissions With(Permission permission) const { return Permissions(bits | Bit(permission)); }
  unsigned int Bits() const { return bits; }

  // The letters in the order of "rwx".
  std::string Text() const;

  bool operator==(const Permissions&) const = default;

 private:
  static constexpr unsigned int Bit(Permission permission) {
    return static_cast<unsigned int>(permission);
  }

  unsigned int bits = 0;
};

}  // namespace Policy
