#pragma once

#include <linux/filter.h>
#include <linux/seccomp.h>

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace EnforceTest {

using Arguments = std::array<std::uint64_t, 6>;

// What the kernel would be told of a call.
seccomp_data CallOf(int number, const Arguments& arguments = {});
seccomp_data CallOf(int number, const Arguments& arguments, std::uint32_t architecture);

// Why the kernel would not take the program; empty when it would.
std::string RefusalOf(const std::vector<sock_filter>& program);

// What the program returns for a call. Throws std::logic_error where it does what a filter may not.
std::uint32_t Run(const std::vector<sock_filter>& program, const seccomp_data& call);

// "allowed", "EACCES", "EPERM", "ENOSYS", "killed".
std::string AnswerOf(const std::vector<sock_filter>& program, const seccomp_data& call);

}  // namespace EnforceTest
