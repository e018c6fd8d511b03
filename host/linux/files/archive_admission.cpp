#include "host/linux/files/archive_admission.h"

#include <archive_entry.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstring>
#include <limits>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/running_system.h"
#include "host/linux/files/archive_path.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kStatePlace[] = "var/lib/secpolicy";
constexpr char kKeyPlace[] = "etc/secpolicy/bundle-keys";
constexpr char kTardiskPolicy[] = "/tardisks";

[[noreturn]] void Refuse(std::string_view name, std::string_view reason) {
  throw HostError(EINVAL, StrCat(name, ": ", reason));
}

// Where a file system does not tell upper case from lower, they name the same file.
bool IsSameName(std::string_view one, std::string_view other) {
  return one.size() == other.size() && strncasecmp(one.data(), other.data(), one.size()) == 0;
}

bool IsAtOrBelow(std::string_view path, std::string_view directory) {
  return path.size() >= directory.size() &&
         IsSameName(path.substr(0, directory.size()), directory) &&
         (path.size() == directory.size() || path[directory.size()] == '/');
}

bool IsOfRunningSystem(std::string_view component) {
  return std::any_of(kRunningSystem.begin(), kRunningSystem.end(),
                     [&](std::string_view name) { return IsSameName(component, name); });
}

bool IsDirectory(archive_entry* entry) {
  return archive_entry_filetype(entry) == AE_IFDIR && archive_entry_hardlink(entry) == nullptr;
}

