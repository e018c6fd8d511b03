// An archive given to boot: whatever it holds, unpacking writes nothing outside the root.
//
// An input is an archive, or, behind a "+" and a line end, a list of what one holds, one entry a
// line:
//   f PATH CONTENT    d PATH    s PATH TARGET (symbolic link)    h PATH TARGET (hard link)
//   p PATH (fifo)     c PATH (device)                            k PATH (socket)

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/boot.h"
#include "support/message_of.h"
#include "support/reference_reader.h"
#include "support/require.h"
#include "support/temporary_directory.h"

namespace SecPolicyFuzz {
namespace {

namespace fs = std::filesystem;
using SecPolicyTest::MessageOf;

constexpr int kSkipped = 77;
const LinuxHost::TardiskRules kRules{.policyRoot = "/etc/zorvan/secpolicy", .policyTardisks = {}};
constexpr rlim_t kLargestFile = 4 << 20;

// ---- The archive.

struct FreeWriter {
  void operator()(archive* writer) const { archive_write_free(writer); }
};
struct FreeEntry {
  void operator()(archive_entry* entry) const { archive_entry_free(entry); }
};

mode_t TypeOf(const std::string& letter) {
  static const std::map<std::string, mode_t> types = {
      {"f", AE_IFREG}, {"d", AE_IFDIR}, {"s", AE_IFLNK},  {"h", AE_IFREG},
      {"p", AE_IFIFO}, {"c", AE_IFCHR}, {"k", AE_IFSOCK},
  };
  const auto type = types.find(letter);
  return type == types.end() ? 0 : type->second;
}

// What cannot be put into an archive is left out.
void WriteEntry(archive* writer, const Words& words) {
  if (words.size() < 2 || TypeOf(words[0]) == 0) return;
  const std::string rest = words.size() > 2 ? words[2] : "";
  const std::string content = words[0] == "f" ? rest : "";
  const std::unique_ptr<archive_entry, FreeEntry> entry(archive_entry_new());
  archive_entry_set_pathname(entry.get(), words[1].c_str());
  archive_entry_set_filetype(entry.get(), TypeOf(words[0]));
  archive_entry_set_perm(entry.get(), 0755);
  archive_entry_set_size(entry.get(), static_cast<la_int64_t>(content.size()));
  if (words[0] == "s") archive_entry_set_symlink(entry.get(), rest.c_str());
  if (words[0] == "h") archive_entry_set_hardlink(entry.get(), rest.c_str());
  if (archive_write_header(writer, entry.get()) != ARCHIVE_OK) return;
  archive_write_data(writer, content.data(), content.size());
}

std::string ArchiveOf(std::string_view list) {
  std::vector<char> bytes(1 << 20);
  std::size_t used = 0;
  {
    const std::unique_ptr<archive, FreeWriter> writer(archive_write_new());
    archive_write_set_format_pax_restricted(writer.get());
    archive_write_open_memory(writer.get(), bytes.data(), bytes.size(), &used);
    std::istringstream lines{std::string(list)};
    std::string line;
    while (std::getline(lines, line)) WriteEntry(writer.get(), ReadLine(line));
    archive_write_close(writer.get());
  }
  return {bytes.data(), used};
}

// ---- The place where it is unpacked.

void WriteFile(const fs::path& path, std::string_view text) {
  std::ofstream(path, std::ios::binary) << text;
}

// A world of its own in the directory for temporary files: the root, and beside it what an archive
// has no business with. The process is confined to it while it unpacks, so that an absolute path
// leads there, too.
class World {
 public:
  World()
      : outerRoot(open("/", O_PATH | O_DIRECTORY | O_CLOEXEC)),
        outerDirectory(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {
    for (const char* directory : {"etc", "beside", "state", "inside"}) {
      fs::create_directory(path / directory);
    }
    fs::permissions(path / "state", fs::perms::owner_all);
    WriteFile(path / "etc/passwd", "root\n");
    WriteFile(path / "beside/file", "untouched\n");
    fs::create_symlink("/etc", path / "beside/link");
    setenv("SECPOLICY_HOST_STATE", "/state/host.db", 1);
    before = Describe();
    OpenState();
  }
  World(const World&) = delete;
  World& operator=(const World&) = delete;
  ~World() {
    close(outerDirectory);
    close(outerRoot);
  }

  // Empties the root but for what an archive may stumble over. The image stays behind if the
  // process ends.
  void Prepare(std::string_view archive) const {
    const fs::path root = path / "inside/root";
    fs::remove_all(root);
    fs::create_directories(root / "sub");
    fs::create_directory_symlink("../../beside", root / "up");
    fs::create_directory_symlink("/beside", root / "absolute");
    fs::create_symlink("/beside/file", root / "filelink");
    fs::create_symlink("/beside/missing", root / "dangling");
    fs::create_hard_link(path / "beside/file", root / "shared");
    WriteFile(path / "image.tgz", archive);
  }

  // Returns why the archive was refused, empty when it was not.
  std::string Unpack(std::vector<LinuxHost::InodeOrigin>& origins) const {
    LinuxHost::AssembledRoot assembled;

    const bool entered = chroot(path.c_str()) == 0 && chdir("/inside/root") == 0;
    Require(entered, "the root can be entered");
    const std::string failure = MessageOf([&] {
      assembled.labelAttribute = LinuxHost::LabelAttribute();
      LinuxHost::UnpackTardisks({"/image.tgz"}, kRules, assembled);
    });
    origins = assembled.origins;
    struct stat here {
    }, root{};
    const bool stayed = stat(".", &here) == 0 && stat("/inside/root", &root) == 0 &&
                        here.st_dev == root.st_dev && here.st_ino == root.st_ino;
    const bool left = fchdir(outerRoot) == 0 && chroot(".") == 0 && fchdir(outerDirectory) == 0;
    Require(left, "the root can be left");
    Require(stayed, "the working directory is the root still: " + failure);
    return failure;
  }

  void RequireUntouched() const { RequireEqual(Describe(), before, "what is beside the root"); }

  // True when there is something of that name, which leads through no link, in the root.
  bool IsInRoot(const std::string& name) const {
    fs::path place = path / "inside/root";
    for (const fs::path& part : fs::path(name).relative_path()) {
      if (part.empty()) continue;  // behind a "/" at the end
      if (part == ".." || fs::is_symlink(fs::symlink_status(place))) return false;
      place /= part;
    }
    return fs::exists(fs::symlink_status(place));
  }

 private:
  // The host keeps its state open from the first label on.
  void OpenState() const {
    std::vector<LinuxHost::InodeOrigin> origins;
    Prepare(ArchiveOf("f first"));
    RequireEqual(Unpack(origins), "", "a good archive");
    Require(origins.size() == 1 && IsInRoot("first"), "a good archive is unpacked");
  }

  // The names of the extended attributes, by which a file is labelled.
  static std::string Labels(const fs::path& file) {
    char names[1024];
    const ssize_t size = llistxattr(file.c_str(), names, sizeof names);
    return {names, size < 0 ? 0 : static_cast<std::size_t>(size)};
  }

  // Everything but the root, the image and the host's own state and log.
  std::string Describe() const {
    std::map<std::string, std::string> entries;
    for (auto entry = fs::recursive_directory_iterator(path); entry != fs::end(entry); ++entry) {
      const std::string name = fs::relative(entry->path(), path);
      const bool isOwn = name == "inside/root" || name == "state" || name == "run";
      if (isOwn) entry.disable_recursion_pending();
      if (isOwn || name == "image.tgz") continue;
      struct stat status {};
      lstat(entry->path().c_str(), &status);
      std::ostringstream text;
      text << std::oct << status.st_mode << std::dec << " " << status.st_uid << " ";
      if (S_ISREG(status.st_mode))
        text << status.st_mtime << " " << std::ifstream(entry->path()).rdbuf();
      text << " " << Labels(entry->path());
      if (S_ISLNK(status.st_mode)) text << fs::read_symlink(entry->path());
      entries[name] = text.str();
    }
    std::string description;
    for (const auto& [name, text] : entries) description += name + ": " + text + "\n";
    return description;
  }

  int outerRoot;
  int outerDirectory;
  const SecPolicyTest::TemporaryDirectory scratch;
  const fs::path path = scratch.Path();
  std::string before;
};

// Files that an archive claims to be large stay out of memory.
class SmallFiles {
 public:
  SmallFiles() {
    std::signal(SIGXFSZ, SIG_IGN);
    getrlimit(RLIMIT_FSIZE, &before);
    const rlimit small{std::min(kLargestFile, before.rlim_max), before.rlim_max};
    setrlimit(RLIMIT_FSIZE, &small);
  }
  SmallFiles(const SmallFiles&) = delete;
  SmallFiles& operator=(const SmallFiles&) = delete;
  ~SmallFiles() { setrlimit(RLIMIT_FSIZE, &before); }

