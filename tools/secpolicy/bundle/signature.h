#pragma once

#include <string>
#include <string_view>

namespace SecPolicyCli {

// Loads what signs and verifies, unless it is there already: a library of its own, since it brings
// along more than all the rest. To be called before a root is entered, while the library is still
// in sight. Throws Braxo::Lib::BraxoException when it is missing.
void LoadSignatures();

// An Ed25519 key that was read from a file in PEM.
class SigningKey {
 public:
  // Throws Refusal for what is no such key, and for a file that others than its owner may read.
  explicit SigningKey(const std::string& file);

  // What tells the key from others, in public: 16 hexadecimal digits.
  const std::string& Id() const { return id; }
  std::string Sign(std::string_view text) const;

 private:
  std::string pem;
  std::string id;
};

class VerifyingKey {
 public:
  // Throws Refusal for what is no such key.
  explicit VerifyingKey(const std::string& file);

  const std::string& Id() const { return id; }
  bool HasSigned(std::string_view text, std::string_view signature) const;

 private:
  std::string pem;
  std::string id;
};

}  // namespace SecPolicyCli
