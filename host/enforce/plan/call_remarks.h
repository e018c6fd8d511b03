#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

#include "host/enforce/coverage.h"

namespace Enforce {

// Why rules about calls are less than they say, each reason once with the calls that it is about.
// Rules are told apart by where they are, and have to outlive this.
class CallRemarks {
 public:
  // The domain can do less than the rule says.
  void Add(const Policy::Rule& rule, const std::string& reason, const std::string& call = {});

  // The domain can do more than the rule says.
  void Surrender(const Policy::Rule& rule, const std::string& reason);

  // All that was added, as one: "CALL, CALL: REASON; REASON".
  RuleFate FateOf(const Policy::Rule& rule) const;

 private:
  struct Remark {
    std::string reason;
    std::set<std::string> calls;
  };

  static std::string TextOf(const Remark& remark);

  std::map<const Policy::Rule*, std::vector<Remark>> remarks;
  std::set<const Policy::Rule*> surrendered;
};

}  // namespace Enforce
