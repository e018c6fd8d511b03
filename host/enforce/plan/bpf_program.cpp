#include "host/enforce/plan/bpf_program.h"

#include <linux/audit.h>
#include <linux/seccomp.h>

#include <cerrno>
#include <limits>
#include <span>

namespace Enforce {
namespace {

// A jump says in a byte how many instructions it passes over; one without a condition has a word.
constexpr std::size_t kFarthestBranch = std::numeric_limits<std::uint8_t>::max();

// The numbers of the second table of x86_64, the one of 32-bit pointers.
constexpr ValueRange kX32Numbers = {0x4000'0000, 0x7fff'ffff};

constexpr std::uint32_t Failure(int error) {
  return SECCOMP_RET_ERRNO | static_cast<std::uint32_t>(error);
}

// A place in the program that is jumped to before it is known where it lies.
using Label = std::size_t;

// Where a decision leads: an answer, or on to a place.
struct Exit {
  std::optional<Label> label;
  std::uint32_t answer = 0;

  bool operator==(const Exit&) const = default;
};

// The values from `first` on, up to those of the next segment.
struct Segment {
  std::uint32_t first;
  Exit exit;
};

class ProgramWriter {
 public:
  Label NewLabel() {
    places.push_back(0);
    return places.size() - 1;
  }

  std::size_t Place() const { return code.size(); }
  void PlaceHere(Label label) { places[label] = code.size(); }

  void Load(std::size_t offset) {
    Write(BPF_LD | BPF_W | BPF_ABS, static_cast<std::uint32_t>(offset));
  }
  void Mask(std::uint32_t mask) { Write(BPF_ALU | BPF_AND | BPF_K, mask); }
  void Return(std::uint32_t answer) { Write(BPF_RET | BPF_K, answer); }
  void SkipWhere(std::uint16_t comparison, std::uint32_t value, std::size_t ifSo,
                 std::size_t ifNot) {
    Write(BPF_JMP | BPF_K | comparison, value, static_cast<std::uint8_t>(ifSo),
          static_cast<std::uint8_t>(ifNot));
  }

  // Searches the loaded value in the segments, of which the first begins at 0, and leaves by its
  // exit.
  void Search(std::span<const Segment> segments) {
    if (segments.size() == 1) return Leave(segments.front().exit);
    const auto [lower, upper] = Halves(segments);
    const std::size_t passedOver = SizeOfSearch(lower.size());
    if (passedOver <= kFarthestBranch) {
      SkipWhere(BPF_JGE, upper.front().first, passedOver, 0);
    } else {
      SkipWhere(BPF_JGE, upper.front().first, 0, 1);
      Write(BPF_JMP | BPF_JA, static_cast<std::uint32_t>(passedOver));
    }
    Search(lower);
    Search(upper);
  }

  // The program, with all jumps to labels in place.
  std::vector<sock_filter> Finish() && {
    for (const auto& [place, label] : jumps) {
      code[place].k = static_cast<std::uint32_t>(places[label] - place - 1);
    }
    return std::move(code);
  }

 private:
  static std::pair<std::span<const Segment>, std::span<const Segment>> Halves(
      std::span<const Segment> segments) {
    const std::size_t middle = segments.size() / 2;
    return {segments.first(middle), segments.subspan(middle)};
  }

  // The instructions that Search writes for so many segments.
  static std::size_t SizeOfSearch(std::size_t segments) {
    if (segments == 1) return 1;
    const std::size_t lower = SizeOfSearch(segments / 2);
    return (lower <= kFarthestBranch ? 1 : 2) + lower + SizeOfSearch(segments - segments / 2);
  }

  void Leave(const Exit& exit) {
    if (!exit.label) return Return(exit.answer);
    jumps.emplace_back(code.size(), *exit.label);
    Write(BPF_JMP | BPF_JA, 0);
  }

  void Write(std::uint16_t operation, std::uint32_t value, std::uint8_t ifSo = 0,
             std::uint8_t ifNot = 0) {
    code.push_back({operation, ifSo, ifNot, value});
  }

