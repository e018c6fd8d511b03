#pragma once

#include "support/scripted_host.h"

namespace SecPolicyFuzz {

// A host that knows a few short words of each kind and refuses all others, so that a fuzzer finds
// both the words and what happens without them.
class PolicyHost : public SecPolicyTest::ScriptedHost {
 public:
  PolicyHost();
};

}  // namespace SecPolicyFuzz
