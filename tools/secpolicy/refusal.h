#pragma once

#include <stdexcept>

namespace SecPolicyCli {

// What was asked for cannot be done. The message is whole: it says what to do, and rights have
// nothing to do with it.
class Refusal : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// What was typed cannot be understood; the message says what would be.
class QuestionError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// What the user names is not there.
class NoSuchPolicy : public Refusal {
 public:
  using Refusal::Refusal;
};

// There is no installed state.
class NothingInstalled : public NoSuchPolicy {
 public:
  using NoSuchPolicy::NoSuchPolicy;
};

// The files of a policy directory have errors.
class BadPolicy : public Refusal {
 public:
  using Refusal::Refusal;
};

}  // namespace SecPolicyCli
