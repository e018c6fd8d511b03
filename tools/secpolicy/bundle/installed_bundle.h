#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "bundle/manifest.h"

// A policy directory that was taken from a bundle has the manifest and the signature of that beside
// its files: the two come and go together, whatever happens in between.
namespace SecPolicyCli {

struct InstalledBundle {
  Manifest manifest;
  std::string digest;     // the SHA-256 of the manifest
  std::int64_t time = 0;  // when its files were put in place, in seconds since 1970
};

// The bundle that the files of the policy directory `dir` were taken from; nothing where they come
// from none. Throws Refusal for a manifest that is none, and BraxoException when it cannot be read.
std::optional<InstalledBundle> ReadInstalledBundle(const std::string& dir);

// The names of the files of `dir` that differ from those of the bundle. Throws BraxoException.
std::vector<std::string> FindEdits(const std::string& dir, const Manifest& manifest);

// Whether it is policy of a tardisk. Only the tardisk itself can bring that, so no bundle replaces
// it.
bool IsTardiskPolicy(const std::string& name);

// The first policy of a tardisk in the bundle that `dir` has not, or has otherwise; empty when
// there is none. Throws as FindEdits() does.
std::string FindForeignTardiskPolicy(const std::string& dir, const Manifest& manifest);

}  // namespace SecPolicyCli
