#pragma once

#include <array>

#include "host/linux/state/store.h"

// What a state consists of.
namespace LinuxHost {

// Of the state, and so of the saved ones.
extern const StoreLayout kStateLayout;

// A table of the state, beside the one row of `state` and the number of the latest label.
struct StateTable {
  const char* name;
  bool isOfDomains = false;  // its rows go with the domain that their `domain_id` names
  bool isPutBack = false;    // by a rollback, as it was saved
};

inline constexpr std::array<StateTable, 20> kStateTables = {{
    {.name = "domain", .isPutBack = true},
    {.name = "role", .isPutBack = true},
    {.name = "guest_service", .isOfDomains = true, .isPutBack = true},
    {.name = "label"},
    {.name = "rule", .isOfDomains = true, .isPutBack = true},
    {.name = "parameter_rule", .isOfDomains = true, .isPutBack = true},
    {.name = "file_policy", .isOfDomains = true},
    {.name = "policy_load", .isPutBack = true},
    {.name = "policy_domain", .isPutBack = true},
    {.name = "covered_rule", .isOfDomains = true, .isPutBack = true},
    {.name = "covered_parameter_rule", .isOfDomains = true, .isPutBack = true},
    {.name = "covered_file_policy", .isOfDomains = true, .isPutBack = true},
    {.name = "world", .isOfDomains = true},
    {.name = "inode_origin"},
    {.name = "unpacked_file"},
    {.name = "rule_origin", .isPutBack = true},
    {.name = "label_origin"},
    {.name = "load_record"},
    {.name = "load_error"},
    {.name = "loaded_bundle"},
}};

}  // namespace LinuxHost