  std::vector<sock_filter> code;
  std::vector<std::size_t> places;                   // of the labels
  std::vector<std::pair<std::size_t, Label>> jumps;  // from where, to which
};

std::size_t OffsetOf(unsigned int argument, Half half) {
  return offsetof(seccomp_data, args) + argument * sizeof(std::uint64_t) +
         (half == Half::kUpper ? sizeof(std::uint32_t) : 0);
}

std::vector<Segment> SegmentsOf(const std::vector<ValueRange>& values, const Exit& inside,
                                const Exit& outside) {
  std::vector<Segment> segments;
  if (values.empty() || values.front().first > 0) segments.push_back({0, outside});
  for (const ValueRange& range : values) {
    segments.push_back({range.first, inside});
    if (range.last < std::numeric_limits<std::uint32_t>::max()) {
      segments.push_back({range.last + 1, outside});
    }
  }
  return segments;
}

void WriteCheck(ProgramWriter& writer, const ArgumentCheck& check, const Exit& passed,
                const Exit& failed) {
  writer.Load(OffsetOf(check.argument, check.half));
  if (check.mask != std::numeric_limits<std::uint32_t>::max()) writer.Mask(check.mask);
  writer.Search(SegmentsOf(check.values, passed, failed));
}

// Goes on behind itself where the condition holds, and answers `refusal` where it does not.
void WriteCondition(ProgramWriter& writer, const Condition& condition, std::uint32_t refusal) {
  if (condition.empty()) return writer.Return(refusal);
  const Label behind = writer.NewLabel();
  for (std::size_t index = 0; index < condition.size(); ++index) {
    const bool isLast = index + 1 == condition.size();
    const Label next = writer.NewLabel();
    const Exit failed = isLast ? Exit{std::nullopt, refusal} : Exit{next};
    WriteCheck(writer, condition[index], Exit{behind}, failed);
    writer.PlaceHere(next);
  }
  writer.PlaceHere(behind);
}

// No value is greater than the greatest, so nothing passes before SetSecret.
std::size_t WriteSecretWord(ProgramWriter& writer, Half half) {
  writer.Load(OffsetOf(kSecretArgument, half));
  const std::size_t place = writer.Place();
  writer.SkipWhere(BPF_JGT, std::numeric_limits<std::uint32_t>::max(), 1, 0);
  writer.Return(Failure(EPERM));
  return place;
}

SecretPlaces WriteSecret(ProgramWriter& writer) {
  const std::size_t lower = WriteSecretWord(writer, Half::kLower);
  return {lower, WriteSecretWord(writer, Half::kUpper)};
}

// Verdicts that are more than an answer: each stands in the program once, behind the search.
class Leaves {
 public:
  explicit Leaves(ProgramWriter& programWriter) : writer(programWriter) {}

  Exit ExitOf(const CallVerdict& verdict) {
    if (verdict.answer == Answer::kUnknown) return {std::nullopt, Failure(ENOSYS)};
    if (verdict.answer == Answer::kRefused) return {std::nullopt, Failure(verdict.refusal)};
    if (verdict.answer == Answer::kNoticed) return {std::nullopt, SECCOMP_RET_USER_NOTIF};
    if (verdict.answer == Answer::kAllowed && verdict.conditions.empty()) {
      return {std::nullopt, SECCOMP_RET_ALLOW};
    }
    const auto known = labels.find(verdict);
    if (known != labels.end()) return {known->second};
    return {labels.emplace(verdict, writer.NewLabel()).first->second};
  }

  // The places of the secret, where a verdict asks for it.
  std::optional<SecretPlaces> Write() {
    std::optional<SecretPlaces> secret;
    for (const auto& [verdict, label] : labels) {
      writer.PlaceHere(label);
      if (verdict.answer == Answer::kAllowedWithSecret) secret = WriteSecret(writer);
      for (const Condition& condition : verdict.conditions) {
        WriteCondition(writer, condition, Failure(verdict.refusal));
      }
      writer.Return(SECCOMP_RET_ALLOW);
    }
    return secret;
  }

 private:
  ProgramWriter& writer;
  std::map<CallVerdict, Label> labels;
};

void Append(std::vector<Segment>& segments, std::uint32_t first, const Exit& exit) {
  if (!segments.empty() && segments.back().first == first) segments.pop_back();
  if (!segments.empty() && segments.back().exit == exit) return;
  segments.push_back({first, exit});
}

std::vector<Segment> NumbersOf(const std::map<int, CallVerdict>& calls, std::uint32_t architecture,
                               Leaves& leaves) {
  const Exit unknown = {std::nullopt, Failure(ENOSYS)};
  std::vector<Segment> segments = {{0, unknown}};
  for (const auto& [number, verdict] : calls) {
    const auto first = static_cast<std::uint32_t>(number);
    Append(segments, first, leaves.ExitOf(verdict));
    segments.push_back({first + 1, unknown});
  }
  if (architecture == AUDIT_ARCH_X86_64) {
    Append(segments, kX32Numbers.first, {std::nullopt, SECCOMP_RET_KILL_PROCESS});
    Append(segments, kX32Numbers.last + 1, unknown);
  }
  return segments;
}

}  // namespace

FilterProgram Assemble(const std::map<int, CallVerdict>& calls, std::uint32_t architecture) {
  ProgramWriter writer;
  writer.Load(offsetof(seccomp_data, arch));
  writer.SkipWhere(BPF_JEQ, architecture, 1, 0);
  writer.Return(SECCOMP_RET_KILL_PROCESS);
  writer.Load(offsetof(seccomp_data, nr));
  Leaves leaves(writer);
  writer.Search(NumbersOf(calls, architecture, leaves));
  const std::optional<SecretPlaces> secret = leaves.Write();
  return {std::move(writer).Finish(), secret};
}

}  // namespace Enforce
