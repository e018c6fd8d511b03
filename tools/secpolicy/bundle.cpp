#include <charconv>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <iostream>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "bundle/bundle_file.h"
#include "bundle/policy_tree.h"
#include "bundle/signature.h"
#include "check/policy_check.h"
#include "command_line.h"
#include "ending.h"
#include "policy_dir.h"
#include "root.h"
#include "text/format.h"
#include "text/replace_file.h"
#include "text/shell_word.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

constexpr std::int64_t kDay = 86400;

// Of the year 9999, the last that a manifest can name.
constexpr std::int64_t kLastSecond = 253402300799;

// A whole number that is not negative; nothing for anything else.
std::optional<std::int64_t> NumberIn(const std::string& text) {
  std::int64_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [rest, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || rest != end || number < 0) return std::nullopt;
  return number;
}

// Builds that are to be repeatable say when they are.
std::int64_t TimeOfBuild() {
  const char* const wanted = std::getenv("SOURCE_DATE_EPOCH");
  if (wanted == nullptr) return std::time(nullptr);
  const auto time = NumberIn(wanted);
  if (time && *time <= kLastSecond) return *time;
  throw QuestionError("SOURCE_DATE_EPOCH is '" + std::string(wanted) +
                      "', which is no number of seconds");
}

struct CreateOptions {
  std::string dir;
  std::string output;
  std::string key;
  std::string name;
  std::string expires;
  std::string serial;
};

std::string CheckSerial(const std::string& word) {
  const auto number = NumberIn(word);
  if (!number) return "'" + word + "' is not a number";
  if (*number <= kGreatestSerial) return "";
  return "'" + word + "' is greater than " + std::to_string(kGreatestSerial);
}

constexpr std::int64_t kMostDays = 36500;

std::string CheckExpiry(const std::string& word) {
  const auto days = NumberIn(word);
  if (days ? *days > 0 && *days <= kMostDays : ReadUtcTime(word).has_value()) return "";
  return "'" + word + "' is neither a day such as 2027-01-31 nor a number of days from 1 to 36500";
}

std::optional<std::int64_t> ExpiryOf(const std::string& word, std::int64_t created) {
  if (word.empty()) return std::nullopt;
  const auto days = NumberIn(word);
  const auto time = days ? created + *days * kDay : ReadUtcTime(word);
  if (time && *time > created && *time <= kLastSecond) return time;
  throw QuestionError("a bundle of " + UtcTime(created) + " cannot expire at " +
                      (time ? UtcTime(*time) : word));
}

// It is for hosts that are not this one.
void RequireSoundPolicy(const std::string& dir) {
  const DiagnosticList found =
      CheckPolicy({.path = dir, .fresh = true, .content = nullptr, .unwanted = {}}).diagnostics;
  const std::size_t errors = found.Count(Severity::kError);
  const std::string call = Call("check --fresh " + ShellWord(dir));
  if (errors > 0) {
    throw Refusal("the policy in " + dir + " has " + CountOf(errors, "error") +
                  ", so no bundle was made. " + call + " shows every one with its place.");
  }
  for (const Diagnostic& diagnostic : found.All()) {
    if (diagnostic.code != &Codes::kEditorCopy) continue;
    throw Refusal(diagnostic.file +
                  " looks like a copy that was left behind, so no bundle was made. Move it out of "
                  "the directory.");
  }
}

std::string NameOf(const std::string& dir) {
  const std::filesystem::path path = std::filesystem::absolute(dir) / ".";
  const std::string name = path.lexically_normal().parent_path().filename();
  return name.empty() ? "policy" : name;
}

ExitCode Create(const CreateOptions& options) {
  if (const auto refusal = RefuseMissingDir("bundle create", options.dir)) return *refusal;
  const SigningKey key(options.key);
  RequireSoundPolicy(options.dir);
  const std::int64_t created = TimeOfBuild();
  BundleRequest request{
      .name = options.name.empty() ? NameOf(options.dir) : options.name,
      .serial = options.serial.empty() ? created : NumberIn(options.serial).value_or(0),
      .created = created,
      .expires = ExpiryOf(options.expires, created),
      .files = ReadPolicyTree(options.dir)};
  ReplaceFile(options.output, MakeBundle(request, key));
  Summarize("bundle create", "done (" + CountOf(request.files.size(), "file") + ", serial " +
                                 std::to_string(request.serial) + ", signed by " + key.Id() + ")");
  return kWell;
}

Action DefineCreate(Syntax& syntax) {
  const auto options = std::make_shared<CreateOptions>();
  syntax.AddOption("DIR", options->dir, "The policy directory, as seen from the root").Require();
  syntax.AddOption("-o,--output", options->output, "Put the bundle into FILE")
      .NameValue("FILE")
      .Require();
  syntax
      .AddOption("--key", options->key,
                 "The private key to sign with, in PEM; nobody but its owner may read it")
      .NameValue("FILE")
      .Require();
  syntax.AddOption("--name", options->name, "The name of the policy, if not that of DIR")
      .NameValue("TEXT")
      .Offer(OfferNothing());
  syntax
      .AddOption("--expires", options->expires,
                 "Until when it can be used: a day such as 2027-01-31, or a number of days")
      .Check(CheckExpiry)
      .NameValue("TIME")
      .Offer(OfferNothing());
  syntax
      .AddOption("--serial", options->serial,
                 "A number that is greater in each bundle of a policy; without it the time in "
                 "seconds")
      .Check(CheckSerial)
      .NameValue("N");
  return [options] { return Create(*options); };
}

