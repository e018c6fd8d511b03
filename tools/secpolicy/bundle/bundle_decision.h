#pragma once

#include <string>
#include <vector>

#include "bundle/manifest.h"

// What is decided about bundles without looking at a host.
namespace SecPolicyCli {

// Which bundle it is: "web, serial 7".
std::string NameBundle(const Manifest& manifest);

// Why the bundle `offered` is not to take the place of `installed`; empty when it is the same one,
// or a newer one of the same policy.
std::string WhyNotNewer(const Manifest& installed, const Manifest& offered);

// The names of the files in which what is there differs from what a manifest names: changed, added
// or missing, in byte order. Both are in byte order.
std::vector<std::string> EditedFiles(const std::vector<BundledFile>& named,
                                     const std::vector<BundledFile>& found);

// The first ten of `names`, and how many more there are: "domains/appDom, objects/base and 2 more".
std::string FirstOf(const std::vector<std::string>& names);

}  // namespace SecPolicyCli
