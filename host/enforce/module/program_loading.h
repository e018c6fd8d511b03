#pragma once

#include <bpf/libbpf.h>

#include <string>
#include <unordered_map>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {

// How libbpf loads programs for hooks (sections "lsm/HOOK") and the functions that many of these
// share
// ("common/FUNCTION"), for as long as one of these is there. The kernel's types are read once for
// all programs, where libbpf would look through them for each. Not to be made by two threads at
// once.
class ProgramLoading {
 public:
  // Throws BraxoException where the kernel does not tell its types.
  ProgramLoading();
  ~ProgramLoading();
  ProgramLoading(const ProgramLoading&) = delete;
  ProgramLoading& operator=(const ProgramLoading&) = delete;

  // Has these loaded, but those marked for hooks that some kernels lack
  // ("?lsm/HOOK") only where this one has them. Throws BraxoException where the kernel takes them
  // not.
  void Load(bpf_object_skeleton& programs);

  // What holds the functions in the places of those that refuse, in each program that calls them:
  // each by a name. Throws BraxoException where the kernel takes one not.
  [[nodiscard]] std::unordered_map<std::string, FileDescriptor> Share() const;

 private:
  static bool HandleSections();
  static int PrepareHook(bpf_program* program, bpf_prog_load_opts* options, long);
  static int PrepareShared(bpf_program* program, bpf_prog_load_opts* options, long);

  [[nodiscard]] unsigned int NumberOfFunction(const bpf_program& shared) const;

  std::unordered_map<std::string, unsigned int> hooks;  // by their numbers among the kernel's types
  const bpf_object* loaded = nullptr;
  std::vector<const bpf_program*> shared;
  // By the numbers of their functions among the programs' own types.
  std::unordered_map<unsigned int, std::vector<const bpf_program*>> callers;

  static inline ProgramLoading* current = nullptr;
};

}  // namespace Enforce
