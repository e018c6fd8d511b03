#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

// Keeps the errors that are written to standard error, the library's and the command's own: some
// entry points return normally after an error.
class ErrorList : public SecPolicy::PolicyObserver {
 public:
  void OnError(const std::string& message) override { messages.push_back(message); }

  std::size_t Count() const { return messages.size(); }

  // In the order in which they were written.
  const std::vector<std::string>& Messages() const { return messages; }

 private:
  std::vector<std::string> messages;
};

}  // namespace SecPolicyCli
