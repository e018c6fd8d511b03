// Saving is a copy of the whole state, with a digest, that takes its name when it is complete.
// Putting it back is no copy: the state goes on, with the worlds that run, the labels that files
// carry and the inodes that tardisks brought, so policy tables are replaced one by one in one
// transaction, and what refers to them follows by name.
#include "host/linux/operation/saved_policy.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/operation/store_copy.h"
#include "host/linux/operation/store_seal.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/schema.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr char kSavedPurpose[] = "saved state";

// A file that takes its name only when it is complete.
class FileInTheMaking {
 public:
  explicit FileInTheMaking(const std::string& target)
      : wanted(target),
        directory(std::filesystem::path(target).parent_path()),
        path(
            StrCat(directory, "/.", std::filesystem::path(target).filename().string(), ".XXXXXX")) {
    const Descriptor file(mkstemp(path.data()));
    if (!file.IsOpen()) ThrowErrno("Unable to make a file in ", directory);
  }
  FileInTheMaking(const FileInTheMaking&) = delete;
  FileInTheMaking& operator=(const FileInTheMaking&) = delete;
  ~FileInTheMaking() { unlink(path.c_str()); }

  const std::string& Path() const { return path; }

  void TakeName(bool replace) {
    Flush(path);
    const int result =
        replace ? rename(path.c_str(), wanted.c_str()) : link(path.c_str(), wanted.c_str());
    if (result != 0) ThrowErrno("Unable to make ", wanted);
    Flush(directory);
  }

 private:
  static void Flush(const std::string& path) {
    const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file.IsOpen() || fsync(file.Number()) != 0) {
      ThrowErrno("Unable to write ", path);
    }
  }

  const std::string wanted;
  const std::string directory;
  std::string path;
};

// A root that has never run lacks even /var.
void MakeDirectory(const std::filesystem::path& directory) {
  std::error_code ignored;
  std::filesystem::create_directories(directory.parent_path().parent_path(), ignored);
  mkdir(directory.parent_path().c_str(), S_IRWXU);
  if (mkdir(directory.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    ThrowErrno("Unable to create the directory ", directory.native());
  }
}

bool LacksDescriptors(const HostError& failure) {
  return failure.Code() == EMFILE || failure.Code() == ENFILE;
}

// The copy as the database "saved" beside the state.
class AttachedCopy {
 public:
  AttachedCopy(Store& target, const std::string& copy) : store(target) {
    try {
      store.Run("ATTACH DATABASE ?1 AS saved", copy);
    } catch (const HostError& failure) {
      if (LacksDescriptors(failure)) throw;
      throw HostError(EIO, kDamaged);
    }
  }
  AttachedCopy(const AttachedCopy&) = delete;
  AttachedCopy& operator=(const AttachedCopy&) = delete;
  ~AttachedCopy() {
    try {
      store.Run("DETACH DATABASE saved");
    } catch (const HostError&) {
      // Stays until the connection goes.
    }
  }

  void RequireUsable() {
    try {
      RequireSameLayout();
      Rows rows = store.Select("PRAGMA saved.quick_check(1)");
      if (rows.Next() && rows.Text(0) == "ok") return;
    } catch (const HostError& failure) {
      if (failure.Code() == EPROTO || LacksDescriptors(failure)) throw;
    }
    throw HostError(EIO, kDamaged);
  }

 private:
  static constexpr char kDamaged[] = "it is damaged";

  void RequireSameLayout() {
    if (Number("PRAGMA saved.application_id") != Number("PRAGMA main.application_id")) {
      throw HostError(EPROTO, "it is no saved state");
    }
    const std::int64_t saved = Number("PRAGMA saved.user_version");
    const std::int64_t current = Number("PRAGMA main.user_version");
    if (saved == current) return;
    throw HostError(EPROTO, StrCat("it has schema ", saved, ", this program works with schema ",
                                   current, ": it was saved by another version"));
  }

  std::int64_t Number(Sql query) {
    Rows rows = store.Select(query);
    return rows.Next() ? rows.Integer(0) : 0;
  }

  Store& store;
};

void RefuseHomelessWorlds(HostState& state) {
  std::vector<std::pair<unsigned int, std::string>> gone;
  {
    Rows rows = state.Database().Select(
        "SELECT id, name FROM main.domain WHERE name NOT IN (SELECT name FROM saved.domain) "
        "ORDER BY name");
    while (rows.Next()) {
      gone.emplace_back(static_cast<unsigned int>(rows.Integer(0)), rows.Text(1));
    }
  }
  for (const auto& [id, name] : gone) {
    if (state.Worlds().CountIn(id) == 0) continue;
    throw HostError(EBUSY, StrCat("worlds run in the domain '", name,
                                  "', which it does not have. End them, and run it again"));
  }
}

// The module knows a domain by its number, and a process cannot be taken from one to the other in
// the same moment.
void RefuseMovingWorlds(HostState& state) {
  std::vector<std::pair<unsigned int, std::string>> moving;
  {
    Rows rows = state.Database().Select(
        "SELECT d.id, d.name FROM main.domain AS d JOIN saved.domain AS s ON s.name = d.name "
        "WHERE s.id <> d.id ORDER BY d.name");
    while (rows.Next()) {
      moving.emplace_back(static_cast<unsigned int>(rows.Integer(0)), rows.Text(1));
    }
  }
  for (const auto& [id, name] : moving) {
    if (state.Worlds().KeptIn(id).empty()) continue;
    throw HostError(EBUSY, StrCat("worlds run in the domain '", name,
                                  "', which has another number in it. End them, and run it again"));
  }
}

// Domains may have changed places since, so what belongs to worlds follows the names; by way of
// negative numbers, as two domains may have swapped theirs.
constexpr Sql kMoveWorlds[] = {
    R"(DELETE FROM main.world WHERE domain_id NOT IN
       (SELECT d.id FROM main.domain AS d JOIN saved.domain AS s ON s.name = d.name))",
    R"(UPDATE main.world SET domain_id = (SELECT s.id FROM main.domain AS d
       JOIN saved.domain AS s ON s.name = d.name WHERE d.id = world.domain_id))",
    R"(DELETE FROM main.file_policy WHERE world = 0 OR domain_id NOT IN
       (SELECT d.id FROM main.domain AS d JOIN saved.domain AS s ON s.name = d.name))",
    R"(UPDATE main.file_policy SET domain_id = -1 - (SELECT s.id FROM main.domain AS d
       JOIN saved.domain AS s ON s.name = d.name WHERE d.id = file_policy.domain_id))",
    R"(UPDATE main.file_policy SET domain_id = -1 - domain_id)",
    R"(INSERT INTO main.file_policy (domain_id, world, path, permission, line, load)
       SELECT domain_id, world, path, permission, line, load FROM saved.file_policy WHERE world = 0
       ORDER BY id)",
};

