#include "host/enforce/plan_file.h"

#include <algorithm>
#include <cstring>
#include <type_traits>

#include "host/enforce/checksum.h"

namespace Enforce {
namespace {

constexpr std::string_view kMagic = "secpolicy-plan\n";
constexpr std::uint32_t kVersion = 3;

class Writer {
 public:
  template <typename Value>
  void Put(const Value& value) {
    static_assert(std::has_unique_object_representations_v<Value>);
    bytes.append(reinterpret_cast<const char*>(&value), sizeof(value));
  }

  void PutCount(std::size_t count) { Put(static_cast<std::uint32_t>(count)); }

  void PutText(std::string_view text) {
    PutCount(text.size());
    bytes += text;
  }

  template <typename Value>
  void PutAll(const std::vector<Value>& values) {
    PutCount(values.size());
    for (const Value& value : values) Put(value);
  }

  std::string bytes;
};

// Takes values off the front of bytes. After the first that is not there it gives zeros and nothing
// else, so that only the end has to ask whether all was well.
class Reader {
 public:
  explicit Reader(std::string_view bytes) : unread(bytes) {}

  template <typename Value>
  Value Take() {
    static_assert(std::has_unique_object_representations_v<Value>);
    Value value{};
    const std::string_view bytes = TakeBytes(sizeof(value));
    if (!bytes.empty()) std::memcpy(&value, bytes.data(), sizeof(value));
    return value;
  }

  bool TakeFlag() { return TakeUpTo<std::uint8_t>(1) != 0; }

  // A number up to `last`, for an enumeration.
  template <typename Number>
  Number TakeUpTo(Number last) {
    const auto number = Take<Number>();
    if (number <= last) return number;
    Fail();
    return 0;
  }

  // How many values follow, of at least so many bytes each: never more than there is room for.
  std::size_t TakeCount(std::size_t bytesOfEach) {
    const auto count = Take<std::uint32_t>();
    if (count <= unread.size() / bytesOfEach) return count;
    Fail();
    return 0;
  }

  std::string TakeText() { return std::string(TakeBytes(TakeCount(1))); }

  template <typename Value>
  std::vector<Value> TakeAll() {
    std::vector<Value> values(TakeCount(sizeof(Value)));
    for (Value& value : values) value = Take<Value>();
    return values;
  }

  bool EndsWell() const { return !hasFailed && unread.empty(); }

 private:
  std::string_view TakeBytes(std::size_t count) {
    if (count > unread.size()) Fail();
    const std::string_view bytes = unread.substr(0, std::min(count, unread.size()));
    unread.remove_prefix(bytes.size());
    return bytes;
  }

  void Fail() {
    hasFailed = true;
    unread = {};
  }

