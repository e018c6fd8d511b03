#pragma once

#include <sys/types.h>

#include <cstddef>
#include <optional>
#include <string>

// The attribute "zorvan.security" as stock Linux can hold it.
namespace LinuxHost {

// The name of the real attribute: "security.bpf.zorvan" where this process may write it, else
// "user.zorvan.security". Chosen at the first call for the life of the state in use and recorded
// there. Throws HostError when the state cannot be used.
std::string LabelAttribute();

// The name that a choice would fall on now, whatever the state has recorded; tried out on the root
// file system or, where that takes no new files, in `otherDirectory`.
std::string UsableLabelAttribute(const std::string& otherDirectory);

// True for a file of this kind (`st_mode`) if the real attribute `attribute` can be put on it:
// links never carry a label, and what is named "user." only fits regular files and directories.
bool CanCarryLabel(mode_t mode, const std::string& attribute);

// Gives the file at `path`, which is not a link, the label "unlabeled" in the real attribute
// `attribute`, whether or not it had one, and takes off what an older version of this host has
// labelled it with under another name. Returns 0, or -1 with errno set. Links on the way to the
// file are followed, the last one is not.
int GiveFirstLabel(const char* path, const std::string& attribute);

// What ChangeLabel() does before and after. The first one returns the real attribute, which is
// valid until the state is used again, or null; the second one whether all was well. Both set errno
// where the state cannot be used.
const char* BeginLabelChange();
bool EndLabelChange();

// Calls `change` with the real attribute; it gives a file a label, and returns as setxattr(2). No
// label index of before counts any more then. Returns what `change` did, or -1 with errno set when
// the state cannot be written.
template <class Change>
int ChangeLabel(const Change& change) {
  const char* const attribute = BeginLabelChange();
  if (attribute == nullptr) return -1;
  const int result = change(attribute);
  return result != 0 || EndLabelChange() ? result : -1;
}

// What the file at `path` itself carries in the real attribute `attribute`, whatever that is;
// nothing, with errno set, when it carries none (ENODATA) or it cannot be read. Links on the way to
// the file are followed, the last one is not.
std::optional<std::string> ReadCarried(const char* path, const std::string& attribute);

// As long as it lives, it stands in for setxattr(2) and getxattr(2) of the real attribute in the
// contract's two calls. One at a time.
class AttributeStandIn {
 public:
  AttributeStandIn();
  AttributeStandIn(const AttributeStandIn&) = delete;
  AttributeStandIn& operator=(const AttributeStandIn&) = delete;
  virtual ~AttributeStandIn();

  virtual int Set(const char* path, const char* name, const void* value, std::size_t size,
                  int flags) = 0;
  virtual ssize_t Get(const char* path, const char* name, void* value, std::size_t size) = 0;
};

}  // namespace LinuxHost
