#pragma once

#include <string>
#include <vector>

#include "host/enforce/label_index.h"

namespace LinuxHost {

// The places of the tree at `root`, in ascending order, as names within it, by the labels that
// files carry in the attribute `attribute`. Where another mount begins, and what cannot be looked
// at, is a place that is not indexed. Links are no places. Changes the working directory while it
// runs. Throws HostError (EAGAIN) when a directory was moved while the walk was in it.
std::vector<Enforce::LabelledPlace> FindLabelledPlaces(const std::string& root,
                                                       const std::string& attribute);

}  // namespace LinuxHost
