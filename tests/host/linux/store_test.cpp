// The database file: what it refuses to open, what others see of a transaction and when, and files
// that vanish beneath it.

#include "host/linux/state/store.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <list>
#include <optional>

#include "child_process.h"
#include "host/linux/common/host_error.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostError;
using LinuxHost::Rows;
using LinuxHost::Store;
using LinuxHost::StoreLayout;
using LinuxHost::Transaction;
using SecPolicyTest::MessageOf;

constexpr StoreLayout kLayout = {.purpose = "shopping list",
                                 .remedy = "Write a new one",
                                 .applicationId = 42,
                                 .version = 3,
                                 .schema = "CREATE TABLE item (name TEXT UNIQUE, count INTEGER)",
                                 .survivesPowerLoss = false};

std::string ContentOf(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

unsigned int ModeOf(const std::string& path) {
  struct stat status {};
  EXPECT_EQ(stat(path.c_str(), &status), 0);
  return status.st_mode & 07777;
}

// A later version of it, with what that has besides.
constexpr StoreLayout kNextLayout = {
    .purpose = "shopping list",
    .remedy = "Write a new one",
    .applicationId = 42,
    .version = 4,
    .schema = "CREATE TABLE item (name TEXT UNIQUE, count INTEGER)",
    .addition =
        ";CREATE TABLE shop (name TEXT);"
        "INSERT INTO shop VALUES ('corner')",
    .survivesPowerLoss = false};

class StoreFile : public ::testing::Test {
 protected:
  // The message of what opening `wanted` throws; its error number goes to `code`.
  std::string Refusal(const std::string& wanted, const StoreLayout& layout = kLayout) {
    try {
      const Store store(wanted, layout);
    } catch (const HostError& error) {
      code = error.Code();
      return error.what();
    }
    return {};
  }

  static std::int64_t CountOf(Store& store, const std::string& name) {
    Rows rows = store.Select("SELECT count FROM item WHERE name = ?1", name);
    return rows.Next() ? rows.Integer(0) : -1;
  }

  std::string Damage() const {
    return "Unable to use the shopping list " + path +
           ": it is damaged or no such thing (database disk image is malformed). Write a new one";
  }

  StateDirectory directory;
  std::string path = directory.Database();
  int code = 0;
};

// ---- What is opened, and what is refused.

TEST_F(StoreFile, IsMadeForItsOwnerAlone) {
  const std::string nested = directory.Path() + "/new/list.db";
  const mode_t before = umask(0);
  const Store store(nested, kLayout);
  umask(before);

  EXPECT_EQ(ModeOf(nested), 0600U);
  EXPECT_EQ(ModeOf(directory.Path() + "/new"), 0700U);
}

TEST_F(StoreFile, KeepsWhatWasWrittenWhenItIsClosed) {
  Store(path, kLayout).Run("INSERT INTO item VALUES ('milk', 2)");
  Store store(path, kLayout);
  EXPECT_EQ(CountOf(store, "milk"), 2);
}

TEST_F(StoreFile, AdoptsAnEmptyFile) {
  directory.Write("host.db", "");
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  Store store(path, kLayout);
  EXPECT_EQ(CountOf(store, "milk"), -1);
}

TEST_F(StoreFile, RefusesAPathThatIsNotAbsolute) {
  EXPECT_EQ(Refusal("list.db"),
            "The shopping list needs the absolute path of a file, not \"list.db\"");
  EXPECT_EQ(Refusal(""), "The shopping list needs the absolute path of a file, not \"\"");
  EXPECT_EQ(
      Refusal(directory.Path() + "/"),
      "The shopping list needs the absolute path of a file, not \"" + directory.Path() + "/\"");
  EXPECT_EQ(code, EINVAL);
}

TEST_F(StoreFile, NamesTheDirectoryThatCannotBeMade) {
  EXPECT_EQ(Refusal(directory.Path() + "/missing/new/list.db"),
            "Unable to create the directory " + directory.Path() +
                "/missing/new for the shopping list: No such file or directory. Make " +
                directory.Path() + "/missing first, or choose another place");
  EXPECT_EQ(code, ENOENT);
}

TEST_F(StoreFile, RefusesADirectoryInPlaceOfTheFile) {
  std::filesystem::create_directory(path);
  EXPECT_EQ(Refusal(path), "Refusing the shopping list: " + path +
                               " is not a regular file. Remove it, or choose another place");
  EXPECT_TRUE(std::filesystem::is_directory(path));
}

TEST_F(StoreFile, RefusesALink) {
  const std::string target = directory.Path() + "/target";
  Store(target, kLayout).Run("INSERT INTO item VALUES ('milk', 2)");
  std::filesystem::create_symlink(target, path);
  EXPECT_EQ(Refusal(path), "Refusing the shopping list: " + path +
                               " is not a regular file. Remove it, or choose another place");
}

TEST_F(StoreFile, RefusesALinkToTheDirectory) {
  std::filesystem::create_directory(directory.Path() + "/real");
  std::filesystem::create_directory_symlink("real", directory.Path() + "/link");
  EXPECT_EQ(Refusal(directory.Path() + "/link/list.db"),
            "Refusing the shopping list: " + directory.Path() + "/link is not a directory");
}

TEST_F(StoreFile, RefusesAFileThatOthersMayWrite) {
  { const Store store(path, kLayout); }
  for (const mode_t mode : {0620U, 0602U}) {
    ASSERT_EQ(chmod(path.c_str(), mode), 0);
    EXPECT_EQ(Refusal(path), "Refusing the shopping list: other users may write " + path +
                                 ". Take that right from them (chmod go-w), or choose another "
                                 "place");
  }
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  EXPECT_EQ(Refusal(path), "");
}

TEST_F(StoreFile, RefusesADirectoryThatOthersMayWrite) {
  ASSERT_EQ(chmod(directory.Path().c_str(), 01777), 0);
  EXPECT_EQ(Refusal(path), "Refusing the shopping list: other users may write " + directory.Path() +
                               ". Take that right from them (chmod go-w), or choose another place");
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(StoreFile, RefusesWhatAnotherUserOwns) {
  if (geteuid() != 0) GTEST_SKIP() << "only the superuser can give files away";
  constexpr uid_t kSomebody = 12345;
  { const Store store(path, kLayout); }

  ASSERT_EQ(chown(path.c_str(), kSomebody, kSomebody), 0);
  EXPECT_EQ(Refusal(path), "Refusing the shopping list: " + path +
                               " belongs to another user. Remove it, or choose another place");
  ASSERT_EQ(chown(path.c_str(), 0, 0), 0);
  ASSERT_EQ(chown(directory.Path().c_str(), kSomebody, kSomebody), 0);
  EXPECT_EQ(Refusal(path), "Refusing the shopping list: " + directory.Path() +
                               " belongs to another user. Remove it, or choose another place");
  EXPECT_EQ(code, EACCES);
}

TEST_F(StoreFile, RefusesAnotherSchemaAndLeavesItAlone) {
  StoreLayout newer = kLayout;
  newer.version = 4;
  Store(path, newer).Run("INSERT INTO item VALUES ('milk', 2)");
  EXPECT_EQ(Refusal(path), "Unable to use the shopping list " + path +
                               ": it has schema 4, this program works with schema 3: it was made "
                               "by another version of it. Write a new one");
  EXPECT_EQ(code, EPROTO);
  Store store(path, newer);
  EXPECT_EQ(CountOf(store, "milk"), 2);
}

TEST_F(StoreFile, TakesTheVersionBeforeWithWhatItLacks) {
  Store(path, kLayout).Run("INSERT INTO item VALUES ('milk', 2)");
  for (int use = 1; use <= 2; ++use) {
    Store store(path, kNextLayout);
    EXPECT_EQ(CountOf(store, "milk"), 2);
    EXPECT_EQ(store.ReadInteger("SELECT count(*) FROM shop"), 1);
  }
  EXPECT_EQ(Refusal(path), "Unable to use the shopping list " + path +
                               ": it has schema 4, this program works with schema 3: it was made "
                               "by another version of it. Write a new one");
}

TEST_F(StoreFile, IsNewWithWhatTheVersionBeforeLacks) {
  Store store(path, kNextLayout);
  EXPECT_EQ(store.ReadInteger("SELECT count(*) FROM shop"), 1);
  EXPECT_EQ(store.ReadInteger("SELECT count(*) FROM item"), 0);
}

TEST_F(StoreFile, RefusesTheVersionBeforeThatOne) {
  StoreLayout older = kLayout;
  older.version = 2;
  { const Store store(path, older); }
  EXPECT_EQ(Refusal(path, kNextLayout),
            "Unable to use the shopping list " + path +
                ": it has schema 2, this program works with schema 4: it was made by another "
                "version of it. Write a new one");
}

TEST_F(StoreFile, RefusesTheDatabaseOfSomethingElse) {
  StoreLayout other = kLayout;
  other.applicationId = 43;
  { const Store store(path, other); }
  EXPECT_EQ(Refusal(path), "Unable to use the shopping list " + path +
                               ": it is the database of something else. Write a new one");
  EXPECT_EQ(Refusal(path, other), "");
}

TEST_F(StoreFile, RefusesWhatIsNoDatabaseAndLeavesItAlone) {
  const std::string text(8192, 'x');
  directory.Write("host.db", text);
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  EXPECT_EQ(Refusal(path), "Unable to use the shopping list " + path +
                               ": it is damaged or no such thing (file is not a database). Write a "
                               "new one");
  EXPECT_EQ(code, EIO);
  EXPECT_EQ(ContentOf(path), text);
}

TEST_F(StoreFile, RefusesAFileThatWasCutOff) {
  Store(path, kLayout).Run("INSERT INTO item VALUES (?1, 1)", std::string(100'000, 'x'));
  std::filesystem::resize_file(path, std::filesystem::file_size(path) / 2);
  EXPECT_EQ(Refusal(path), Damage());
}

TEST_F(StoreFile, TellsDamageWhereItIsMet) {
  constexpr std::streamoff kBehindTheSchema = 4096;
  {
    Store written(path, kLayout);
    written.Run("INSERT INTO item VALUES ('milk', 2)");
  }
  std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
  file.seekp(kBehindTheSchema);
  file << std::string(std::filesystem::file_size(path) - kBehindTheSchema, '\xff') << std::flush;

  Store store(path, kLayout);
  EXPECT_EQ(MessageOf([&] { CountOf(store, "milk"); }), Damage());
}

// ---- What is written, and when it is seen.

TEST_F(StoreFile, TakesTextsAsTheyAre) {
  Store store(path, kLayout);
  const std::string text = std::string("a'b\"c\0d\xff", 8) + "\n";
  store.Run("INSERT INTO item VALUES (?1, ?2)", text, -1);
  store.Run("INSERT INTO item VALUES (?1, ?2)", "", 5);
  Rows rows = store.Select("SELECT name FROM item WHERE count = ?1", -1);
  ASSERT_TRUE(rows.Next());
  EXPECT_EQ(rows.Text(0), text);
  EXPECT_FALSE(rows.Next());
  EXPECT_EQ(CountOf(store, ""), 5);
}

// Longer than the engine takes, and nowhere in memory.
TEST_F(StoreFile, RefusesATextThatIsTooLong) {
  constexpr std::size_t kLength = 2'000'000'000;
  void* const pages =
      mmap(nullptr, kLength, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
  ASSERT_NE(pages, MAP_FAILED);
  const std::string_view text(static_cast<const char*>(pages), kLength);
  Store store(path, kLayout);
  EXPECT_EQ(MessageOf([&] { store.Run("INSERT INTO item VALUES (?1, 1)", text); }),
            "Unable to use the shopping list " + path + ": string or blob too big");
  munmap(pages, kLength);
}

TEST_F(StoreFile, CountsTheRowsThatChanged) {
  Store store(path, kLayout);
  EXPECT_EQ(store.Run("INSERT INTO item VALUES ('milk', 2), ('tea', 1)"), 2);
  EXPECT_EQ(store.Run("UPDATE item SET count = 3 WHERE name = 'milk'"), 1);
  EXPECT_EQ(store.Run("DELETE FROM item WHERE name = 'nothing'"), 0);
}

TEST_F(StoreFile, GoesOnAfterARefusedStatement) {
  Store store(path, kLayout);
  store.Run("INSERT INTO item VALUES (?1, ?2)", "milk", 2);
  EXPECT_EQ(MessageOf([&] { store.Run("INSERT INTO item VALUES (?1, ?2)", "milk", 3); }),
            "Unable to use the shopping list " + path + ": UNIQUE constraint failed: item.name");
  store.Run("INSERT INTO item VALUES (?1, ?2)", "tea", 1);
  EXPECT_EQ(CountOf(store, "milk"), 2);
  EXPECT_EQ(CountOf(store, "tea"), 1);
}

TEST_F(StoreFile, UndoesATransactionThatIsNotCommitted) {
  Store store(path, kLayout);
  {
    const Transaction transaction(store);
    store.Run("INSERT INTO item VALUES ('milk', 2)");
  }
  EXPECT_EQ(CountOf(store, "milk"), -1);
  Transaction transaction(store);
  store.Run("INSERT INTO item VALUES ('milk', 2)");
  transaction.Commit();
  EXPECT_EQ(CountOf(store, "milk"), 2);
}

TEST_F(StoreFile, ShowsOthersACommittedTransactionAndNothingBefore) {
  Store writer(path, kLayout);
  Store reader(path, kLayout);
  Transaction transaction(writer);
  writer.Run("INSERT INTO item VALUES ('milk', 2)");
  EXPECT_EQ(CountOf(reader, "milk"), -1);
  transaction.Commit();
  EXPECT_EQ(CountOf(reader, "milk"), 2);
}

TEST_F(StoreFile, HasAMarkThatEveryCommitChanges) {
  Store writer(path, kLayout);
  Store watcher(path, kLayout);
  Store::CommitMark before{};
  Store::CommitMark after{};

  ASSERT_TRUE(watcher.ReadCommitMark(&before));
  ASSERT_TRUE(watcher.ReadCommitMark(&after));
  EXPECT_EQ(before, after);
  for (int item = 0; item < 5000; ++item) {
    writer.Run("INSERT INTO item VALUES (?1, ?1)", item);
    ASSERT_FALSE(watcher.IsAt(before)) << "after commit " << item;
    ASSERT_TRUE(watcher.ReadCommitMark(&after));
    ASSERT_NE(before, after) << "after commit " << item;
    before = after;
  }
}

TEST_F(StoreFile, HasAMarkThatReadingLeavesAlone) {
  Store store(path, kLayout);
  Store other(path, kLayout);
  Store::CommitMark before{};
  Store::CommitMark after{};
  ASSERT_TRUE(store.ReadCommitMark(&before));
  CountOf(other, "milk");
  CountOf(store, "milk");
  EXPECT_TRUE(store.IsAt(before));
  ASSERT_TRUE(store.ReadCommitMark(&after));
  EXPECT_EQ(before, after);
}

// ---- Files that go, and processes that fork.

TEST_F(StoreFile, NoticesThatItsFileIsGone) {
  const Store store(path, kLayout);
  EXPECT_TRUE(store.IsCurrent());
  std::filesystem::remove(path);
  EXPECT_FALSE(store.IsCurrent());
}

TEST_F(StoreFile, LeavesTheSuccessorOfItsFileAlone) {
  std::optional<Store> old(std::in_place, path, kLayout);
  for (const char* suffix : {"", "-wal", "-shm"}) std::filesystem::remove(path + suffix);
  Store store(path, kLayout);
  store.Run("INSERT INTO item VALUES ('milk', 2)");
  EXPECT_FALSE(old->IsCurrent());

  old.reset();

  EXPECT_TRUE(std::filesystem::exists(path + "-wal"));
  EXPECT_EQ(RunInChild([&] {
              Store other(path, kLayout);
              if (CountOf(other, "milk") != 2) throw std::runtime_error("lost");
            }),
            "");
}

TEST_F(StoreFile, RefusesToWorkForAForkedChild) {
  Store store(path, kLayout);
  EXPECT_EQ(RunInChild([&] { store.Run("INSERT INTO item VALUES ('milk', 2)"); }),
            "The shopping list was opened before this process was forked: open it again");
  store.Run("INSERT INTO item VALUES ('tea', 1)");
  EXPECT_EQ(CountOf(store, "tea"), 1);
  EXPECT_EQ(CountOf(store, "milk"), -1);
}

TEST_F(StoreFile, IsMadeOnceByManyAtTheSameTime) {
  for (int round = 0; round < 10; ++round) {
    const std::string fresh = directory.Path() + "/" + std::to_string(round) + "/list.db";
    std::list<ChildProcess> children;
    for (int child = 0; child < 6; ++child) {
      children.emplace_back(
          [&, child] { Store(fresh, kLayout).Run("INSERT INTO item VALUES (?1, ?1)", child); });
    }
    for (auto& child : children) EXPECT_EQ(child.Wait(), "");
    Store store(fresh, kLayout);
    Rows rows = store.Select("SELECT count(*) FROM item");
    rows.Next();
    EXPECT_EQ(rows.Integer(0), 6);
  }
}

}  // namespace
}  // namespace LinuxHostTest
