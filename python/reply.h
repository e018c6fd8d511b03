#pragma once

#include <functional>
#include <string>

#include "host/linux/common/host_error.h"

namespace SecPolicyPython {

// What a call has come to.
struct Reply {
  std::string kind;           // "answer", or which exception it is
  std::string document;       // in JSON
  std::string messages = {};  // what the command would have written to standard error
};

// Sends what a call has come to, once.
using Send = std::function<void(const Reply& reply)>;

// The reply of a kind that tells an error number.
Reply ToReply(const std::string& kind, const LinuxHost::HostError& failure);

// Takes a step; what it throws is sent as the exception that it becomes in Python.
void SendFailureOf(const std::function<void()>& step, const Send& send);

}  // namespace SecPolicyPython
