#pragma once

#include <cstdint>
#include <string>

namespace LinuxHost {

// Returns what is wrong with the database at `path` as far as the engine can tell; empty when it is
// whole.
std::string FindDamage(const std::string& path);

// The same, but does not look whether indexes fit their tables, which takes most of the time.
std::string FindDamagedPages(const std::string& path);

// Writes a digest of all that the database at `path` holds into it, which is its seal: the engine
// does not notice a value that has become another one. Throws HostError when it cannot be done.
void Seal(const std::string& path);

// Returns why the sealed database at `path` is not what was sealed; empty when it is.
std::string FindBrokenSeal(const std::string& path);

// Takes the seal off, so that the database is again what it was before. Throws HostError.
void RemoveSeal(const std::string& path);

// The version that the database at `path` says its schema has. Throws HostError.
std::int32_t StoredVersion(const std::string& path);

}  // namespace LinuxHost
