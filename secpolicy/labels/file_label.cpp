#include <sys/xattr.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <stack>
#include <utility>

#include "braxo/misc/strcat.h"
#include "secpolicy/observed/policy_lines.h"
#include "secpolicy/parse/directory.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"
#include "zorvan/kernel.h"

namespace SecPolicy {
namespace {

using Braxo::Misc::StrCat;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr char kAttribute[] = "zorvan.security";
constexpr std::uint32_t kNoSuchLabel = 1;

// A directory of a tree of which some entries are labelled.
struct LabelledDirectory {
  std::string path;
  Directory entries;
};

LabelledDirectory LabelAndOpen(const std::string& dir, const std::string& label,
                               TeskAccessInterfaceImpl& access, int& error) {
  SetFileLabel(dir, label, access, error);
  Directory entries(dir);
  if (!entries.IsOpen()) RaiseError("Unable to open directory " + dir);
  return {dir, std::move(entries)};
}

}  // namespace

bool IsLabelled(unsigned char entryType) {
  switch (entryType) {
    case DT_FIFO:
    case DT_CHR:
    case DT_DIR:
    case DT_BLK:
    case DT_REG:
      return true;
    default:
      return false;
  }
}

void SetFileLabel(const std::string& path, const std::string& label,
                  TeskAccessInterfaceImpl& access) {
  int unheard = 0;
  SetFileLabel(path, label, access, unheard);
}

void SetFileLabel(const std::string& path, const std::string& label,
                  TeskAccessInterfaceImpl& access, int& error) {
  const std::uint32_t id = access.LookupLabel(label, TESKACCESS_LABEL_OBJECT);
  if (id == kNoSuchLabel) RaiseError(StrCat("Invalid label (", label, ") for file ", path));

  errno = 0;
  // Replace-only: a file that never carried the attribute is not ours to label.
  if (Zorvan::Kernel::SetXattr(path.c_str(), kAttribute, &id, sizeof id, XATTR_REPLACE) != 0) {
    error = errno;
    RaiseError(StrCat("Unable to set file label (", label, ") for file ", path, ": ",
                      std::strerror(error)));
  }
}

void SetDirLabelRecursive(const std::string& dir, const std::string& label,
                          TeskAccessInterfaceImpl& access) {
  int unheard = 0;
  SetDirLabelRecursive(dir, label, access, unheard);
}

void SetDirLabelRecursive(const std::string& dir, const std::string& label,
                          TeskAccessInterfaceImpl& access, int& error) {
  // Not by calling itself: how deep a tree is is not ours to say, and a full stack ends a process.
  std::stack<LabelledDirectory> open;
  open.push(LabelAndOpen(dir, label, access, error));
  while (!open.empty()) {
    LabelledDirectory& current = open.top();
    const dirent* const entry = current.entries.Next();
    if (entry == nullptr) {
      open.pop();
      continue;
    }
    if (!IsLabelled(entry->d_type)) continue;
    const std::string child = current.path + "/" + entry->d_name;
    SetFileLabel(child, label, access, error);
    if (entry->d_type == DT_DIR) open.push(LabelAndOpen(child, label, access, error));
  }
}

std::string GetFileLabel(const std::string& path, TeskAccessInterfaceImpl& access) {
  std::uint32_t id = 0;
  errno = 0;
  if (Zorvan::Kernel::GetXattr(path.c_str(), kAttribute, &id, sizeof id) < 0) {
    const int error = errno;
    RaiseError(StrCat("Unable to get file label for file ", path, ":", std::strerror(error)));
  }
  return access.GetLabel(id, TESKACCESS_LABEL_OBJECT);
}

}  // namespace SecPolicy