  std::string_view unread;
  bool hasFailed = false;
};

void Write(Writer& writer, const PathRight& right) {
  writer.PutText(right.path);
  writer.Put(right.rights);
  writer.Put(static_cast<std::uint8_t>(right.mayBeMissing));
}

void Write(Writer& writer, const Mask& mask) {
  writer.PutText(mask.path);
  writer.Put(static_cast<std::uint8_t>(mask.kind));
}

template <typename Value>
void WriteEach(Writer& writer, const std::vector<Value>& values) {
  writer.PutCount(values.size());
  for (const Value& value : values) Write(writer, value);
}

void Read(Reader& reader, PathRight* right) {
  right->path = reader.TakeText();
  right->rights = reader.Take<std::uint64_t>();
  right->mayBeMissing = reader.TakeFlag();
}

void Read(Reader& reader, Mask* mask) {
  mask->path = reader.TakeText();
  mask->kind = static_cast<MaskKind>(reader.TakeUpTo(static_cast<std::uint8_t>(MaskKind::kNoExec)));
}

// The shortest way to write down a value that begins with a text.
constexpr std::size_t kFewestBytes = sizeof(std::uint32_t) + sizeof(std::uint8_t);

template <typename Value>
std::vector<Value> ReadEach(Reader& reader) {
  std::vector<Value> values(reader.TakeCount(kFewestBytes));
  for (Value& value : values) Read(reader, &value);
  return values;
}

void Write(Writer& writer, const std::optional<SecretPlaces>& secret) {
  writer.Put(static_cast<std::uint8_t>(secret.has_value()));
  if (!secret) return;
  writer.PutCount(secret->lower);
  writer.PutCount(secret->upper);
}

std::optional<SecretPlaces> ReadSecret(Reader& reader) {
  if (!reader.TakeFlag()) return std::nullopt;
  const auto lower = reader.Take<std::uint32_t>();
  return SecretPlaces{lower, reader.Take<std::uint32_t>()};
}

void ReadPlan(Reader& reader, Plan* plan) {
  plan->domain = reader.TakeText();
  plan->domainId = reader.Take<std::uint32_t>();
  plan->mark = reader.TakeText();
  plan->level = static_cast<Policy::Level>(
      reader.TakeUpTo(static_cast<std::uint8_t>(Policy::Level::kDisabled)));
  plan->keepsBroker = reader.TakeFlag();
  plan->handledFiles = reader.Take<std::uint64_t>();
  plan->paths = ReadEach<PathRight>(reader);
  plan->bindsChecked = reader.TakeFlag();
  plan->connectsChecked = reader.TakeFlag();
  plan->bindPorts = reader.TakeAll<std::uint16_t>();
  plan->connectPorts = reader.TakeAll<std::uint16_t>();
  plan->isScoped = reader.TakeFlag();
  plan->masks = ReadEach<Mask>(reader);
  plan->capabilities = reader.Take<std::uint64_t>();
  plan->filter = reader.TakeAll<sock_filter>();
  plan->secret = ReadSecret(reader);
  plan->mayEnd = reader.TakeFlag();
  plan->mayMap = reader.TakeFlag();
}

bool IsAbsolute(const std::string& path) {
  return path.starts_with('/') && path.find('\0') == std::string::npos;
}

// What the kernel would refuse, or would take for something else.
bool IsConsistent(const Plan& plan) {
  const auto isApplicable = [&](const PathRight& right) {
    return IsAbsolute(right.path) && right.rights != 0 && (right.rights & ~plan.handledFiles) == 0;
  };
  const auto isInFilter = [&](std::size_t place) { return place < plan.filter.size(); };
  return std::ranges::all_of(plan.paths, isApplicable) &&
         std::ranges::all_of(plan.masks, IsAbsolute, &Mask::path) &&
         (plan.bindsChecked || plan.bindPorts.empty()) &&
         (plan.connectsChecked || plan.connectPorts.empty()) &&
         plan.filter.size() <= BPF_MAXINSNS &&
         (!plan.secret || (isInFilter(plan.secret->lower) && isInFilter(plan.secret->upper)));
}

// True for bytes that another version of the program has made, whose checksum may be another, too.
bool IsOfAnotherVersion(std::string_view bytes) {
  std::uint32_t version = 0;
  if (bytes.size() < kMagic.size() + sizeof(version)) return false;
  std::memcpy(&version, bytes.data() + kMagic.size(), sizeof(version));
  return version != kVersion;
}

// Takes the checksum off the end; true when it is that of the rest.
bool TakeChecksum(std::string_view* bytes) {
  std::uint64_t sum = 0;
  if (bytes->size() < sizeof(sum)) return false;
  std::memcpy(&sum, bytes->data() + bytes->size() - sizeof(sum), sizeof(sum));
  bytes->remove_suffix(sizeof(sum));
  return sum == Checksum(*bytes);
}

// What is wrong with the bytes; nothing when `plan` is the one that they are.
const char* ReasonAgainst(std::string_view bytes, Plan* plan) {
  if (!bytes.starts_with(kMagic)) return "it is no plan";
  if (IsOfAnotherVersion(bytes)) return "another version of secpolicy made it";
  if (!TakeChecksum(&bytes)) return "it is damaged";
  Reader reader(bytes.substr(kMagic.size()));
  reader.Take<std::uint32_t>();
  ReadPlan(reader, plan);
  if (!reader.EndsWell() || !IsConsistent(*plan)) return "it contradicts itself";
  return nullptr;
}

}  // namespace

std::string Serialize(const Plan& plan) {
  Writer writer;
  writer.bytes = kMagic;
  writer.Put(kVersion);
  writer.PutText(plan.domain);
  writer.Put(static_cast<std::uint32_t>(plan.domainId));
  writer.PutText(plan.mark);
  writer.Put(static_cast<std::uint8_t>(plan.level));
  writer.Put(static_cast<std::uint8_t>(plan.keepsBroker));
  writer.Put(plan.handledFiles);
  WriteEach(writer, plan.paths);
  writer.Put(static_cast<std::uint8_t>(plan.bindsChecked));
  writer.Put(static_cast<std::uint8_t>(plan.connectsChecked));
  writer.PutAll(plan.bindPorts);
  writer.PutAll(plan.connectPorts);
  writer.Put(static_cast<std::uint8_t>(plan.isScoped));
  WriteEach(writer, plan.masks);
  writer.Put(plan.capabilities);
  writer.PutAll(plan.filter);
  Write(writer, plan.secret);
  writer.Put(static_cast<std::uint8_t>(plan.mayEnd));
  writer.Put(static_cast<std::uint8_t>(plan.mayMap));
  writer.Put(Checksum(writer.bytes));
  return std::move(writer.bytes);
}

bool Parse(std::string_view bytes, Plan* plan, const char** whyNot) {
  *plan = {};
  *whyNot = ReasonAgainst(bytes, plan);
  return *whyNot == nullptr;
}

}  // namespace Enforce
