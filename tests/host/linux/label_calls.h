#pragma once

#include <sys/types.h>
#include <sys/xattr.h>

#include <cstdint>
#include <initializer_list>
#include <string>

// Calls that give and read labels, each answered in a word, so that a row of them is compared at
// once.
namespace LinuxHostTest {

inline constexpr char kLabelName[] = "zorvan.security";

// What a call answered: its result, or the name of the error.
std::string Told(ssize_t result);

// The words with a blank between; each is asked for before the next one.
std::string Words(std::initializer_list<std::string> words);

// Gives the label `id` to the file at `path`; with flags of 0 also a first one.
std::string Give(const std::string& path, std::uint32_t id, int flags = XATTR_REPLACE);

// The label that the library sees.
std::string Label(const std::string& path);

// What the file itself carries, links not followed.
std::string Carried(const std::string& path);

}  // namespace LinuxHostTest
