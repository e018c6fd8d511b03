// Which connection a thread has to the state in use. Most functions of the contract are handed no
// state, so there is one connection for each thread, opened when it is first needed and replaced
// when it no longer fits: after a fork, when another state is used, and when another file lies in
// the place of the one that is open, as after a boot that has moved a damaged one aside.
#include "host/linux/state/host_state.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdint>
#include <filesystem>

#include "braxo/misc/strcat.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/state/schema.h"

namespace LinuxHost {

namespace {

// Of the calling thread.
std::shared_ptr<HostState>& Connection() {
  thread_local std::shared_ptr<HostState> connection;
  return connection;
}

void RecordFile(Store& store, const InodeOrigin& origin) {
  store.Run("DELETE FROM unpacked_file WHERE device = ?1 AND inode = ?2", origin.device,
            origin.inode);
  if (!origin.generation) return;
  store.Run("INSERT INTO unpacked_file VALUES (?1, ?2, ?3, ?4)", origin.device, origin.inode,
            *origin.generation, origin.tardisk);
}

bool IsOfUsedState(HostState* connection) {
  if (connection == nullptr || connection->Database().WasForked()) return false;
  // A load keeps to the state that it began with.
  return connection->CurrentLoad() != 0 || connection->Database().Path() == StatePath();
}

}  // namespace

HostState& HostState::Current() {
  HostState& known = Known();
  if (known.CurrentLoad() != 0 || known.Database().IsCurrent()) return known;
  Connection().reset();
  return Known();
}

HostState& HostState::Known() {
  std::shared_ptr<HostState>& connection = Connection();
  if (!IsOfUsedState(connection.get())) {
    connection.reset();
    connection = std::make_shared<HostState>(StatePath(), ShownStatePath());
  }
  return *connection;
}

HostState* HostState::Find() {
  struct stat status;
  // Anything but a missing file is for the store to judge.
  const bool isMissing =
      lstat(StatePath().c_str(), &status) != 0 && (errno == ENOENT || errno == ENOTDIR);
  return isMissing ? nullptr : &Current();
}

HostState::HostState(const std::string& path, const std::string& shownAs)
    : StateBase(path, shownAs),
      worlds(Database()),
      domains(*this, worlds),
      labels(*this),
      keywords(domains, labels),
      rules(*this, domains, keywords),
      parameterRules(*this, domains, keywords),
      filePolicies(*this, domains) {}

std::string HostState::Directory() {
  return std::filesystem::path(Database().Path()).parent_path();
}

void HostState::Reset() {
  Store& store = Database();
  Transaction transaction(store);
  for (const StateTable& table : kStateTables) {
    store.RunScript(Braxo::Misc::StrCat("DELETE FROM ", table.name));
  }
  store.RunScript(kStateLayout.firstRows);
  // Numbers of labels go on, as files may carry those that were; and versions, so that every
  // process notices.
  store.Run(
      "UPDATE state SET domain_version = domain_version + 1, label_version = label_version + 1, "
      "label_attribute = '', label_index = ?1",
      kLabelsChanged);
  transaction.Commit();
  Forget();
  Refresh();
}

void HostState::RecordOrigins(std::span<const InodeOrigin> origins) {
  Store& store = Database();
  Transaction transaction(store);
  for (const auto& origin : origins) {
    store.Run("INSERT OR REPLACE INTO inode_origin VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)",
              origin.device, origin.inode, origin.tardisk, origin.path, origin.birth, origin.size,
              origin.modified);
    RecordFile(store, origin);
  }
  transaction.Commit();
}

std::optional<InodeOrigin> HostState::FindOrigin(dev_t device, ino_t inode) {
  Rows rows = Database().Select(
      "SELECT tardisk, path, birth, size, modified FROM inode_origin WHERE device = ?1 AND inode = "
      "?2",
      device, inode);
  if (!rows.Next()) return std::nullopt;
  return InodeOrigin{.device = device,
                     .inode = inode,
                     .tardisk = rows.Text(0),
                     .path = rows.Text(1),
                     .birth = rows.Integer(2),
                     .size = static_cast<std::uint64_t>(rows.Integer(3)),
                     .modified = rows.Integer(4)};
}

void HostState::ForEachUnpackedFile(const std::function<void(const UnpackedFile&)>& visit) {
  Rows rows = Database().Select("SELECT device, inode, generation, tardisk FROM unpacked_file");
  while (rows.Next()) {
    visit({.device = static_cast<dev_t>(rows.Integer(0)),
           .inode = static_cast<ino_t>(rows.Integer(1)),
           .generation = static_cast<std::uint32_t>(rows.Integer(2)),
           .tardisk = rows.Text(3)});
  }
}

}  // namespace LinuxHost
