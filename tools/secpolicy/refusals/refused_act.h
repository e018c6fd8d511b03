#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "json.h"

namespace SecPolicyCli {

// Who was refused something.
struct RefusedProcess {
  std::int64_t id = 0;
  std::int64_t parent = 0;
  std::int64_t user = 0;
  std::string program;        // its name, as the kernel keeps it
  std::string path = {};      // of its file; empty where that is not known any more
  std::string parentProgram;  // the same of its parent
};

// What the module has refused, or would have refused in a domain that is not permissive.
struct RefusedAct {
  std::int64_t time = 0;    // in seconds since 1970, when it came first
  std::int64_t count = 1;   // how often it was refused within a second
  std::string domain = {};  // its name, or its number where it has gone
  bool isRefused = true;
  bool isOfNoRule = false;                 // no rule grants such an act
  std::vector<std::string> question = {};  // as `why` is asked; empty where it cannot be
  std::string act = {};                    // what it was then
  std::string path = {};                   // of the file that it was about, if any
  std::string label = {};                  // that the file had, or its directory
  RefusedProcess process = {};
};

// "write /etc/ssh/host_key"
std::string ActOf(const RefusedAct& refused);

// "sshDom was refused: write /etc/ssh/host_key, by /usr/sbin/sshd, process 812 of user 0, 3 times"
std::string TextOf(const RefusedAct& refused);

// For programs; see docs/json.md. What is none is read as nothing.
Json ToJson(const RefusedAct& refused);
std::optional<RefusedAct> ReadRefusedAct(const Json& json);

// Of these lines, each a refusal as JSON, the latest of the domain, or of all where that is empty.
std::optional<RefusedAct> FindLatest(const std::string& lines, const std::string& domain);

}  // namespace SecPolicyCli
