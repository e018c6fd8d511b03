#pragma once

#include <sys/stat.h>

#include <string>

namespace LinuxHost {

// Makes sure that `path` is a regular file in a directory of its own, both of which only this user
// and the superuser may change; creates the file (mode 0600) and the last directory (0700) when
// they are missing. Follows no link and opens nothing but what it creates, so that nothing can keep
// it waiting. `purpose` says in messages what the file is. Returns what the file is. Throws
// HostError, changing nothing, when something else is there.
struct stat PreparePrivateFile(const std::string& path, const std::string& purpose);

// The same for a file that is only read: makes nothing, and throws also when there is no such file.
struct stat RequirePrivateFile(const std::string& path, const std::string& purpose);

// Puts a file with this text (mode 0600) in place of `path`, which others see whole: the old or the
// new. Nobody else may make files in its directory. Throws HostError, leaving the old one.
void ReplacePrivateFile(const std::string& path, const std::string& text);

// Throws HostError unless `path` is absolute and does not end in a slash.
void RequireFilePath(const std::string& path, const std::string& purpose);

}  // namespace LinuxHost
