#include "host/enforce/supervise/privileges.h"

#include <fcntl.h>
#include <linux/capability.h>
#include <linux/netlink.h>
#include <linux/prctl.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/timex.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <limits>
#include <map>

namespace Enforce {
namespace {

constexpr char kOverride[] = "cap_dac_override";
constexpr char kReadSearch[] = "cap_dac_read_search";

constexpr std::uint32_t kUnchanged = std::numeric_limits<std::uint32_t>::max();

struct Owned {
  mode_t mode = 0;
  uid_t owner = 0;
  gid_t group = 0;
};

std::optional<Owned> FactsOf(const std::string& path) {
  struct stat facts = {};
  if (lstat(path.c_str(), &facts) != 0) return std::nullopt;
  return Owned{.mode = facts.st_mode, .owner = facts.st_uid, .group = facts.st_gid};
}

Owned FactsOf(const Place& place) {
  return {.mode = place.mode, .owner = place.owner, .group = place.group};
}

// Only the first of the three that speaks of the actor counts.
bool IsPermitted(const Owned& file, const Credentials& actor, mode_t use) {
  constexpr unsigned int kOwners = 6;
  constexpr unsigned int kGroups = 3;
  unsigned int shift = 0;
  if (actor.user.ofFiles == file.owner) {
    shift = kOwners;
  } else if (actor.IsMember(file.group)) {
    shift = kGroups;
  }
  return ((file.mode >> shift) & use) == use;
}

bool OverridesModes(Inquiry& inquiry) {
  constexpr std::uint64_t kBits =
      (std::uint64_t{1} << CAP_DAC_OVERRIDE) | (std::uint64_t{1} << CAP_DAC_READ_SEARCH);
  return (inquiry.Actor().capabilities & kBits) != 0;
}

std::string DirectoryOf(const std::string& path) {
  return path.substr(0, std::max<std::size_t>(path.rfind('/'), 1));
}

// The directories on the way, without those above one that was entered before.
void AskSearch(Inquiry& inquiry, const Place& place) {
  std::string directory = place.path;
  while (directory.size() > 1 && directory != place.base) {
    directory = DirectoryOf(directory);
    const auto facts = FactsOf(directory);
    if (!facts || IsPermitted(*facts, inquiry.Actor(), X_OK)) continue;
    return inquiry.AskCapability(kReadSearch);
  }
}

void AskModes(Inquiry& inquiry, const Owned& file, int use) {
  if (IsPermitted(file, inquiry.Actor(), static_cast<mode_t>(use))) return;
  const bool isReading = use == R_OK || (S_ISDIR(file.mode) && use == X_OK);
  inquiry.AskCapability(isReading ? kReadSearch : kOverride);
}

// ---- Calls

bool IsOwner(Inquiry& inquiry, const Owned& file) {
  return inquiry.Actor().user.ofFiles == file.owner;
}

void AskChown(Inquiry& inquiry, const Place& place, std::uint32_t user, std::uint32_t group) {
  const Owned file = FactsOf(place);
  const bool keepsUser = user == kUnchanged || user == file.owner;
  const bool keepsGroup =
      group == kUnchanged || group == file.group || inquiry.Actor().IsMember(group);
  if (IsOwner(inquiry, file) && keepsUser && keepsGroup) return;
  inquiry.AskCapability("cap_chown");
}

void Chown(Inquiry& inquiry, const std::optional<Place>& place, int user) {
  if (!place || !place->Exists()) return;
  AskChown(inquiry, *place, inquiry.Word(user), inquiry.Word(user + 1));
}

void Chmod(Inquiry& inquiry, const std::optional<Place>& place) {
  if (place && place->Exists()) AskOwner(inquiry, *place);
}

// Without times that are given, who may write may set those of now.
void SetTimes(Inquiry& inquiry, const std::optional<Place>& place, int times) {
  if (inquiry.Address(times) != 0) Chmod(inquiry, place);
}

// What a descriptor is open for.
std::optional<Place> Opened(Inquiry& inquiry, int argument) {
  const auto path = inquiry.From().PathOf(inquiry.Number(argument));
  return path ? inquiry.From().Resolve(AT_FDCWD, *path, LastLink::kKept) : std::nullopt;
}

// The caller's own processes, and those of whom it could become, are free. A number below 0 is that
// of a group, which is the number of its first process.
void AskSignal(Inquiry& inquiry, pid_t process) {
  if (process == 0 || process == -1) return;
  const auto target = inquiry.From().Other(std::abs(process)).ActsAs();
  if (!target) return;
  const Identity& actor = inquiry.Actor().user;
  const auto isTargets = [&](std::uint32_t user) {
    return user == target->user.real || user == target->user.saved;
  };
  if (!isTargets(actor.effective) && !isTargets(actor.real)) inquiry.AskCapability("cap_kill");
}

// By its path, or the descriptor itself where that is empty.
std::optional<Place> PlaceAt(Inquiry& inquiry, LastLink lastLink) {
  const auto path = inquiry.From().ReadText(inquiry.Address(1));
  if (!path || path->empty()) return Opened(inquiry, 0);
  return inquiry.From().Resolve(inquiry.Number(0), *path, lastLink);
}

LastLink LinkOf(std::uint32_t flags) {
  return (flags & AT_SYMLINK_NOFOLLOW) != 0 ? LastLink::kKept : LastLink::kFollowed;
}

void AskLimit(Inquiry& inquiry, std::uint32_t resource, std::uint64_t address) {
  rlimit wanted = {};
  rlimit present = {};
  if (address == 0 || !inquiry.From().Read(address, &wanted, sizeof wanted)) return;
  const auto kind = static_cast<__rlimit_resource>(resource);
  if (prlimit(inquiry.From().Process(), kind, nullptr, &present) != 0) return;
  if (wanted.rlim_max > present.rlim_max) inquiry.AskCapability("cap_sys_resource");
}

// To read the clock's state takes nothing.
void AdjustTime(Inquiry& inquiry, int address) {
  timex wanted = {};
  if (!inquiry.From().Read(inquiry.Address(address), &wanted, sizeof wanted)) return;
  if (wanted.modes != 0) inquiry.AskCapability("cap_sys_time");
}

// In a user namespace of one's own all others are free.
void MakeNamespaces(Inquiry& inquiry, std::uint32_t flags) {
  constexpr std::uint32_t kNamespaces =
      CLONE_NEWNS | CLONE_NEWCGROUP | CLONE_NEWUTS | CLONE_NEWIPC | CLONE_NEWPID | CLONE_NEWNET;
  const bool isOwn = (flags & CLONE_NEWUSER) != 0;
  if (!isOwn && (flags & kNamespaces) != 0) inquiry.AskCapability("cap_sys_admin");
}

void SetProcess(Inquiry& inquiry) {
  const std::uint32_t option = inquiry.Word(0);
  if (option == PR_CAPBSET_DROP || option == PR_SET_SECUREBITS) {
    inquiry.AskCapability("cap_setpcap");
  } else if (option == PR_SET_MM) {
    inquiry.AskCapability("cap_sys_resource");
  }
}

void SetSocket(Inquiry& inquiry) {
  const std::uint32_t level = inquiry.Word(1);
  const std::uint32_t option = inquiry.Word(2);
  const bool isAdministered = level == SOL_SOCKET ? option == SO_MARK || option == SO_SNDBUFFORCE ||
                                                        option == SO_RCVBUFFORCE
                                                  : level == IPPROTO_IP && option == IP_TRANSPARENT;
  if (isAdministered) inquiry.AskCapability("cap_net_admin");
}

void AskForSocket(Inquiry& inquiry) {
  const std::uint32_t family = inquiry.Word(0);
  constexpr std::uint32_t kTypes = 0xff;
  const bool isInternet = family == AF_INET || family == AF_INET6;
  const bool isRaw = isInternet && (inquiry.Word(1) & kTypes) == SOCK_RAW;
  if (isRaw || family == AF_PACKET) inquiry.AskCapability("cap_net_raw");
  if (family == AF_NETLINK && inquiry.Word(2) == NETLINK_AUDIT) {
    inquiry.AskCapability("cap_audit_write");
  }
}

void SetScheduler(Inquiry& inquiry) {
  const int policy = inquiry.Number(1) & ~SCHED_RESET_ON_FORK;
  if (policy == SCHED_FIFO || policy == SCHED_RR) inquiry.AskCapability("cap_sys_nice");
}

void SetPriority(Inquiry& inquiry) {
  if (inquiry.Number(2) < 0) inquiry.AskCapability("cap_sys_nice");
}

void MakeNode(Inquiry& inquiry, mode_t mode) {
  if (S_ISCHR(mode) || S_ISBLK(mode)) inquiry.AskCapability("cap_mknod");
}

// The first `count` arguments are identities; -1 leaves one as it is.
void AskForIdentities(Inquiry& inquiry, int count, const Identity& own, const char* capability) {
  for (int argument = 0; argument < count; ++argument) {
    const std::uint32_t wanted = inquiry.Word(argument);
    if (wanted != kUnchanged && !own.Has(wanted)) return inquiry.AskCapability(capability);
  }
}

template <int count>
void AskForUsers(Inquiry& inquiry) {
  AskForIdentities(inquiry, count, inquiry.Actor().user, "cap_setuid");
}

template <int count>
void AskForGroups(Inquiry& inquiry) {
  AskForIdentities(inquiry, count, inquiry.Actor().group, "cap_setgid");
}

using PrivilegedCall = void (*)(Inquiry&);

// Calls that take one, or do for some of their arguments.
const std::map<std::string_view, PrivilegedCall>& PrivilegedCalls() {
  constexpr auto kHere = AT_FDCWD;
  constexpr auto kKept = LastLink::kKept;
  constexpr auto kFollowed = LastLink::kFollowed;
  using I = Inquiry;
  static const std::map<std::string_view, PrivilegedCall> calls = {
      {"acct", [](I& i) { i.AskCapability("cap_sys_pacct"); }},
      {"adjtimex", [](I& i) { AdjustTime(i, 0); }},
      {"chmod", [](I& i) { Chmod(i, i.PlaceOf(kHere, 0, kFollowed)); }},
      {"chown", [](I& i) { Chown(i, i.PlaceOf(kHere, 0, kFollowed), 1); }},
      {"chroot", [](I& i) { i.AskCapability("cap_sys_chroot"); }},
      {"clock_adjtime", [](I& i) { AdjustTime(i, 1); }},
      {"clock_settime", [](I& i) { i.AskCapability("cap_sys_time"); }},
      {"clone", [](I& i) { MakeNamespaces(i, i.Word(0)); }},
      {"delete_module", [](I& i) { i.AskCapability("cap_sys_module"); }},
      {"fchmod", [](I& i) { Chmod(i, Opened(i, 0)); }},
      {"fchmodat", [](I& i) { Chmod(i, i.PlaceOf(i.Number(0), 1, kFollowed)); }},
      {"fchmodat2", [](I& i) { Chmod(i, PlaceAt(i, LinkOf(i.Word(3)))); }},
      {"fchown", [](I& i) { Chown(i, Opened(i, 0), 1); }},
      {"fchownat", [](I& i) { Chown(i, PlaceAt(i, LinkOf(i.Word(4))), 2); }},
      {"finit_module", [](I& i) { i.AskCapability("cap_sys_module"); }},
      {"init_module", [](I& i) { i.AskCapability("cap_sys_module"); }},
      {"ioperm", [](I& i) { i.AskCapability("cap_sys_rawio"); }},
      {"iopl", [](I& i) { i.AskCapability("cap_sys_rawio"); }},
      {"kexec_file_load", [](I& i) { i.AskCapability("cap_sys_boot"); }},
      {"kexec_load", [](I& i) { i.AskCapability("cap_sys_boot"); }},
      {"kill", [](I& i) { AskSignal(i, i.Number(0)); }},
      {"lchown", [](I& i) { Chown(i, i.PlaceOf(kHere, 0, kKept), 1); }},
      {"mknod", [](I& i) { MakeNode(i, i.Word(1)); }},
      {"mknodat", [](I& i) { MakeNode(i, i.Word(2)); }},
      {"mlockall", [](I& i) { i.AskCapability("cap_ipc_lock"); }},
      {"mount", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"move_mount", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"open_by_handle_at", [](I& i) { i.AskCapability(kReadSearch); }},
      {"pivot_root", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"prctl", SetProcess},
      {"prlimit64", [](I& i) { AskLimit(i, i.Word(1), i.Address(2)); }},
      {"reboot", [](I& i) { i.AskCapability("cap_sys_boot"); }},
      {"rt_sigqueueinfo", [](I& i) { AskSignal(i, i.Number(0)); }},
      {"rt_tgsigqueueinfo", [](I& i) { AskSignal(i, i.Number(1)); }},
      {"sched_setscheduler", SetScheduler},
      {"setdomainname", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"setfsgid", AskForGroups<1>},
      {"setfsuid", AskForUsers<1>},
      {"setgid", AskForGroups<1>},
      {"setgroups", [](I& i) { i.AskCapability("cap_setgid"); }},
      {"sethostname", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"setns", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"setpriority", SetPriority},
      {"setregid", AskForGroups<2>},
      {"setresgid", AskForGroups<3>},
      {"setresuid", AskForUsers<3>},
      {"setreuid", AskForUsers<2>},
      {"setrlimit", [](I& i) { AskLimit(i, i.Word(0), i.Address(1)); }},
      {"setsockopt", SetSocket},
      {"settimeofday", [](I& i) { i.AskCapability("cap_sys_time"); }},
      {"setuid", AskForUsers<1>},
      {"socket", AskForSocket},
      {"swapoff", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"swapon", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"tgkill", [](I& i) { AskSignal(i, i.Number(1)); }},
      {"tkill", [](I& i) { AskSignal(i, i.Number(0)); }},
      {"umount2", [](I& i) { i.AskCapability("cap_sys_admin"); }},
      {"unshare", [](I& i) { MakeNamespaces(i, i.Word(0)); }},
      {"utime", [](I& i) { SetTimes(i, i.PlaceOf(kHere, 0, kFollowed), 1); }},
      {"utimensat", [](I& i) { SetTimes(i, PlaceAt(i, LinkOf(i.Word(3))), 2); }},
      {"utimes", [](I& i) { SetTimes(i, i.PlaceOf(kHere, 0, kFollowed), 1); }},
      {"vhangup", [](I& i) { i.AskCapability("cap_sys_tty_config"); }},
  };
  return calls;
}

}  // namespace

void AskUse(Inquiry& inquiry, const Place& place, int use) {
  if (!OverridesModes(inquiry)) return;
  AskSearch(inquiry, place);
  AskModes(inquiry, FactsOf(place), use);
}

void AskEntry(Inquiry& inquiry, const Place& place) {
  if (!OverridesModes(inquiry)) return;
  AskSearch(inquiry, place);
  const auto directory = FactsOf(DirectoryOf(place.path));
  if (!directory) return;
  AskModes(inquiry, *directory, W_OK);
  const bool isSticky = place.Exists() && (directory->mode & S_ISVTX) != 0;
  if (isSticky && !IsOwner(inquiry, *directory)) AskOwner(inquiry, place);
}

void AskOwner(Inquiry& inquiry, const Place& place) {
  if (!IsOwner(inquiry, FactsOf(place))) inquiry.AskCapability("cap_fowner");
}

bool TakesCapability(std::string_view call) { return PrivilegedCalls().contains(call); }

void AskCapabilities(Inquiry& inquiry, std::string_view call) {
  const auto reader = PrivilegedCalls().find(call);
  if (reader != PrivilegedCalls().end()) reader->second(inquiry);
}

}  // namespace Enforce
