// A boot in two parts, for they fail differently: what acts on files can only be done again, so
// everything that can be refused is refused before the first file is written; what acts on the
// state is part of the load that follows it, and is undone with that.
#include "host/linux/operation/boot.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <optional>
#include <set>
#include <system_error>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/files/directory_entry.h"
#include "host/linux/files/first_labels.h"
#include "host/linux/files/inode_generation.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/services/system_log.h"
#include "host/linux/state/config_database.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kTardiskDirectory[] = "/tardisks";

// Makes the root the working directory until it is destroyed.
class AtRoot {
 public:
  AtRoot() {
    if (chdir("/") != 0) ThrowErrno("Unable to enter the root");
  }

 private:
  const DirectoryVisit visit;
};

// In byte order of name, which is that of the paths, as they share the directory.
std::vector<std::string> ListImages() {
  std::vector<std::string> images;
  try {
    for (const auto& entry : std::filesystem::directory_iterator(kTardiskDirectory)) {
      if (std::filesystem::is_regular_file(entry.symlink_status())) images.push_back(entry.path());
    }
  } catch (const std::filesystem::filesystem_error& error) {
    throw HostError(error.code().value(), StrCat("Unable to list the tardisks in ",
                                                 kTardiskDirectory, ": ", error.code().message()));
  }
  std::sort(images.begin(), images.end());
  return images;
}

void RefuseUnknownNames(const std::set<std::string>& names,
                        const std::vector<std::string>& images) {
  for (const std::string& name : names) {
    const std::string image = StrCat(kTardiskDirectory, "/", name);
    if (std::find(images.begin(), images.end(), image) != images.end()) continue;
    throw HostError(ENOENT, StrCat("There is no tardisk ", name, " in ", kTardiskDirectory));
  }
}

std::vector<std::string> ListImages(const TardiskRules& rules) {
  std::vector<std::string> images = ListImages();
  RefuseUnknownNames(rules.policyTardisks, images);
  return images;
}

// Whether the file at `path` is what a tardisk brought there at the boot that made `state`.
bool IsAsBrought(HostState& state, const std::string& path, const struct statx& present) {
  const std::optional<InodeOrigin> origin = state.FindOrigin(DeviceOf(present), present.stx_ino);
  return origin && origin->path == "/" + path && origin->birth == BirthOf(present) &&
         origin->size == present.stx_size && origin->modified == ModifiedOf(present);
}

// Finds the files that somebody has edited. The tardisk that brings a file last decides, as it
// does when all are unpacked.
class EditWatch : public ArchiveInspector {
 public:
  explicit EditWatch(HostState& before) : state(before) {}

  void Begin(const std::string& /*name*/) override {}

  bool WantsComparison(const std::string& path, const struct statx& present) override {
    return !IsAsBrought(state, path, present);
  }

  void Take(const ArchiveFinding& finding) override {
    if (finding.differs) {
      edited.insert("/" + finding.path);
    } else {
      edited.erase("/" + finding.path);
    }
  }

  std::vector<std::string> Edited() const { return {edited.begin(), edited.end()}; }

 private:
  HostState& state;
  std::set<std::string> edited;
};

// Keeps what each path will be, and what it is.
class PlanWriter : public ArchiveInspector {
 public:
  // `before` is null where nothing is installed.
  explicit PlanWriter(HostState* before) : state(before) {}

  void Begin(const std::string& name) override {
    tardisk = name;
    plan.tardisks.push_back(name);
  }

  bool WantsComparison(const std::string& path, const struct statx& present) override {
    isAsBrought = state != nullptr && IsAsBrought(*state, path, present);
    return true;
  }

  void Take(const ArchiveFinding& finding) override {
    AddDirectoriesAbove(finding.path);
    plan.files["/" + finding.path] = {.tardisk = tardisk,
                                      .type = finding.type,
                                      .present = finding.present,
                                      .differs = finding.differs,
                                      .isEdited = finding.differs && !isAsBrought};
  }

  BootPlan plan;

 private:
  // An archive need not hold the directories that its files lie in.
  void AddDirectoriesAbove(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) return;
    const std::string above = path.substr(0, slash);
    struct stat status;
    if (plan.files.contains("/" + above) || lstat(above.c_str(), &status) == 0) return;
    AddDirectoriesAbove(above);
    plan.files["/" + above] = {.tardisk = tardisk, .type = S_IFDIR};
  }

  HostState* const state;
  std::string tardisk;
  bool isAsBrought = false;
};

std::size_t CountLabels(const BootPlan& plan, const std::string& attribute) {
  std::size_t count = CountFirstLabels(attribute);
  for (const auto& [path, file] : plan.files) {
    count += CanCarryLabel(file.type, attribute) ? 1 : 0;
    count -= file.present != 0 && CanCarryLabel(file.present, attribute) ? 1 : 0;
  }
  return count;
}

InodeOrigin OriginOf(const std::string& tardisk, const std::string& path,
                     const struct statx& status) {
  return {.device = DeviceOf(status),
          .inode = status.stx_ino,
          .tardisk = tardisk,
          .path = "/" + path,
          .birth = BirthOf(status),
          .size = status.stx_size,
          .modified = ModifiedOf(status),
          .generation = S_ISREG(status.stx_mode) ? GenerationOf(path.c_str()) : std::nullopt};
}

void Unpack(const std::string& image, const TardiskRules& rules, AssembledRoot& root) {
  const std::string tardisk = std::filesystem::path(image).filename();
  UnpackArchive(image, rules, [&](const std::string& path, const struct statx& status) {
    if (CanCarryLabel(status.stx_mode, root.labelAttribute) &&
        GiveFirstLabel(path.c_str(), root.labelAttribute) != 0) {
      return errno;
    }
    root.origins.push_back(OriginOf(tardisk, path, status));
    return 0;
  });
  LogInformation("Unpacked tardisk " + image);
}

}  // namespace

void UnpackTardisks(const std::vector<std::string>& images, const TardiskRules& rules,
                    AssembledRoot& root) {
  EditWatch watch(HostState::Current());
  CheckArchives(images, rules, watch);
  root.editedFiles = watch.Edited();
  HostState::Current().TellLabelsChange();
  for (const std::string& image : images) Unpack(image, rules, root);
}

AssembledRoot AssembleRoot(const TardiskRules& rules, const std::function<void()>& unpacked) {
  const AtRoot atRoot;
  // A root that has never run has no place for what runs.
  mkdir("/run", 0755);
  // A state that cannot be used, or is in use, is told before a file is changed.
  AssembledRoot root;
  HostState::Current().Worlds().RequireNoneKept();
  root.labelAttribute = UsableLabelAttribute(HostState::Current().Directory());
  const std::vector<std::string> images = ListImages(rules);
  UnpackTardisks(images, rules, root);
  if (!images.empty()) unpacked();
  GiveFirstLabels(root.labelAttribute);
  return root;
}

BootPlan PlanBoot(const TardiskRules& rules) {
  const AtRoot atRoot;
  HostState* const state = HostState::Find();
  PlanWriter writer(state);
  CheckArchives(ListImages(rules), rules, writer);
  const std::string attribute = UsableLabelAttribute(state == nullptr ? "/" : state->Directory());
  writer.plan.labelCount = CountLabels(writer.plan, attribute);
  return writer.plan;
}

void StartPolicy(const AssembledRoot& root) {
  HostState& state = HostState::Current();
  state.Reset();
  state.ChooseLabelAttribute(root.labelAttribute);
  state.RecordOrigins(root.origins);
  if (ConfigDatabase* settings = ConfigDatabase::Find()) settings->ClearBootStatus();
}

}  // namespace LinuxHost
