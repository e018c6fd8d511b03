#include "bundle/manifest.h"

#include <ctime>
#include <variant>

#include "host/linux/operation/text_digest.h"
#include "json_reader.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

constexpr char kSchema[] = "secpolicy.bundle/1";
constexpr std::string_view kAnySchema = "secpolicy.bundle/";

const std::string& TextAt(const Json& json, const char* name) {
  const std::string* const text = json.At(name).String();
  if (text == nullptr || text->empty()) {
    throw BadManifest(std::string("its manifest has no ") + name);
  }
  return *text;
}

std::int64_t NumberAt(const Json& json, const char* name) {
  const auto number = json.At(name).Number();
  if (number && *number >= 0) return *number;
  throw BadManifest(std::string("its manifest has no ") + name);
}

std::int64_t SerialAt(const Json& json) {
  const std::int64_t serial = NumberAt(json, "serial");
  if (serial <= kGreatestSerial) return serial;
  throw BadManifest("its serial is greater than " + std::to_string(kGreatestSerial));
}

std::int64_t TimeAt(const Json& json, const char* name) {
  if (const auto time = ReadUtcTime(TextAt(json, name))) return *time;
  throw BadManifest(std::string("its manifest has no ") + name);
}

void RequireSchema(const Json& json) {
  const std::string& schema = TextAt(json, "schema");
  if (schema == kSchema) return;
  if (!schema.starts_with(kAnySchema)) throw BadManifest("its manifest is that of no bundle");
  throw BadManifest("its format is " + schema + ", and this command knows " + kSchema +
                    ". A newer secpolicy may know it.");
}

std::vector<BundledFile> FilesIn(const Json& json) {
  std::vector<BundledFile> files;
  for (const Json& file : json.At("files").Elements()) {
    files.push_back({.path = TextAt(file, "path"),
                     .size = static_cast<std::size_t>(NumberAt(file, "size")),
                     .digest = TextAt(file, "sha256")});
  }
  return files;
}

}  // namespace

BundledFile DescribeFile(const ArchiveEntry& file) {
  return {.path = file.name, .size = file.bytes.size(), .digest = LinuxHost::DigestOf(file.bytes)};
}

Json ToJson(const Manifest& manifest) {
  Json files = Json::Array();
  for (const BundledFile& file : manifest.files) {
    files.Append({{"path", file.path}, {"size", file.size}, {"sha256", file.digest}});
  }
  Json expires;
  if (manifest.expires) expires = IsoTime(*manifest.expires);
  return {{"schema", kSchema},
          {"name", manifest.name},
          {"serial", manifest.serial},
          {"created", IsoTime(manifest.created)},
          {"expires", expires},
          {"key", manifest.key},
          {"files", files}};
}

Manifest ReadManifest(std::string_view text) {
  const std::variant<Json, std::string> read = ReadJson(text);
  const Json* const json = std::get_if<Json>(&read);
  if (json == nullptr) throw BadManifest("its manifest is no JSON: " + std::get<std::string>(read));
  RequireSchema(*json);
  Manifest manifest{.name = TextAt(*json, "name"),
                    .serial = SerialAt(*json),
                    .created = TimeAt(*json, "created"),
                    .expires = std::nullopt,
                    .key = TextAt(*json, "key"),
                    .files = FilesIn(*json)};
  if (!json->At("expires").IsNull()) manifest.expires = TimeAt(*json, "expires");
  return manifest;
}

std::optional<std::int64_t> ReadUtcTime(const std::string& text) {
  for (const char* format : {"%Y-%m-%dT%H:%M:%SZ", "%Y-%m-%d %H:%M:%S UTC", "%Y-%m-%d"}) {
    std::tm time{};
    const char* const end = strptime(text.c_str(), format, &time);
    if (end == nullptr || *end != '\0') continue;
    const int day = time.tm_mday;
    const std::time_t seconds = timegm(&time);
    // What there is no such day of becomes another one.
    if (time.tm_mday == day && seconds >= 0) return seconds;
  }
  return std::nullopt;
}

}  // namespace SecPolicyCli
