#pragma once

#include <optional>
#include <vector>

#include "policy/level.h"

namespace LinuxHost {

class HostState;

// Places this process in the domain `id`, which it leaves by its end or by being placed elsewhere,
// confined by the level `level`. Throws HostError when there is no such domain, or the state cannot
// be written.
void EnterWorld(unsigned int id, Policy::Level level);

// The same where the module keeps the domain, as soon as it has this process there, and its level.
void EnterKeptWorld(unsigned int id);

// A living process that was placed in a domain, or of which its user has recorded that it was.
struct PlacedWorld {
  int id = 0;
  unsigned int domainId = 0;           // no domain's where the recorded one is gone
  std::optional<Policy::Level> level;  // that confines it; nothing where a service has placed it
};

// All of them, in ascending order of their identifiers. Of a process that was placed no record
// counts. One that the module has in a domain is there, at the level of the domain.
std::vector<PlacedWorld> ListWorlds(HostState& state);

// The processes that the module has in the domain `id`, in ascending order.
std::vector<int> ListKeptWorlds(HostState& state, unsigned int id);

// The process itself or the nearest one above it that is among them: a child is in the domain of
// its parent. Nothing where none is, and where processes cannot be looked at.
std::optional<PlacedWorld> FindWorldAbove(HostState& state, int process);

// The domain that this process was placed in, or the nearest process above it, or the start domain.
// Records count that this user has made, unless it is the superuser. Throws HostError for a
// confined process of which that cannot be told.
unsigned int DomainOfCaller();

}  // namespace LinuxHost
