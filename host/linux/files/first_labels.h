#pragma once

#include <cstddef>
#include <string>

namespace LinuxHost {

// Gives every file of the working directory's file system, the working directory and all beneath
// it, the label "unlabeled" in the attribute `attribute`, whatever it had. Directories named dev,
// proc, run and sys right under it are the running system's and are left alone, as are other file
// systems mounted beneath it. Changes the working directory while it runs. Throws HostError when
// files could not be labelled, after all others were.
void GiveFirstLabels(const std::string& attribute);

// How many files that would be.
std::size_t CountFirstLabels(const std::string& attribute);

}  // namespace LinuxHost
