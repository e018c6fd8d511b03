#pragma once

#include <string>

#include "braxo/lib/exception.h"

namespace LinuxHost {

// A failure of this host: the finished message, and the error number that a numbered kernel call
// answers for it.
class HostError : public Braxo::Lib::BraxoException {
 public:
  // `code` is a positive error number such as ENOENT.
  HostError(int code, const std::string& text) : BraxoException(text), errorNumber(code) {}

  // The positive error number.
  int Code() const { return errorNumber; }

 private:
  int errorNumber;
};

// A database file whose content is not what it should be: damaged, of another version, or of
// another program.
class UnusableContent : public HostError {
 public:
  using HostError::HostError;
};

}  // namespace LinuxHost
