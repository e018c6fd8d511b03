#include "enforce/bpf_machine.h"

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "host/enforce/system_calls.h"

namespace EnforceTest {
namespace {

constexpr std::size_t kMostInstructions = 4096;

bool IsBranch(const sock_filter& instruction) {
  return BPF_CLASS(instruction.code) == BPF_JMP && BPF_OP(instruction.code) != BPF_JA;
}

// The instructions that may come after the one at `place`.
std::vector<std::size_t> After(const std::vector<sock_filter>& program, std::size_t place) {
  const sock_filter& instruction = program[place];
  if (BPF_CLASS(instruction.code) == BPF_RET) return {};
  if (IsBranch(instruction)) return {place + 1 + instruction.jt, place + 1 + instruction.jf};
  if (BPF_CLASS(instruction.code) == BPF_JMP) return {place + 1 + instruction.k};
  return {place + 1};
}

bool IsKnown(const sock_filter& instruction) {
  switch (instruction.code) {
    case BPF_LD | BPF_W | BPF_ABS:
      return instruction.k % 4 == 0 && instruction.k < sizeof(seccomp_data);
    case BPF_ALU | BPF_AND | BPF_K:
    case BPF_JMP | BPF_JA:
    case BPF_JMP | BPF_JEQ | BPF_K:
    case BPF_JMP | BPF_JGE | BPF_K:
    case BPF_JMP | BPF_JGT | BPF_K:
    case BPF_RET | BPF_K:
      return true;
    default:
      return false;
  }
}

bool Holds(const sock_filter& branch, std::uint32_t value) {
  if (BPF_OP(branch.code) == BPF_JEQ) return value == branch.k;
  if (BPF_OP(branch.code) == BPF_JGE) return value >= branch.k;
  return value > branch.k;
}

std::uint32_t WordAt(const seccomp_data& call, std::uint32_t offset) {
  std::uint32_t word = 0;
  std::memcpy(&word, reinterpret_cast<const char*>(&call) + offset, sizeof(word));
  return word;
}

}  // namespace

seccomp_data CallOf(int number, const Arguments& arguments) {
  return CallOf(number, arguments, Enforce::NativeArchitecture());
}

seccomp_data CallOf(int number, const Arguments& arguments, std::uint32_t architecture) {
  seccomp_data call = {};
  call.nr = number;
  call.arch = architecture;
  std::memcpy(call.args, arguments.data(), sizeof(call.args));
  return call;
}

std::string RefusalOf(const std::vector<sock_filter>& program) {
  if (program.empty() || program.size() > kMostInstructions) return "length";
  for (std::size_t place = 0; place < program.size(); ++place) {
    const std::string where = " at " + std::to_string(place);
    if (!IsKnown(program[place])) return "instruction" + where;
    for (const std::size_t next : After(program, place)) {
      if (next >= program.size()) return "jump out" + where;
    }
  }
  return {};
}

std::uint32_t Run(const std::vector<sock_filter>& program, const seccomp_data& call) {
  std::uint32_t value = 0;
  for (std::size_t place = 0; place < program.size();) {
    const sock_filter& instruction = program[place];
    if (!IsKnown(instruction)) throw std::logic_error("unknown instruction");
    if (BPF_CLASS(instruction.code) == BPF_RET) return instruction.k;
    if (BPF_CLASS(instruction.code) == BPF_LD) value = WordAt(call, instruction.k);
    if (BPF_CLASS(instruction.code) == BPF_ALU) value &= instruction.k;
    const auto next = After(program, place);
    place = next[IsBranch(instruction) && !Holds(instruction, value) ? 1 : 0];
  }
  throw std::logic_error("the program ends without an answer");
}

std::string AnswerOf(const std::vector<sock_filter>& program, const seccomp_data& call) {
  switch (Run(program, call)) {
    case SECCOMP_RET_ALLOW:
      return "allowed";
    case SECCOMP_RET_ERRNO | EACCES:
      return "EACCES";
    case SECCOMP_RET_ERRNO | EPERM:
      return "EPERM";
    case SECCOMP_RET_ERRNO | ENOSYS:
      return "ENOSYS";
    case SECCOMP_RET_KILL_PROCESS:
      return "killed";
    default:
      throw std::logic_error("an answer that no filter gives");
  }
}

}  // namespace EnforceTest
