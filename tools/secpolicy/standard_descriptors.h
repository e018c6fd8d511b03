#pragma once

namespace SecPolicyCli {

// Puts something that can be neither read nor written in place of the standard descriptors that the
// caller has closed: a file that is opened next would be taken for one of them.
void TakeClosedDescriptors();

}  // namespace SecPolicyCli