 private:
  rlimit before{};
};

int LowestFreeDescriptor() {
  const int descriptor = open("/dev/null", O_RDONLY | O_CLOEXEC);
  close(descriptor);
  return descriptor;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
  if (geteuid() == 0 && chroot("/") == 0) return 0;
  std::fprintf(stderr, "skipped: this needs the right to change the root directory\n");
  std::_Exit(kSkipped);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const World world;
  const std::string_view input = Text(data, size);
  const bool isList = input.starts_with("+\n");
  world.Prepare(isList ? ArchiveOf(input.substr(2)) : input);

  std::vector<LinuxHost::InodeOrigin> origins;
  const SmallFiles smallFiles;
  const int free = LowestFreeDescriptor();
  const std::string failure = world.Unpack(origins);

  Require(LowestFreeDescriptor() == free, "every file is closed: " + failure);
  world.RequireUntouched();
  std::set<fs::path> missing;
  for (const auto& origin : origins) {
    RequireEqual(origin.tardisk, "image.tgz", "the tardisk of " + origin.path);
    if (!world.IsInRoot(origin.path))
      missing.insert((fs::path(origin.path) / "").lexically_normal());
  }
  // An entry that cannot be made has removed an earlier one of its name by then.
  Require(missing.size() <= (failure.empty() ? 0 : 1),
          "what was brought is in the root: " + (missing.empty() ? "" : missing.begin()->string()));
  return 0;
}

}  // namespace SecPolicyFuzz
