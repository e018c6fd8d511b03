// Memory of the caller: what lies at a page's end is read and written, and a bad address is told,
// not fallen over.

#include "host/linux/kernel/user_memory.h"

#include <gtest/gtest.h>
#include <sys/mman.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "child_process.h"
#include "host/linux/common/host_error.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::ReadAndWriteUser;
using LinuxHost::ReadUser;
using LinuxHost::ReadUserText;
using LinuxHost::WriteUser;

constexpr std::size_t kPage = 4096;

template <class Call>
int CodeOf(Call call) {
  try {
    call();
  } catch (const LinuxHost::HostError& error) {
    return error.Code();
  }
  return 0;
}

// A page that may be used, and behind it one that may not.
class UserMemory : public ::testing::Test {
 protected:
  UserMemory()
      : page(static_cast<char*>(
            mmap(nullptr, 2 * kPage, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0))) {
    mprotect(page, kPage, PROT_READ | PROT_WRITE);
  }
  ~UserMemory() override { munmap(page, 2 * kPage); }

  static std::uint64_t Address(const void* pointer) {
    return reinterpret_cast<std::uintptr_t>(pointer);
  }

  char* page;
};

TEST_F(UserMemory, IsReadAndWritten) {
  WriteUser(Address(page), "12345", 5);
  char copy[5];
  ReadUser(Address(page), copy, 5);
  EXPECT_EQ(std::string(copy, 5), "12345");
}

TEST_F(UserMemory, IsReadAndWrittenInOneStep) {
  WriteUser(Address(page), "12345", 5);
  char copy[5];
  ReadAndWriteUser(Address(page), copy, 5, Address(page + 2), "abc", 3);
  EXPECT_EQ(std::string(copy, 5), "12345");
  EXPECT_EQ(std::string(page, 5), "12abc");
}

TEST_F(UserMemory, IsNotWrittenWhereItCannotBeRead) {
  char copy[5];
  const auto exchange = [&](const char* source, const char* target) {
    return CodeOf([&] { ReadAndWriteUser(Address(source), copy, 5, Address(target), "abc", 3); });
  };
  EXPECT_EQ(exchange(page + kPage, page), EFAULT);
  EXPECT_EQ(std::string(page, 3), std::string(3, '\0'));
  EXPECT_EQ(exchange(page, page + kPage - 2), EFAULT);
  EXPECT_EQ(exchange(page, nullptr), EFAULT);
}

TEST_F(UserMemory, IsTheOwnOneAlsoAfterAFork) {
  WriteUser(Address(page), "parent", 7);
  EXPECT_EQ(RunInChild([&] {
              WriteUser(Address(page), "child!", 7);
              if (ReadUserText(Address(page), 10) != "child!")
                throw std::runtime_error("another's");
            }),
            "");
  EXPECT_EQ(ReadUserText(Address(page), 10), "parent");
}

TEST_F(UserMemory, EndsWhereThePageEnds) {
  char copy[16];
  EXPECT_EQ(CodeOf([&] { ReadUser(Address(page + kPage - 16), copy, 16); }), 0);
  EXPECT_EQ(CodeOf([&] { ReadUser(Address(page + kPage - 15), copy, 16); }), EFAULT);
  EXPECT_EQ(CodeOf([&] { WriteUser(Address(page + kPage - 16), copy, 16); }), 0);
  EXPECT_EQ(CodeOf([&] { WriteUser(Address(page + kPage - 15), copy, 16); }), EFAULT);
}

TEST_F(UserMemory, IsNotAtBadAddresses) {
  char copy[4] = {};
  for (const std::uint64_t address :
       {std::uint64_t{0}, std::uint64_t{1}, std::uint64_t{0x8000'0000'0000'0000}, ~std::uint64_t{0},
        ~std::uint64_t{3}}) {
    EXPECT_EQ(CodeOf([&] { ReadUser(address, copy, 4); }), EFAULT) << address;
    EXPECT_EQ(CodeOf([&] { WriteUser(address, copy, 4); }), EFAULT) << address;
    EXPECT_EQ(CodeOf([&] { ReadUserText(address, 100); }), EFAULT) << address;
  }
}

TEST_F(UserMemory, IsNotWrittenWhereItMayOnlyBeRead) {
  mprotect(page, kPage, PROT_READ);
  char copy[4] = {};
  EXPECT_EQ(CodeOf([&] { ReadUser(Address(page), copy, 4); }), 0);
  EXPECT_EQ(CodeOf([&] { WriteUser(Address(page), copy, 4); }), EFAULT);
}

TEST_F(UserMemory, HoldsTextsUpToTheLastByteOfAPage) {
  char* start = page + kPage - 6;
  std::memcpy(start, "hello", 6);
  EXPECT_EQ(ReadUserText(Address(start), 100), "hello");
  EXPECT_EQ(ReadUserText(Address(start), 5), "hello");
  EXPECT_EQ(CodeOf([&] { ReadUserText(Address(start), 4); }), ENAMETOOLONG);
  start[5] = '!';
  EXPECT_EQ(CodeOf([&] { ReadUserText(Address(start), 100); }), EFAULT);
  EXPECT_EQ(CodeOf([&] { ReadUserText(Address(start), 5); }), ENAMETOOLONG);
}

TEST_F(UserMemory, HoldsTextsAcrossPages) {
  mprotect(page, 2 * kPage, PROT_READ | PROT_WRITE);
  std::memset(page + kPage - 100, 'x', 200);
  EXPECT_EQ(ReadUserText(Address(page + kPage - 100), 1000), std::string(200, 'x'));
  EXPECT_EQ(ReadUserText(Address(page + kPage), 1000), std::string(100, 'x'));
  EXPECT_EQ(ReadUserText(Address(page), 1000), "");
}

}  // namespace
}  // namespace LinuxHostTest