std::string DescribeValidity(const Manifest& manifest) {
  return "serial " + std::to_string(manifest.serial) +
         (manifest.expires ? ", until " + UtcTime(*manifest.expires) : ", without an end");
}

struct ReadOptions {
  std::string file;
  std::string key;
  std::string format;
};

Manifest Verified(const BundleFile& bundle, const std::string& key) {
  return bundle.Verify({VerifyingKey(key)}, std::time(nullptr));
}

ExitCode Verify(const ReadOptions& options) {
  const VerifyingKey key(options.key);
  const Manifest manifest = BundleFile(options.file).Verify({key}, std::time(nullptr));
  Summarize("bundle verify", "well (" + manifest.name + ", " + DescribeValidity(manifest) + ", " +
                                 CountOf(manifest.files.size(), "file") + ", signed by " +
                                 key.Id() + ")");
  return kWell;
}

void WriteText(const Manifest& manifest, bool /*isVerified*/) {
  std::cout << "name     " << Visible(manifest.name) << "\n"
            << "serial   " << manifest.serial << "\n"
            << "created  " << UtcTime(manifest.created) << "\n"
            << "expires  " << (manifest.expires ? UtcTime(*manifest.expires) : "never") << "\n"
            << "key      " << Visible(manifest.key) << "\n"
            << "files    " << manifest.files.size() << "\n";
  for (const BundledFile& file : manifest.files) {
    std::cout << "  " << Visible(file.digest) << "  " << Visible(file.path) << "\n";
  }
}

void WriteJson(const Manifest& manifest, bool isVerified) {
  const Json json = {{"schema", "secpolicy.bundle-show/1"},
                     {"verified", isVerified},
                     {"manifest", ToJson(manifest)}};
  std::cout << json.Text();
}

ExitCode Show(const ReadOptions& options) {
  const BundleFile bundle(options.file);
  const bool isVerified = !options.key.empty();
  const Manifest manifest = isVerified ? Verified(bundle, options.key) : bundle.Claims();
  (options.format == "json" ? WriteJson : WriteText)(manifest, isVerified);
  Summarize("bundle show", isVerified
                               ? "verified"
                               : "this is what it claims: it was not verified, which --key does");
  return kWell;
}

std::shared_ptr<ReadOptions> AddReadOptions(Syntax& syntax, bool needsKey) {
  auto options = std::make_shared<ReadOptions>();
  syntax.AddOption("FILE", options->file, "The bundle, as seen from the root").Require();
  syntax.AddOption("--key", options->key, "The public key of who signed it, in PEM")
      .NameValue("FILE")
      .Require(needsKey);
  return options;
}

Action DefineVerify(Syntax& syntax) {
  const auto options = AddReadOptions(syntax, true);
  return [options] { return Verify(*options); };
}

Action DefineShow(Syntax& syntax) {
  const auto options = AddReadOptions(syntax, false);
  syntax.AddFormat(options->format, "the manifest", {"text", "json"});
  return [options] { return Show(*options); };
}

const Kind kCreate = {
    "create", "Pack a policy directory and sign it",
    "Takes the files that a boot or a load reads, no others, and refuses a policy in which\n"
    "'check --fresh' finds errors or copies of editors. The same files, serial, times and key\n"
    "make the same bytes; SOURCE_DATE_EPOCH in the environment stands for the time of day.\n"
    "\n"
    "Examples:\n"
    "  openssl genpkey -algorithm ed25519 -out key.pem && chmod 600 key.pem\n"
    "  secpolicy bundle create ./policy -o web.bundle --key key.pem --expires 90",
    DefineCreate};

const Kind kVerify = {"verify", "Tell whether a bundle is whole, signed and valid",
                      "Exit status: 0 it is, 1 it is not, and the last line says why.\n"
                      "\n"
                      "Examples:\n"
                      "  openssl pkey -in key.pem -pubout -out public.pem\n"
                      "  secpolicy bundle verify web.bundle --key public.pem",
                      DefineVerify};

const Kind kShow = {"show", "Show what the manifest of a bundle says",
                    "Without --key this is what the bundle claims, and nothing is verified.\n"
                    "\n"
                    "Examples:\n"
                    "  secpolicy bundle show web.bundle\n"
                    "  secpolicy bundle show web.bundle --key public.pem --format json",
                    DefineShow};

Action Define(Syntax& syntax) {
  return syntax.AddKinds(std::vector<Kind>{kCreate, kVerify, kShow});
}

}  // namespace

const Verb kBundle = {
    "bundle", "Sign a policy for many hosts, and verify one that was signed",
    "A bundle is one file with the files of a policy, a manifest with the digest of each, and a\n"
    "signature, which OpenSSL makes with an Ed25519 key. Any tar lists and unpacks it.\n"
    "\n"
    "Examples:\n"
    "  secpolicy bundle create ./policy -o web.bundle --key key.pem --expires 90\n"
    "  secpolicy bundle verify web.bundle --key public.pem\n"
    "  secpolicy bundle show web.bundle",
    Define, LoadSignatures};

}  // namespace SecPolicyCli
