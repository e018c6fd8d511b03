#include "labels/file_system_faults.h"

#include <dirent.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <climits>
#include <cstring>

namespace SecPolicyTest {
namespace {

// What is scripted, for the definitions below.
std::string untypedName;
std::string repeatedName;
DIR* repeatNext = nullptr;
bool attributesUnreadable = false;

template <class Function>
Function* Original(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

UntypedEntry::UntypedEntry(const std::string& name) { untypedName = name; }
UntypedEntry::~UntypedEntry() { untypedName.clear(); }

RepeatedEntry::RepeatedEntry(const std::string& name) { repeatedName = name; }
RepeatedEntry::~RepeatedEntry() { repeatedName.clear(); }

UnreadableAttributes::UnreadableAttributes() { attributesUnreadable = true; }
UnreadableAttributes::~UnreadableAttributes() { attributesUnreadable = false; }

std::string OverlongPath(const std::string& dir) {
  constexpr std::size_t kRoomForName = 10;  // with the slash before it
  std::string path = dir;
  while (path.size() + 2 + kRoomForName < PATH_MAX) path += "/.";
  return path;
}

unsigned int OpenDescriptors() {
  constexpr int kMost = 1024;
  unsigned int open = 0;
  for (int descriptor = 0; descriptor < kMost; ++descriptor) {
    if (fcntl(descriptor, F_GETFD) != -1) ++open;
  }
  return open;
}

// An extern "C" function is the same one in any namespace.
extern "C" __attribute__((visibility("default"))) dirent* readdir(DIR* directory) {
  static auto* const original = Original<dirent*(DIR*)>("readdir");
  static dirent repeated;
  if (repeatNext == directory) {
    repeatNext = nullptr;
    return &repeated;
  }
  dirent* entry = original(directory);
  if (entry == nullptr) return nullptr;
  if (untypedName == entry->d_name) entry->d_type = DT_UNKNOWN;
  if (repeatedName == entry->d_name) {
    repeated = *entry;
    repeatNext = directory;
  }
  return entry;
}

extern "C" __attribute__((visibility("default"))) int fstat(int descriptor,
                                                            struct stat* attributes) noexcept {
  static auto* const original = Original<int(int, struct stat*)>("fstat");
  if (!attributesUnreadable) return original(descriptor, attributes);
  errno = EIO;
  return -1;
}

}  // namespace SecPolicyTest
