#pragma once

#include <linux/filter.h>

#include <cstddef>
#include <cstdint>
#include <utility>

// What lets the one program pass that a domain begins with, where no rule grants to execute, and
// the launcher tell that it could not be executed.
namespace Enforce {

// The instructions of a program that compare the last argument with the secret.
struct SecretPlaces {
  std::size_t lower = 0;
  std::size_t upper = 0;
};

// The argument that carries the secret: no call that it is for uses it.
constexpr unsigned int kSecretArgument = 5;

// Makes the program let the calls pass that carry `secret`.
inline void SetSecret(sock_filter* instructions, const SecretPlaces& places, std::uint64_t secret) {
  for (const auto& [place, word] :
       {std::pair(places.lower, secret & 0xffff'ffff), std::pair(places.upper, secret >> 32)}) {
    instructions[place].code = BPF_JMP | BPF_JEQ | BPF_K;
    instructions[place].k = static_cast<std::uint32_t>(word);
  }
}

}  // namespace Enforce
