#pragma once

#include <string>
#include <vector>

// Which process is in which domain, as told by users who may not write the state, of their own
// processes: a file for each process in a directory of the user's, below the directory `worlds`
// beside the state, in which everybody may make some. They are for people to see, and for their
// users; nothing that the superuser decides depends on them.
namespace LinuxHost {

struct WorldRecord {
  int id = 0;
  unsigned int user = 0;  // whose process it is, and who has told of it
  std::string domain;
  std::string level;  // that confines it
};

// Makes the directory that those of the users lie in, for who may write the state. Throws
// HostError.
void MakeWorldRecords();

// Records that this process enters the domain with the name `domain`, confined by the level
// `level`. Throws HostError when it cannot be recorded.
void RecordWorld(const std::string& domain, const std::string& level);

// A new directory of this process beside the records of its user: what only those of this user may
// write that are confined by no rule about other files. Whose process has ended without removing it
// finds it removed with old records, by then with nothing but files in it. Throws HostError when it
// cannot be made.
std::string MakeOwnDirectory();

// The records of living processes that their own users have made, as far as this user may read
// them, in ascending order of their identifiers.
std::vector<WorldRecord> ReadWorldRecords();

}  // namespace LinuxHost
