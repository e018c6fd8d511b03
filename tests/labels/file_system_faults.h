#pragma once

#include <string>

// What a real file system does not do on request. The test program defines the C library's
// functions concerned, which pass everything else on.
namespace SecPolicyTest {

// Directory listings do not tell the type of the entries called `name` while the object lives.
class UntypedEntry {
 public:
  explicit UntypedEntry(const std::string& name);
  UntypedEntry(const UntypedEntry&) = delete;
  UntypedEntry& operator=(const UntypedEntry&) = delete;
  ~UntypedEntry();
};

// Directory listings yield the entries called `name` twice while the object lives, as they may when
// their directory changes meanwhile.
class RepeatedEntry {
 public:
  explicit RepeatedEntry(const std::string& name);
  RepeatedEntry(const RepeatedEntry&) = delete;
  RepeatedEntry& operator=(const RepeatedEntry&) = delete;
  ~RepeatedEntry();
};

// Attributes of open files cannot be read while the object lives.
class UnreadableAttributes {
 public:
  UnreadableAttributes();
  UnreadableAttributes(const UnreadableAttributes&) = delete;
  UnreadableAttributes& operator=(const UnreadableAttributes&) = delete;
  ~UnreadableAttributes();
};

// `dir` written so long that it can be listed, but its files, whose names have more than nine
// letters, cannot be opened; not even by the super-user.
std::string OverlongPath(const std::string& dir);

// How many files and directories the process has open.
unsigned int OpenDescriptors();

}  // namespace SecPolicyTest
