#include "bundle/policy_exchange.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <system_error>

#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"
#include "refusal.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

namespace fs = std::filesystem;
using LinuxHost::Descriptor;
using LinuxHost::ThrowErrno;

// Beside each other, so that one can take the place of the other in one step.
constexpr char kPlace[] = "/etc/zorvan";
constexpr char kNewPolicy[] = "/etc/zorvan/secpolicy.new";
constexpr char kLock[] = "/etc/zorvan/.secpolicy.lock";

constexpr char kCannotReplace[] = "cannot replace ";
constexpr char kCannotWrite[] = "cannot write ";

// Locks on files that others can read would be theirs to take.
Descriptor Lock() {
  constexpr mode_t kOwn = 0600;
  std::error_code later;
  fs::create_directories(kPlace, later);
  Descriptor file(open(kLock, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, kOwn));
  if (!file.IsOpen()) ThrowErrno(kCannotReplace, SecPolicy::kPolicyRoot);
  if (flock(file.Number(), LOCK_EX | LOCK_NB) == 0) return file;
  if (errno != EWOULDBLOCK) ThrowErrno(kCannotReplace, SecPolicy::kPolicyRoot);
  throw Refusal("another bundle is being loaded, so nothing was changed. Try it again.");
}

// 0 where there is nothing.
ino_t InodeOf(const char* path) {
  struct stat status {};
  return lstat(path, &status) == 0 ? status.st_ino : 0;
}

bool IsThere(const char* path) { return InodeOf(path) != 0; }

// The directory that is not a policy yet, or not any more, whatever its name; on the disk before
// any name changes.
bool NoteWaiting(const Descriptor& lock, ino_t directory) {
  return pwrite(lock.Number(), &directory, sizeof directory, 0) == sizeof directory &&
         fdatasync(lock.Number()) == 0;
}

bool IsWaiting(const Descriptor& lock, const char* path) {
  ino_t noted = 0;
  return pread(lock.Number(), &noted, sizeof noted, 0) == sizeof noted && noted != 0 &&
         noted == InodeOf(path);
}

void Rename(const char* from, const char* to, unsigned flags) {
  if (renameat2(AT_FDCWD, from, AT_FDCWD, to, flags) != 0) ThrowErrno(kCannotReplace, to);
}

void Move(const char* from, const char* to) { Rename(from, to, RENAME_NOREPLACE); }
void Swap(const char* from, const char* to) { Rename(from, to, RENAME_EXCHANGE); }

void RemoveNew() {
  std::error_code failure;
  fs::remove_all(kNewPolicy, failure);
  if (!failure) return;
  errno = failure.value();
  constexpr char kCannotRemove[] = "cannot remove ";
  ThrowErrno(kCannotRemove, kNewPolicy);
}

void SyncPlace() {
  const Descriptor place(open(kPlace, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!place.IsOpen() || fsync(place.Number()) != 0) ThrowErrno(kCannotReplace, kPlace);
}

// Whatever mask this process has.
void MakeDirectory(const std::string& path) {
  constexpr mode_t kForAll = 0755;
  if (mkdir(path.c_str(), kForAll) != 0 || chmod(path.c_str(), kForAll) != 0) {
    ThrowErrno(kCannotWrite, path);
  }
}

void WriteFile(const std::string& path, const std::string& bytes) {
  constexpr mode_t kForAll = 0644;
  const Descriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kForAll));
  if (!file.IsOpen() || fchmod(file.Number(), kForAll) != 0 ||
      !LinuxHost::WriteAll(file.Number(), bytes)) {
    ThrowErrno(kCannotWrite, path);
  }
}

void MakeDirectoriesFor(const std::string& dir, const std::string& name) {
  for (std::size_t slash = name.find('/'); slash != std::string::npos;
       slash = name.find('/', slash + 1)) {
    const std::string path = dir + "/" + name.substr(0, slash);
    if (!IsThere(path.c_str())) MakeDirectory(path);
  }
}

// To the host the policy of a tardisk is the very file that it has brought.
void LinkTardiskPolicy() {
  const std::string from = std::string(SecPolicy::kPolicyRoot) + "/" + SecPolicy::kTardisksDir;
  if (!IsThere(from.c_str())) return;
  for (const fs::directory_entry& entry : fs::directory_iterator(from)) {
    const std::string to = std::string(kNewPolicy) + "/" + SecPolicy::kTardisksDir + "/" +
                           entry.path().filename().string();
    if (!entry.is_directory() && link(entry.path().c_str(), to.c_str()) != 0) {
      ThrowErrno(kCannotWrite, to);
    }
  }
}

}  // namespace

void WritePolicyTree(const std::string& dir, const std::vector<ArchiveEntry>& files) {
  MakeDirectory(dir);
  // What a load expects to be there, be it empty.
  for (const char* const name : {SecPolicy::kObjectsDir, SecPolicy::kDomainsDir,
                                 SecPolicy::kTardisksDir, SecPolicy::kFileLabelsDir}) {
    MakeDirectory(dir + "/" + name);
  }
  for (const ArchiveEntry& file : files) {
    MakeDirectoriesFor(dir, file.name);
    WriteFile(dir + "/" + file.name, file.bytes);
  }
  const Descriptor made(open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!made.IsOpen() || syncfs(made.Number()) != 0) ThrowErrno(kCannotWrite, dir);
}

PolicyExchange::PolicyExchange() : lock(Lock()) {
  if (IsWaiting(lock, kPreviousPolicy)) {
    (IsThere(kNewPolicy) ? Swap : Move)(kPreviousPolicy, kNewPolicy);
  }
  RemoveNew();
}

// In between, the new policy waits in the place of the one before, and its number is noted: the
// policy itself is there at every moment.
void PolicyExchange::PutInPlace(const std::vector<ArchiveEntry>& files) {
  WritePolicyTree(kNewPolicy, files);
  LinkTardiskPolicy();
  if (!NoteWaiting(lock, InodeOf(kNewPolicy))) ThrowErrno(kCannotWrite, kLock);
  hadPolicy = IsThere(SecPolicy::kPolicyRoot);
  hadPrevious = IsThere(kPreviousPolicy);
  if (hadPolicy) {
    (hadPrevious ? Swap : Move)(kNewPolicy, kPreviousPolicy);
    stage = Stage::kPrepared;
    Swap(kPreviousPolicy, SecPolicy::kPolicyRoot);
  } else {
    Move(kNewPolicy, SecPolicy::kPolicyRoot);
  }
  stage = Stage::kInPlace;
  SyncPlace();
}

void PolicyExchange::PutBack() {
  if (stage == Stage::kInPlace) {
    if (hadPolicy) {
      Swap(kPreviousPolicy, SecPolicy::kPolicyRoot);
    } else {
      Move(SecPolicy::kPolicyRoot, kNewPolicy);
    }
    stage = Stage::kPrepared;
  }
  if (stage != Stage::kNothing && hadPolicy) {
    (hadPrevious ? Swap : Move)(kPreviousPolicy, kNewPolicy);
  }
  stage = Stage::kNothing;
  RemoveNew();
  SyncPlace();
  NoteWaiting(lock, 0);
}

void PolicyExchange::Finish() {
  std::error_code later;  // the next one removes it
  fs::remove_all(kNewPolicy, later);
  NoteWaiting(lock, 0);
}

}  // namespace SecPolicyCli
