#pragma once

#include "host/enforce/label_index.h"

// The label index of the root, in the file labels.index beside the state. The state knows which one
// is of the labels as they are: every change of a label by this host ends that.
namespace LinuxHost {

// Makes the index anew, by a walk over the root file system, where labels were changed since it was
// made, or it is gone; otherwise, and where nothing was ever labelled, does nothing. Labels that
// another process changes meanwhile are in it, or make it old. Returns whether it was made. Changes
// the working directory while it runs. Throws Braxo::Lib::BraxoException when it cannot be made:
// there is none then, or an old one.
bool RefreshLabelIndex();

// True where labels were given to files, of which there can be an index.
bool IsLabelIndexPossible();

// The index. Throws Braxo::Lib::BraxoException, with what to do, when there is none, when it is not
// of the labels as they are, and when others may have written it.
Enforce::LabelIndex ReadLabelIndex();

}  // namespace LinuxHost
