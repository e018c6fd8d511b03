#include "host/linux/operation/published_plans.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <optional>
#include <set>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/percent_encoding.h"
#include "host/linux/common/shared_directory.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/common/write_all.h"
#include "host/linux/operation/store_copy.h"
#include "host/linux/operation/world_records.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/plan_place.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kNew[] = ".new";
constexpr char kStateCopy[] = ".state";

// A dot begins names of files that are no plans.
std::string FileNameOf(const std::string& domain) { return PercentEncoded(domain, "-_+,=@"); }

// Tells the file of the state from another that was put in its place. Empty where there is none.
std::string IdentityOfState() {
  struct stat status {};
  if (stat(StatePath().c_str(), &status) != 0) return "";
  return StrCat(status.st_dev, ":", status.st_ino);
}

std::string CurrentText(const std::string& serial) {
  return StrCat(serial, " ", IdentityOfState(), "\n");
}

// What the mark is while plans are in the making: it is the text of no number, so no plan counts.
std::string MakingText(const std::string& serial) { return StrCat("making ", CurrentText(serial)); }

std::string NewPlanSerial() {
  std::uint64_t serial = 0;
  if (getrandom(&serial, sizeof serial, 0) != sizeof serial) {
    ThrowErrno("Unable to number the plans");
  }
  return std::to_string(serial);
}

// The directory of the plans, for who writes them.
class PlanDirectory {
 public:
  PlanDirectory() : path(PlansOf(StatePath())), opened(MakeSharedDirectory(path, kMode)) {}

  // Replaces the file with this name in one step.
  void Write(const std::string& name, std::string_view content) {
    unlinkat(opened.Number(), kNew, 0);
    constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
    const Descriptor file(openat(opened.Number(), kNew, kFlags, S_IRUSR | S_IWUSR));
    if (!file.IsOpen() || !WriteAll(file.Number(), content)) Fail(name);
    TakeName(file, name);
  }

  void WriteCurrent(std::string_view content) {
    const std::string current = CurrentPlansOf(StatePath());
    Write(current.substr(current.rfind('/') + 1), content);
  }

  // The path for a file that somebody else writes, before TakeNewFile() gives it its name.
  std::string NewFile() {
    unlinkat(opened.Number(), kNew, 0);
    return StrCat(path, "/", kNew);
  }

  void TakeNewFile(const std::string& name) {
    const Descriptor file(openat(opened.Number(), kNew, O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    if (!file.IsOpen()) Fail(name);
    TakeName(file, name);
  }

  void RemoveAllBut(const std::set<std::string>& kept) {
    for (const std::string& name : NamesIn(opened)) {
      if (!kept.contains(name)) unlinkat(opened.Number(), name.c_str(), 0);
    }
  }

 private:
  static constexpr mode_t kMode = 0755;
  static constexpr mode_t kFileMode = 0644;

  void TakeName(const Descriptor& file, const std::string& name) const {
    if (fchmod(file.Number(), kFileMode) != 0 ||
        renameat(opened.Number(), kNew, opened.Number(), name.c_str()) != 0) {
      Fail(name);
    }
  }

  [[noreturn]] void Fail(const std::string& name) const {
    ThrowErrno("Unable to write ", path, "/", name);
  }

  const std::string path;
  const Descriptor opened;
};

// The content of a file that belongs to the superuser or this user, and that nobody else may write.
std::string ReadTrusted(const std::string& path) {
  // Without waiting for the other end, should it be a pipe.
  const Descriptor file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  struct stat status {};
  if (!file.IsOpen() || fstat(file.Number(), &status) != 0) ThrowErrno();
  if (!S_ISREG(status.st_mode)) throw HostError(EINVAL, "it is no regular file");
  if (status.st_uid != 0 && status.st_uid != geteuid()) {
    throw HostError(EACCES, "it belongs to another user");
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    throw HostError(EACCES, "other users may write it");
  }
  std::string content(static_cast<std::size_t>(status.st_size), '\0');
  const ssize_t count = read(file.Number(), content.data(), content.size());
  if (count < 0) ThrowErrno();
  content.resize(static_cast<std::size_t>(count));
  return content;
}

// Nothing where there is no mark, it is of another state, or somebody else may have written it.
std::optional<std::string> FindSerial() {
  try {
    const std::string current = ReadTrusted(CurrentPlansOf(StatePath()));
    std::string serial = current.substr(0, current.find(' '));
    if (current == CurrentText(serial)) return serial;
  } catch (const HostError&) {
    return std::nullopt;
  }
  return std::nullopt;
}

}  // namespace

// Whoever commits removes the mark first. It is written while nobody can commit, so that it stands
// for the state as the last commit has left it, and no commit that is under way removes it.
PlansInTheMaking::PlansInTheMaking()
    : state(HostState::Current().shared_from_this()), serial(NewPlanSerial()) {
  PlanDirectory directory;
  const Transaction others(state->Database());
  directory.WriteCurrent(MakingText(serial));
}

bool PlansInTheMaking::IsLatest() const {
  if (!state->Database().IsCurrent()) return false;
  try {
    return ReadTrusted(CurrentPlansOf(StatePath())) == MakingText(serial);
  } catch (const HostError&) {
    return false;
  }
}

bool PlansInTheMaking::Publish(const std::map<std::string, std::string>& plans) {
  PlanDirectory directory;
  MakeWorldRecords();
  // Only as a lock, which ends without a commit: others wait with theirs until the plans are there.
  const Transaction others(state->Database());
  if (!IsLatest()) return false;
  CopyDatabase(StatePath(), CopyOf::kPublicState, directory.NewFile());
  directory.TakeNewFile(kStateCopy);
  std::set<std::string> names = {kStateCopy};
  for (const auto& [domain, bytes] : plans) {
    const std::string name = FileNameOf(domain);
    directory.Write(name, bytes);
    names.insert(name);
  }
  directory.RemoveAllBut(names);
  directory.WriteCurrent(CurrentText(serial));
  return true;
}

bool ArePlansPublished() { return FindSerial().has_value(); }

std::string PublishedSerial() {
  if (const auto serial = FindSerial()) return *serial;
  throw HostError(ESTALE,
                  StrCat("There are no plans of the policy as it is in ", PlansOf(StatePath()),
                         ". Let root run \"secpolicy load\", which makes them"));
}

std::string PlanFileOf(const std::string& domain) {
  return StrCat(PlansOf(StatePath()), "/", FileNameOf(domain));
}

std::string ReadPublishedPlan(const std::string& domain) {
  try {
    return ReadTrusted(PlanFileOf(domain));
  } catch (const HostError& failure) {
    if (failure.Code() != ENOENT) RefusePublishedPlan(domain, failure.what());
  }
  throw HostError(ENOENT, StrCat("There is no plan of a domain '", domain,
                                 "'. Let root run \"secpolicy features --for ", domain,
                                 "\", which tells whether there is such a domain and what of its "
                                 "rules this kernel cannot keep to"));
}

void RefusePublishedPlan(const std::string& domain, const std::string& reason) {
  throw HostError(EPROTO, StrCat("The plan ", PlanFileOf(domain), " cannot be used: ", reason,
                                 ". Let root run \"secpolicy load\", which makes a new one"));
}

void CopyPublishedState(const std::string& to) {
  CopyDatabase(StrCat(PlansOf(StatePath()), "/", kStateCopy), CopyOf::kOwnCopy, to);
}

}  // namespace LinuxHost
