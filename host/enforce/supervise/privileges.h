#pragma once

#include <string>
#include <string_view>

#include "host/enforce/supervise/inquiry.h"

// Which capabilities a call takes, asked of callers that have them: their rights to files by modes
// and owners, as the kernel looks at them first. Lists of access control are not looked at.
namespace Enforce {

// To read (R_OK), write or execute what is there, or list a directory, and to come there.
void AskUse(Inquiry& inquiry, const Place& place, int use);

// To make or remove an entry of the directory that the place is in.
void AskEntry(Inquiry& inquiry, const Place& place);

// To change what only the owner may.
void AskOwner(Inquiry& inquiry, const Place& place);

// True when calls of this name may take a capability whatever files they are about.
bool TakesCapability(std::string_view call);

// What the call with this name takes, whatever files it is about.
void AskCapabilities(Inquiry& inquiry, std::string_view call);

}  // namespace Enforce
