#include "policy/newer_call.h"

#include <array>

namespace Policy {
namespace {

constexpr std::array<NewerCall, 20> kNewerCalls = {{
    {451, "cachestat"},         {452, "fchmodat2"},        {453, "map_shadow_stack"},
    {454, "futex_wake"},        {455, "futex_wait"},       {456, "futex_requeue"},
    {457, "statmount"},         {458, "listmount"},        {459, "lsm_get_self_attr"},
    {460, "lsm_set_self_attr"}, {461, "lsm_list_modules"}, {462, "mseal"},
    {463, "setxattrat"},        {464, "getxattrat"},       {465, "listxattrat"},
    {466, "removexattrat"},     {467, "open_tree_attr"},   {468, "file_getattr"},
    {469, "file_setattr"},      {470, "listns"},
}};

}  // namespace

std::span<const NewerCall> NewerCalls() { return kNewerCalls; }

}  // namespace Policy
