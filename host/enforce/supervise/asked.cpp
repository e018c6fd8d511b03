#include "host/enforce/supervise/asked.h"

#include <elf.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstring>
#include <limits>
#include <map>
#include <string>

#include "host/enforce/supervise/inquiry.h"
#include "host/enforce/supervise/privileges.h"
#include "host/enforce/system_calls.h"

namespace Enforce {
namespace {

using Policy::FileAccess;
using Policy::RuleKind;

// Ports below are root's.
constexpr int kFirstOpenPort = 1024;

// How often a script may be the interpreter of a script.
constexpr int kMostInterpreters = 4;

// ---- Files

const char* KindOf(mode_t mode) {
  if (S_ISDIR(mode)) return "directory";
  if (S_ISLNK(mode)) return "symlink";
  if (S_ISFIFO(mode)) return "fifo";
  if (S_ISCHR(mode)) return "char_device";
  if (S_ISBLK(mode)) return "block_device";
  return "regular";
}

void Make(Inquiry& inquiry, const std::optional<Place>& place, const char* kind) {
  if (!place || place->Exists()) return;
  inquiry.AskMaking(RuleKind::kFileCreation, kind, place->path);
  AskEntry(inquiry, *place);
}

void Remove(Inquiry& inquiry, const std::optional<Place>& place) {
  if (!place || !place->Exists()) return;
  inquiry.AskFile(FileAccess::kRemove, place->path);
  AskEntry(inquiry, *place);
}

void Truncate(Inquiry& inquiry, const std::optional<Place>& place) {
  if (!place || !place->Exists()) return;
  inquiry.AskFile(FileAccess::kTruncate, place->path);
  AskUse(inquiry, *place, W_OK);
}

void AskAccess(Inquiry& inquiry, const Place& place, int flags) {
  const int mode = flags & O_ACCMODE;
  if (mode != O_WRONLY) inquiry.AskFile(FileAccess::kRead, place.path);
  if (mode != O_RDONLY) inquiry.AskFile(FileAccess::kWrite, place.path);
  if (!place.Exists()) return;
  if (mode != O_WRONLY) AskUse(inquiry, place, R_OK);
  if (mode != O_RDONLY) AskUse(inquiry, place, W_OK);
}

void List(Inquiry& inquiry, const Place& directory) {
  inquiry.AskFile(FileAccess::kList, directory.path);
  AskUse(inquiry, directory, R_OK);
}

void Open(Inquiry& inquiry, int directory, int path, int flags) {
  if ((flags & O_PATH) != 0) return;
  const bool keepsLink =
      (flags & O_NOFOLLOW) != 0 || (flags & (O_CREAT | O_EXCL)) == (O_CREAT | O_EXCL);
  const auto place =
      inquiry.PlaceOf(directory, path, keepsLink ? LastLink::kKept : LastLink::kFollowed);
  if (!place) return;
  if ((flags & O_TMPFILE) == O_TMPFILE) {
    return inquiry.AskMaking(RuleKind::kFileCreation, "regular", place->path + "/unnamed");
  }
  if (place->IsDirectory()) return List(inquiry, *place);
  if (!place->Exists() && (flags & O_CREAT) == 0) return;
  Make(inquiry, place, "regular");
  AskAccess(inquiry, *place, flags);
  if ((flags & O_TRUNC) != 0) Truncate(inquiry, place);
}

void OpenByStructure(Inquiry& inquiry) {
  open_how how = {};
  if (!inquiry.From().Read(inquiry.Address(2), &how, sizeof how)) return;
  Open(inquiry, inquiry.Number(0), 1, static_cast<int>(how.flags));
}

void Rename(Inquiry& inquiry, const std::optional<Place>& from, const std::optional<Place>& to,
            unsigned int flags) {
  if (!from || !to || !from->Exists()) return;
  Remove(inquiry, from);
  Remove(inquiry, to);
  inquiry.AskMaking(RuleKind::kFileCreation, KindOf(from->mode), to->path);
  AskEntry(inquiry, *to);
  if ((flags & RENAME_EXCHANGE) == 0 || !to->Exists()) return;
  inquiry.AskMaking(RuleKind::kFileCreation, KindOf(to->mode), from->path);
}

void Link(Inquiry& inquiry, const std::optional<Place>& from, const std::optional<Place>& to) {
  if (from && from->Exists()) Make(inquiry, to, KindOf(from->mode));
}

void MakeNode(Inquiry& inquiry, const std::optional<Place>& place, mode_t mode) {
  if (!place || place->Exists()) return;
  if (S_ISSOCK(mode)) {
    return inquiry.AskMaking(RuleKind::kUnixSocketCreation, "stream", place->path);
  }
  Make(inquiry, place, KindOf(mode));
}

void TruncateOpen(Inquiry& inquiry) {
  const auto path = inquiry.From().PathOf(inquiry.Number(0));
  if (path) inquiry.AskFile(FileAccess::kTruncate, *path);
}

// ---- Programs

// The program that a script names in its first line; empty when it is none.
std::string ScriptInterpreter(std::string_view head) {
  if (!head.starts_with("#!")) return "";
  head = head.substr(2, head.find('\n') - 2);
  head.remove_prefix(std::min(head.find_first_not_of(" \t"), head.size()));
  return std::string(head.substr(0, head.find_first_of(" \t")));
}

// The loader that a dynamically linked program names; empty when it names none.
std::string LoaderOf(int file, std::string_view head) {
  Elf64_Ehdr header = {};
  if (!head.starts_with(ELFMAG) || head.size() < sizeof header) return "";
  std::memcpy(&header, head.data(), sizeof header);
  for (std::size_t index = 0; index < header.e_phnum; ++index) {
    Elf64_Phdr part = {};
    const auto place = static_cast<off_t>(header.e_phoff + index * sizeof part);
    if (pread(file, &part, sizeof part, place) != sizeof part) return "";
    if (part.p_type != PT_INTERP) continue;
    std::array<char, 256> path = {};
    const std::size_t size = std::min<std::size_t>(part.p_filesz, path.size() - 1);
    const bool isRead = pread(file, path.data(), size, static_cast<off_t>(part.p_offset)) ==
                        static_cast<ssize_t>(size);
    return isRead ? path.data() : "";
  }
  return "";
}

// What the kernel executes in place of a program, or beside it.
std::string InterpreterOf(const Place& program, const Caller& caller) {
  const FileDescriptor file = caller.OpenForReading(program);
  std::array<char, 256> bytes = {};
  const ssize_t size = file.IsOpen() ? pread(file.Number(), bytes.data(), bytes.size(), 0) : -1;
  if (size <= 0) return "";
  const std::string_view head(bytes.data(), static_cast<std::size_t>(size));
  const std::string script = ScriptInterpreter(head);
  return script.empty() ? LoaderOf(file.Number(), head) : script;
}

void Execute(Inquiry& inquiry, std::optional<Place> program) {
  for (int depth = 0; depth <= kMostInterpreters; ++depth) {
    if (!program || !program->Exists() || !S_ISREG(program->mode)) return;
    inquiry.AskFile(FileAccess::kExecute, program->path);
    inquiry.AskFile(FileAccess::kRead, program->path);
    AskUse(inquiry, *program, X_OK);
    const std::string interpreter = InterpreterOf(*program, inquiry.From());
    if (interpreter.empty()) return;
    program = inquiry.From().Resolve(AT_FDCWD, interpreter, LastLink::kFollowed);
  }
}

void ExecuteAt(Inquiry& inquiry) {
  const auto path = inquiry.From().ReadText(inquiry.Address(1));
  if (!path) return;
  if (!path->empty()) {
    return Execute(inquiry, inquiry.From().Resolve(inquiry.Number(0), *path, LastLink::kFollowed));
  }
  const auto opened = inquiry.From().PathOf(inquiry.Number(0));
  if (opened) Execute(inquiry, inquiry.From().Resolve(AT_FDCWD, *opened, LastLink::kFollowed));
}

// ---- Sockets

int OptionOf(int socket, int option) {
  int value = -1;
  socklen_t size = sizeof value;
  return getsockopt(socket, SOL_SOCKET, option, &value, &size) == 0 ? value : -1;
}

bool IsInternet(int family) { return family == AF_INET || family == AF_INET6; }

// What a call gives or reaches: an address of one of the families that rules speak of.
struct SocketAddress {
  int family = AF_UNSPEC;
  std::uint16_t port = 0;
  std::string path;  // of a unix socket that has a name in the file system
};

std::optional<SocketAddress> ReadAddress(const Caller& caller, std::uint64_t address,
                                         std::size_t size) {
  union {
    sockaddr any;
    sockaddr_in inet;
    sockaddr_un local;
    std::array<char, sizeof(sockaddr_storage)> bytes;
  } read = {};
  size = std::min(size, sizeof read);
  if (size < sizeof(sa_family_t) || !caller.Read(address, &read, size)) return std::nullopt;
  SocketAddress found = {.family = read.any.sa_family, .port = 0, .path = {}};
  if (IsInternet(found.family)) found.port = ntohs(read.inet.sin_port);
  if (found.family == AF_UNIX && size > offsetof(sockaddr_un, sun_path)) {
    const std::size_t length = size - offsetof(sockaddr_un, sun_path);
    found.path.assign(read.local.sun_path, strnlen(read.local.sun_path, length));
  }
  return found;
}

const char* SocketKind(int type) {
  if (type == SOCK_DGRAM) return "dgram";
  return type == SOCK_SEQPACKET ? "seqpacket" : "stream";
}

void BindLocal(Inquiry& inquiry, int socket, const std::string& path) {
  inquiry.AskCheck("socket_family", AF_UNIX);
  if (path.empty()) return;
  const auto place = inquiry.From().Resolve(AT_FDCWD, path, LastLink::kKept);
  if (!place || place->Exists()) return;
  inquiry.AskMaking(RuleKind::kUnixSocketCreation, SocketKind(OptionOf(socket, SO_TYPE)),
                    place->path);
  AskEntry(inquiry, *place);
}

// What a socket is once more when it is used, since some are only made.
void AskType(Inquiry& inquiry, const FileDescriptor& socket) {
  const int type = socket.IsOpen() ? OptionOf(socket.Number(), SO_TYPE) : -1;
  if (type >= 0) inquiry.AskCheck("socket_type", static_cast<std::uint32_t>(type));
}

void Bind(Inquiry& inquiry) {
  const auto address = ReadAddress(inquiry.From(), inquiry.Address(1), inquiry.Word(2));
  const FileDescriptor socket = inquiry.From().Share(inquiry.Number(0));
  if (!address || !socket.IsOpen()) return;
  if (address->family == AF_UNIX) return BindLocal(inquiry, socket.Number(), address->path);
  if (!IsInternet(address->family)) return;
  AskType(inquiry, socket);
  inquiry.AskCheck("bind_port", address->port);
  if (address->port != 0 && address->port < kFirstOpenPort) {
    inquiry.AskCapability("cap_net_bind_service");
  }
}

// A socket that waits may have been given its port by the kernel.
void Listen(Inquiry& inquiry) {
  const FileDescriptor socket = inquiry.From().Share(inquiry.Number(0));
  if (IsInternet(OptionOf(socket.Number(), SO_DOMAIN))) inquiry.AskCheck("bind_port", 0);
}

// Programs look for local services that are not there, and go on without: that takes no rule.
void ReachLocal(Inquiry& inquiry, const std::string& path) {
  if (!path.empty()) {
    const auto place = inquiry.From().Resolve(AT_FDCWD, path, LastLink::kFollowed);
    if (!place || !place->Exists()) return;
    inquiry.AskFile(FileAccess::kWrite, place->path);
    AskUse(inquiry, *place, W_OK);
  }
  inquiry.AskCheck("socket_family", AF_UNIX);
}

void Reach(Inquiry& inquiry, std::uint64_t location, std::size_t size) {
  if (location == 0) return;
  const auto address = ReadAddress(inquiry.From(), location, size);
  if (!address) return;
  if (address->family == AF_UNIX) return ReachLocal(inquiry, address->path);
  if (!IsInternet(address->family)) return;
  AskType(inquiry, inquiry.From().Share(inquiry.Number(0)));
  inquiry.AskCheck("connect_port", address->port);
}

void SendMessage(Inquiry& inquiry) {
  msghdr message = {};
  if (!inquiry.From().Read(inquiry.Address(1), &message, sizeof message)) return;
  Reach(inquiry, reinterpret_cast<std::uintptr_t>(message.msg_name), message.msg_namelen);
}

constexpr std::uint32_t kSocketTypeBits = 0xff;

// A local socket is asked for where it reaches something.
void MakeSocket(Inquiry& inquiry) {
  const std::uint32_t type = inquiry.Word(1) & kSocketTypeBits;
  if (inquiry.Word(0) == AF_UNIX) return;
  inquiry.AskCheck("socket_family", inquiry.Word(0));
  inquiry.AskCheck("socket_type", type);
}

void MakeSocketPair(Inquiry& inquiry) {
  inquiry.AskCheck("socket_family", inquiry.Word(0));
  inquiry.AskCheck("socket_type", inquiry.Word(1) & kSocketTypeBits);
}

// ---- Identities

// The first `count` arguments are identities; -1 leaves one as it is.
template <int count>
void Check(Inquiry& inquiry, const char* check) {
  for (int argument = 0; argument < count; ++argument) {
    const std::uint32_t identity = inquiry.Word(argument);
    if (identity != std::numeric_limits<std::uint32_t>::max()) inquiry.AskCheck(check, identity);
  }
}

template <int count>
void TakeUsers(Inquiry& inquiry) {
  Check<count>(inquiry, "set_uid");
}

template <int count>
void TakeGroups(Inquiry& inquiry) {
  Check<count>(inquiry, "set_gid");
}

// ---- The calls

template <int argument>
void CheckSignal(Inquiry& inquiry) {
  inquiry.AskCheck("kill_signal", inquiry.Word(argument));
}

void ChangeDirectory(Inquiry& inquiry) {
  const auto place = inquiry.PlaceOf(AT_FDCWD, 0, LastLink::kFollowed);
  if (place && place->Exists()) AskUse(inquiry, *place, X_OK);
}

using Reader = void (*)(Inquiry&);

const std::map<std::string_view, Reader>& Readers() {
  constexpr auto kHere = AT_FDCWD;
  constexpr auto kKept = LastLink::kKept;
  constexpr auto kFollowed = LastLink::kFollowed;
  using I = Inquiry;
  static const std::map<std::string_view, Reader> readers = {
      {"bind", Bind},
      {"chdir", ChangeDirectory},
      {"clone", [](I& i) { i.AskCheck("clone_flags", i.Word(0)); }},
      {"connect", [](I& i) { Reach(i, i.Address(1), i.Word(2)); }},
      {"creat", [](I& i) { Open(i, kHere, 0, O_CREAT | O_WRONLY | O_TRUNC); }},
      {"execve", [](I& i) { Execute(i, i.PlaceOf(kHere, 0, kFollowed)); }},
      {"execveat", ExecuteAt},
      {"ftruncate", TruncateOpen},
      {"ioctl", [](I& i) { i.AskCheck("ioctl_request", i.Word(1)); }},
      {"kill", CheckSignal<1>},
      {"link", [](I& i) { Link(i, i.PlaceOf(kHere, 0, kKept), i.PlaceOf(kHere, 1, kKept)); }},
      {"linkat",
       [](I& i) { Link(i, i.PlaceOf(i.Number(0), 1, kKept), i.PlaceOf(i.Number(2), 3, kKept)); }},
      {"listen", Listen},
      {"mkdir", [](I& i) { Make(i, i.PlaceOf(kHere, 0, kKept), "directory"); }},
      {"mkdirat", [](I& i) { Make(i, i.PlaceOf(i.Number(0), 1, kKept), "directory"); }},
      {"mknod", [](I& i) { MakeNode(i, i.PlaceOf(kHere, 0, kKept), i.Word(1)); }},
      {"mknodat", [](I& i) { MakeNode(i, i.PlaceOf(i.Number(0), 1, kKept), i.Word(2)); }},
      {"open", [](I& i) { Open(i, kHere, 0, i.Number(1)); }},
      {"openat", [](I& i) { Open(i, i.Number(0), 1, i.Number(2)); }},
      {"openat2", OpenByStructure},
      {"pidfd_send_signal", CheckSignal<1>},
      {"prctl", [](I& i) { i.AskCheck("prctl_option", i.Word(0)); }},
      {"rename",
       [](I& i) { Rename(i, i.PlaceOf(kHere, 0, kKept), i.PlaceOf(kHere, 1, kKept), 0); }},
      {"renameat",
       [](I& i) {
         Rename(i, i.PlaceOf(i.Number(0), 1, kKept), i.PlaceOf(i.Number(2), 3, kKept), 0);
       }},
      {"renameat2",
       [](I& i) {
         Rename(i, i.PlaceOf(i.Number(0), 1, kKept), i.PlaceOf(i.Number(2), 3, kKept), i.Word(4));
       }},
      {"rmdir", [](I& i) { Remove(i, i.PlaceOf(kHere, 0, kKept)); }},
      {"rt_sigqueueinfo", CheckSignal<1>},
      {"rt_tgsigqueueinfo", CheckSignal<2>},
      {"sendmmsg", SendMessage},  // its messages begin as those of sendmsg do
      {"sendmsg", SendMessage},
      {"sendto", [](I& i) { Reach(i, i.Address(4), i.Word(5)); }},
      {"setfsgid", TakeGroups<1>},
      {"setfsuid", TakeUsers<1>},
      {"setgid", TakeGroups<1>},
      {"setregid", TakeGroups<2>},
      {"setresgid", TakeGroups<3>},
      {"setresuid", TakeUsers<3>},
      {"setreuid", TakeUsers<2>},
      {"setuid", TakeUsers<1>},
      {"socket", MakeSocket},
      {"socketpair", MakeSocketPair},
      {"symlink", [](I& i) { Make(i, i.PlaceOf(kHere, 1, kKept), "symlink"); }},
      {"symlinkat", [](I& i) { Make(i, i.PlaceOf(i.Number(1), 2, kKept), "symlink"); }},
      {"tgkill", CheckSignal<2>},
      {"tkill", CheckSignal<1>},
      {"truncate", [](I& i) { Truncate(i, i.PlaceOf(kHere, 0, kFollowed)); }},
      {"unlink", [](I& i) { Remove(i, i.PlaceOf(kHere, 0, kKept)); }},
      {"unlinkat", [](I& i) { Remove(i, i.PlaceOf(i.Number(0), 1, kKept)); }},
      {"unshare", [](I& i) { i.AskCheck("clone_flags", i.Word(0)); }},
  };
  return readers;
}

}  // namespace

bool AsksMore(std::string_view call) { return Readers().contains(call) || TakesCapability(call); }

std::vector<Policy::Question> AskedBy(const seccomp_data& call, const Caller& caller) {
  const std::string_view name = NameOf(call.nr);
  Inquiry inquiry(call, caller);
  const auto reader = Readers().find(name);
  if (reader != Readers().end()) reader->second(inquiry);
  AskCapabilities(inquiry, name);
  return std::move(inquiry).Take();
}

}  // namespace Enforce
