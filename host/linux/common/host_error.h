#pragma once

#include <cerrno>
#include <cstring>
#include <string>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"

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

// Throws a HostError for the call that has just failed: the parts of `what`, joined, and the
// system's text for errno; without parts that text alone. A part is something that has a name, for
// to make one in the call might change errno before it is read.
template <class... Parts>
[[noreturn]] void ThrowErrno(Parts&... what) {
  const int code = errno;
  if constexpr (sizeof...(what) == 0) throw HostError(code, std::strerror(code));
  throw HostError(code, Braxo::Misc::StrCat(what..., ": ", std::strerror(code)));
}

}  // namespace LinuxHost
