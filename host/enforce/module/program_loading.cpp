#include "host/enforce/module/program_loading.h"

#include <bpf/bpf.h>
#include <bpf/btf.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "braxo/misc/strcat.h"
#include "host/enforce/module/module_maps.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

constexpr const char* kFunctionOfHook = "bpf_lsm_";

// What follows the kind of the section.
std::string NameOf(const bpf_program* program) {
  const std::string section = bpf_program__section_name(program);
  return section.substr(section.find('/') + 1);
}

int AttachToHook(const bpf_program* program, long, bpf_link** link) {
  *link = bpf_program__attach_lsm(program);
  return *link != nullptr ? 0 : -errno;
}

std::unordered_map<std::string, unsigned int> HooksIn(const btf& types) {
  const std::size_t length = std::strlen(kFunctionOfHook);
  std::unordered_map<std::string, unsigned int> hooks;
  const unsigned int count = btf__type_cnt(&types);
  for (unsigned int number = 1; number < count; ++number) {
    const btf_type* const type = btf__type_by_id(&types, number);
    if (!btf_is_func(type)) continue;
    const char* const name = btf__name_by_offset(&types, type->name_off);
    if (std::strncmp(name, kFunctionOfHook, length) == 0) hooks.emplace(name + length, number);
  }
  return hooks;
}

}  // namespace

ProgramLoading::ProgramLoading() {
  const std::unique_ptr<btf, decltype(&btf__free)> types(btf__load_vmlinux_btf(), btf__free);
  Require(types != nullptr, "cannot read the types of the kernel");
  hooks = HooksIn(*types);
  // Once: older ones of libbpf free what they still use when the last handler is taken away.
  static const bool areHandled = HandleSections();
  Require(areHandled, "cannot load the programs");
  current = this;
}

ProgramLoading::~ProgramLoading() { current = nullptr; }

bool ProgramLoading::HandleSections() {
  libbpf_prog_handler_opts options = {};
  options.sz = sizeof(options);
  options.prog_prepare_load_fn = &ProgramLoading::PrepareHook;
  options.prog_attach_fn = AttachToHook;
  const int hook = libbpf_register_prog_handler("lsm/", BPF_PROG_TYPE_LSM, BPF_LSM_MAC, &options);
  options.prog_prepare_load_fn = &ProgramLoading::PrepareShared;
  options.prog_attach_fn = nullptr;
  const int function = libbpf_register_prog_handler("common/", BPF_PROG_TYPE_EXT,
                                                    static_cast<bpf_attach_type>(0), &options);
  return hook >= 0 && function >= 0;
}

void ProgramLoading::Load(bpf_object_skeleton& skeleton) {
  bpf_object* const programs = *skeleton.obj;
  loaded = programs;
  bpf_program* program = nullptr;
  while ((program = bpf_object__next_program(programs, program)) != nullptr) {
    const bool isWanted = bpf_program__autoload(program) || hooks.contains(NameOf(program));
    bpf_program__set_autoload(program, isWanted);
  }
  Require(bpf_object__load_skeleton(&skeleton) == 0, "cannot load the programs");
}

int ProgramLoading::PrepareHook(bpf_program* program, bpf_prog_load_opts* options, long) {
  const auto hook = current->hooks.find(NameOf(program));
  if (hook == current->hooks.end()) return -ESRCH;
  options->attach_btf_id = hook->second;
  const auto* const functions = static_cast<const bpf_func_info*>(options->func_info);
  for (unsigned int index = 0; index < options->func_info_cnt; ++index)
    current->callers[functions[index].type_id].push_back(program);
  return 0;
}

int ProgramLoading::PrepareShared(bpf_program* program, bpf_prog_load_opts* options, long) {
  const unsigned int function = current->NumberOfFunction(*program);
  const auto found = current->callers.find(function);
  if (found == current->callers.end()) return -ESRCH;
  current->shared.push_back(program);
  options->attach_btf_id = function;
  options->attach_prog_fd = static_cast<unsigned int>(bpf_program__fd(found->second.front()));
  return 0;
}

unsigned int ProgramLoading::NumberOfFunction(const bpf_program& program) const {
  const int number =
      btf__find_by_name_kind(bpf_object__btf(loaded), NameOf(&program).c_str(), BTF_KIND_FUNC);
  return number > 0 ? static_cast<unsigned int>(number) : 0;
}

std::unordered_map<std::string, FileDescriptor> ProgramLoading::Share() const {
  std::unordered_map<std::string, FileDescriptor> links;
  for (const bpf_program* const program : shared) {
    bpf_link_create_opts options = {};
    options.sz = sizeof(options);
    options.target_btf_id = NumberOfFunction(*program);
    for (const bpf_program* const caller : callers.at(options.target_btf_id)) {
      const std::string name = StrCat(bpf_program__name(caller), "_", NameOf(program));
      FileDescriptor link(bpf_link_create(bpf_program__fd(program), bpf_program__fd(caller),
                                          static_cast<bpf_attach_type>(0), &options));
      Require(link.IsOpen(), "cannot attach the programs");
      links.emplace(name, std::move(link));
    }
  }
  return links;
}

}  // namespace Enforce
