#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "label_run.h"

// What the verb 'label' does. Errors of single files are reported and the others done; every
// function returns what to say at the end of a use without errors, and throws BraxoException for
// one that did not come to the good end.
namespace SecPolicyCli {

// Prints the label of every file of `paths`, and with `wholeTrees` of all files below them.
std::string ShowLabels(LabelRun& run, const std::vector<std::string>& paths, bool wholeTrees);

// Gives every file of `paths` the label `label`, and with `wholeTrees` all files below them.
std::string GiveLabel(LabelRun& run, const std::string& label,
                      const std::vector<std::string>& paths, bool wholeTrees);

// How many files a file label policy names, and how many of them differ from it.
struct LabelTally {
  std::size_t files = 0;
  std::size_t different = 0;     // those without a label included
  std::size_t withoutLabel = 0;  // neither their own nor an inherited one
};

// Prints every file whose label is not that of the file label policy in `dir`. `paths` limits it to
// what is at or below one of them, unless it is empty.
LabelTally CompareLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths);

// The same as a use of the verb, which fails where any file differs.
std::string VerifyLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths);

// Gives these files their label; `dryRun` only prints what would change.
std::string Relabel(LabelRun& run, const std::string& dir, const std::vector<std::string>& paths,
                    bool dryRun);

}  // namespace SecPolicyCli
