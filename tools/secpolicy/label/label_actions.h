#pragma once

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

// Prints every file whose label is not that of the file label policy in `dir`. `paths` limits it to
// what is at or below one of them, unless it is empty.
std::string VerifyLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths);

// Gives these files their label; `dryRun` only prints what would change.
std::string Relabel(LabelRun& run, const std::string& dir, const std::vector<std::string>& paths,
                    bool dryRun);

}  // namespace SecPolicyCli