// The root itself, and a running system's directory, which another file system may cover by now.
bool IsAlreadyThere(const std::string& name, archive_entry* entry) {
  if (!IsDirectory(entry) || name.starts_with('/')) return false;
  const std::vector<std::string_view> components = Components(name);
  if (components.empty()) return !name.empty();
  struct stat status;
  return components.size() == 1 && IsRunningSystem(components[0]) &&
         lstat(name.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

// Whoever may write a directory may put another one in the place of what is below it.
bool OnlyOwnerMayWrite(archive_entry* entry) {
  const bool othersMayWrite = (archive_entry_perm(entry) & (S_IWGRP | S_IWOTH)) != 0;
  // Owners are kept by the superuser only.
  return !othersMayWrite && (geteuid() != 0 || archive_entry_uid(entry) == 0);
}

// The system would cut the number to 32 bits, so that 2^32 is the superuser.
void CheckOwner(const std::string& name, archive_entry* entry) {
  constexpr std::int64_t kNobody = std::numeric_limits<uid_t>::max();
  for (const std::int64_t number : {archive_entry_uid(entry), archive_entry_gid(entry)}) {
    if (number >= 0 && number < kNobody) continue;
    Refuse(name, StrCat("No user and no group can have the number ", number));
  }
}

}  // namespace

ArchiveAdmission::ArchiveAdmission(const TardiskRules& given) : rules(given) {
  const std::string policy = PlainPath(rules.policyRoot);
  places.push_back({kStatePlace, kStatePlace, "It belongs to the saved states and settings"});
  places.push_back({policy, policy + kTardiskPolicy,
                    "It belongs to the policy, which a tardisk brings only when it is named by "
                    "--policy-from"});
  // A load exchanges directories there, and one of them becomes the policy.
  const std::size_t name = policy.rfind('/') + 1;
  places.push_back({policy.substr(0, name - 1), policy, "It belongs to the exchange of policies",
                    policy.substr(name)});
  places.push_back({kKeyPlace, kKeyPlace, "It says whose policies this host takes"});
  for (const Place& place : places) {
    struct stat status;
    const bool isThere = stat(place.path.c_str(), &status) == 0;
    inodes.emplace_back(isThere ? status.st_dev : 0, isThere ? status.st_ino : 0);
  }
}

void ArchiveAdmission::Begin(const std::string& name) {
  ++archive;
  mayBringPolicy = rules.policyTardisks.contains(name);
}

bool ArchiveAdmission::Admits(archive_entry* entry) {
  const char* const given = archive_entry_pathname(entry);
  const std::string name = given == nullptr ? "" : given;
  if (IsAlreadyThere(name, entry)) return false;
  CheckName(name);
  CheckSystemPlace(name, entry);
  CheckType(name, entry);
  CheckOwner(name, entry);
  const std::string path = PlainPath(name);
  CheckWay(name, path);
  const Kind kind = KindAt(path);
  CheckProtectedPlaces(name, path, kind, entry);
  if (kind == Kind::kDirectory && !IsDirectory(entry)) Refuse(name, "There is a directory");
  const char* const target = archive_entry_hardlink(entry);
  if (target != nullptr && PlainPath(target) == path) return false;
  Record(path, entry);
  return true;
}

void ArchiveAdmission::CheckName(const std::string& name) const {
  if (name.empty()) Refuse("an entry", "It has no name");
  if (name.size() >= PATH_MAX) Refuse(name, "Its name is too long");
  if (name.starts_with('/')) Refuse(name, "Path is absolute");
  const std::vector<std::string_view> components = Components(name);
  if (std::find(components.begin(), components.end(), "..") != components.end()) {
    Refuse(name, "Path contains '..'");
  }
}

// Which images make up the root is decided before the first of them is unpacked.
void ArchiveAdmission::CheckSystemPlace(const std::string& name, archive_entry* entry) const {
  const std::vector<std::string_view> components = Components(name);
  if (components.empty()) Refuse(name, "It is the root");
  if (components.size() == 1 && IsDirectory(entry)) return;
  if (IsOfRunningSystem(components[0])) Refuse(name, "It belongs to the running system");
  if (IsSameName(components[0], "tardisks")) Refuse(name, "It belongs to the tardisk images");
}

void ArchiveAdmission::CheckType(const std::string& name, archive_entry* entry) const {
  if (const char* target = archive_entry_hardlink(entry)) return CheckHardLink(name, target);
  switch (archive_entry_filetype(entry)) {
    case AE_IFREG:
    case AE_IFDIR:
    case AE_IFIFO:
      return;
    case AE_IFLNK:
      if (archive_entry_symlink(entry) == nullptr) Refuse(name, "It is a symbolic link to nothing");
      return;
    default:
      Refuse(name, "Devices and sockets are made by the running system");
  }
}

// Otherwise a tardisk could write to a file of somebody else, and pass for where it came from.
void ArchiveAdmission::CheckHardLink(const std::string& name, const char* target) const {
  if (FindBrought(target) != nullptr) return;
  Refuse(name, StrCat("It is a hard link to ", target, ", which this tardisk did not bring"));
}

// What lies above the entry has to be a directory, or nothing yet.
void ArchiveAdmission::CheckWay(const std::string& name, const std::string& path) {
  for (std::size_t end = path.find('/'); end != std::string::npos; end = path.find('/', end + 1)) {
    const std::string above = path.substr(0, end);
    const Kind kind = KindAt(above);
    if (kind == Kind::kLink) Refuse(name, StrCat("Cannot extract through symlink ", name));
    if (kind == Kind::kOther) Refuse(name, StrCat(above, " is no directory"));
    if (kind == Kind::kNothing) directories.insert(above);
  }
}

void ArchiveAdmission::CheckProtectedPlaces(const std::string& name, const std::string& path,
                                            Kind present, archive_entry* entry) const {
  const bool keepsWay = (present == Kind::kNothing || present == Kind::kDirectory) &&
                        IsDirectory(entry) && OnlyOwnerMayWrite(entry);
  for (const Place& place : places) {
    if (IsAtOrBelow(path, place.path) && !IsFree(place, path)) Refuse(name, place.reason);
    if (keepsWay || !IsAtOrBelow(place.wayTo, path)) continue;
    Refuse(name, StrCat("It leads to ", place.wayTo,
                        ", so it has to be a directory that only its owner may write, and root's"));
  }
}

// As the policy, and the same hidden.
bool ArchiveAdmission::IsSibling(const Place& place, const std::string& path) {
  if (IsAtOrBelow(path, place.wayTo) || path.size() <= place.path.size()) return false;
  std::string_view name = std::string_view(path).substr(place.path.size() + 1);
  if (name.starts_with('.')) name.remove_prefix(1);
  return IsSameName(name.substr(0, place.siblings.size()), place.siblings);
}

bool ArchiveAdmission::IsFree(const Place& place, const std::string& path) const {
  if (!place.siblings.empty()) return !IsSibling(place, path);
  if (place.path == place.wayTo) return false;
  return mayBringPolicy || IsSameName(path, place.path) || IsAtOrBelow(path, place.wayTo);
}

ArchiveAdmission::Kind ArchiveAdmission::KindAt(const std::string& path) {
  if (directories.contains(path)) return Kind::kDirectory;
  const auto found = brought.find(path);
  if (found != brought.end()) return found->second.isLink ? Kind::kLink : Kind::kOther;
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) {
    // Below a directory that is still to be made there is nothing.
    if (errno == ENOENT || errno == ENOTDIR) return Kind::kNothing;
    ThrowErrno(path);
  }
  if (S_ISLNK(status.st_mode)) return Kind::kLink;
  if (!S_ISDIR(status.st_mode)) return Kind::kOther;
  NoticeAnotherName(path, status);
  directories.insert(path);
  return Kind::kDirectory;
}

// A mount or a link can show a protected directory at another path.
void ArchiveAdmission::NoticeAnotherName(const std::string& path, const struct stat& status) {
  for (std::size_t index = 0; index < inodes.size(); ++index) {
    if (inodes[index] != std::pair(status.st_dev, status.st_ino)) continue;
    const Place place = places[index];
    if (place.path == path) continue;
    places.push_back(
        {path, path + place.wayTo.substr(place.path.size()), place.reason, place.siblings});
  }
}

const ArchiveAdmission::Brought* ArchiveAdmission::FindBrought(std::string_view target) const {
  if (target.starts_with('/')) return nullptr;
  const auto found = brought.find(PlainPath(target));
  return found != brought.end() && found->second.archive == archive ? &found->second : nullptr;
}

void ArchiveAdmission::Record(const std::string& path, archive_entry* entry) {
  if (IsDirectory(entry)) {
    brought.erase(path);
    directories.insert(path);
    return;
  }
  const char* const target = archive_entry_hardlink(entry);
  const bool isLink =
      target == nullptr ? archive_entry_filetype(entry) == AE_IFLNK : FindBrought(target)->isLink;
  brought[path] = {.archive = archive, .isLink = isLink};
}

}  // namespace LinuxHost