// Files may carry the number of a label: it keeps the one that it has here.
void RenewLabels(HostState& state) {
  state.Database().Run("DELETE FROM main.label WHERE name NOT IN (SELECT name FROM saved.label)");
  std::vector<std::string> saved;
  {
    Rows rows = state.Database().Select("SELECT name FROM saved.label ORDER BY id");
    while (rows.Next()) saved.push_back(rows.Text(0));
  }
  state.Forget();
  state.Labels().Add(saved);
}

// The tables that come back as they were. Their rows are read in the order of their numbers.
void PutTablesBack(Store& store) {
  for (const StateTable& table : kStateTables) {
    if (!table.isPutBack) continue;
    store.RunScript(StrCat("DELETE FROM main.", table.name, "; INSERT INTO main.", table.name,
                           " SELECT * FROM saved.", table.name));
  }
}

}  // namespace

void SaveState(const std::string& from, const std::string& to, bool replace) {
  MakeDirectory(std::filesystem::path(to).parent_path());
  FileInTheMaking file(to);
  PreparePrivateFile(file.Path(), kSavedPurpose);
  CopyDatabase(from, CopyOf::kState, file.Path());
  Seal(file.Path());
  const std::string damage = FindBrokenSeal(file.Path());
  if (!damage.empty()) throw HostError(EIO, StrCat("Unable to copy ", from, ": ", damage));
  file.TakeName(replace);
}

void RestorePolicy(const std::string& copy) {
  HostState& state = HostState::Current();
  Store& store = state.Database();
  AttachedCopy attached(store, copy);
  attached.RequireUsable();

  Transaction transaction(store);
  RefuseHomelessWorlds(state);
  RefuseMovingWorlds(state);
  for (const Sql& statement : kMoveWorlds) store.Run(statement);
  PutTablesBack(store);
  RenewLabels(state);
  // Every process notices.
  store.Run(
      "UPDATE main.state SET domain_version = domain_version + 1, label_version = label_version + "
      "1");
  transaction.Commit();
  state.Refresh();
}

}  // namespace LinuxHost
