#include "hostile_tree.h"

#include <dirent.h>
#include <fcntl.h>
#include <fts.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <stdexcept>

#include "support/message_of.h"

namespace HostileTest {
namespace {

using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr std::uint32_t kFirstLabelId = 2;

void Require(bool done, const std::string& what) {
  if (!done) throw std::runtime_error(what + ": " + std::strerror(errno));
}

// Where the Linux host keeps labels on this machine and for this user.
const char* Attribute() {
  static const bool privileged = [] {
    char name[] = "/tmp/hostile-probe-XXXXXX";
    const int file = mkstemp(name);
    Require(file >= 0, "mkstemp");
    unlink(name);
    const bool may = fsetxattr(file, "security.bpf.zorvan", "", 0, 0) == 0;
    close(file);
    return may;
  }();
  return privileged ? "security.bpf.zorvan" : "user.zorvan.security";
}

}  // namespace

bool LongRun() { return std::getenv("SECPOLICY_LONG_TESTS") != nullptr; }

void GiveFirstLabel(const std::string& path) {
  Require(lsetxattr(path.c_str(), Attribute(), &kFirstLabelId, sizeof kFirstLabelId, 0) == 0, path);
}

void GiveFirstLabel(int descriptor) {
  Require(fsetxattr(descriptor, Attribute(), &kFirstLabelId, sizeof kFirstLabelId, 0) == 0,
          "fsetxattr");
}

std::string LabelOf(const std::string& path) {
  std::uint32_t id = 0;
  if (lgetxattr(path.c_str(), Attribute(), &id, sizeof id) < 0) return "";
  TeskAccessInterfaceImpl access;
  return access.GetLabel(id, TESKACCESS_LABEL_OBJECT);
}

unsigned int OpenDescriptors() {
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir("/proc/self/fd"), closedir);
  unsigned int count = 0;
  while (readdir(directory.get()) != nullptr) ++count;
  return count - 3;  // ".", ".." and the directory's own
}

void HostileTree::SetUp() {
  setenv("SECPOLICY_HOST_STATE", (scratch / "state/host.db").c_str(), 1);
  setenv("SECPOLICY_HOST_CONFIG", (scratch / "state/config.db").c_str(), 1);
  MakeDirectory(tree);
  MakeDirectory(outside);
  Require(mkdir(unlabelled.c_str(), 0755) == 0, unlabelled);
  access = std::make_unique<TeskAccessInterfaceImpl>();
  access->AddLabels({kLabel}, TESKACCESS_LABEL_OBJECT);
}

void HostileTree::TearDown() {
  access.reset();
  RemoveTree(scratch.Path());  // The tree may be too deep for the directory to remove it.
}

void HostileTree::MakeFile(const std::string& path) const {
  const int file = open(path.c_str(), O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, 0644);
  Require(file >= 0, path);
  GiveFirstLabel(file);
  close(file);
}

void HostileTree::MakeDirectory(const std::string& path) const {
  Require(mkdir(path.c_str(), 0755) == 0, path);
  GiveFirstLabel(path);
}

std::string HostileTree::LabelTree() {
  return SecPolicyTest::MessageOf(
      [this] { SecPolicy::SetDirLabelRecursive(tree, kLabel, *access); });
}

void RemoveTree(const std::string& path) {
  char* const roots[] = {const_cast<char*>(path.c_str()), nullptr};
  FTS* const entries = fts_open(roots, FTS_PHYSICAL | FTS_NOSTAT, nullptr);
  Require(entries != nullptr, path);
  while (const FTSENT* entry = fts_read(entries)) {
    if (entry->fts_info == FTS_D) continue;
    unlinkat(AT_FDCWD, entry->fts_accpath, entry->fts_info == FTS_DP ? AT_REMOVEDIR : 0);
  }
  fts_close(entries);
}

}  // namespace HostileTest
