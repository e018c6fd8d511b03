#pragma once

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <string>

#include "host/enforce/supervise/file_descriptor.h"
#include "vm/module_fixture.h"

// Unix sockets, and who binds and reaches them.
namespace EnforceTest {

inline constexpr int kUnixTypes[] = {SOCK_STREAM, SOCK_DGRAM, SOCK_SEQPACKET};

// With a zero in front it is a name that is no path.
struct UnixName {
  sockaddr_un address = {};
  socklen_t size = 0;

  explicit UnixName(const std::string& name) {
    address.sun_family = AF_UNIX;
    memcpy(address.sun_path, name.data(), name.size());
    size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + name.size());
  }
  const sockaddr* Get() const { return reinterpret_cast<const sockaddr*>(&address); }
};

inline Enforce::FileDescriptor OpenUnix(int type) {
  return Enforce::FileDescriptor(socket(AF_UNIX, type | SOCK_CLOEXEC, 0));
}

inline int BindUnix(const Enforce::FileDescriptor& made, const std::string& name) {
  const UnixName asked(name);
  return ErrorOf(bind(made.Number(), asked.Get(), asked.size));
}

// A socket that others can reach.
inline Enforce::FileDescriptor ServeUnix(int type, const std::string& name) {
  Enforce::FileDescriptor made = OpenUnix(type);
  EXPECT_EQ(BindUnix(made, name), 0) << name;
  if (type != SOCK_DGRAM) {
    EXPECT_EQ(listen(made.Number(), 50), 0);
  }
  return made;
}

inline int ConnectUnix(int type, const std::string& name) {
  const Enforce::FileDescriptor made = OpenUnix(type);
  const UnixName asked(name);
  return ErrorOf(connect(made.Number(), asked.Get(), asked.size));
}

inline int SendUnix(const std::string& name) {
  const Enforce::FileDescriptor made = OpenUnix(SOCK_DGRAM);
  const UnixName asked(name);
  return ErrorOf(sendto(made.Number(), "x", 1, MSG_DONTWAIT, asked.Get(), asked.size));
}

}  // namespace EnforceTest
