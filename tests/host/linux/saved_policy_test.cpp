// Saved states: put back whole or not at all, with worlds still in their domains, and refused when
// old, damaged, foreign or open to others.

#include "host/linux/operation/saved_policy.h"

#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <optional>

#include "child_process.h"
#include "host/linux/operation/rule_origins.h"
#include "host/linux/operation/store_copy.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/world_table.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::CopyDatabase;
using LinuxHost::CopyOf;
using LinuxHost::HostState;
using LinuxHost::RestorePolicy;
using LinuxHost::SaveState;
using Policy::RuleKind;
using SecPolicyTest::MessageOf;

constexpr auto kNoDefaults = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;

Policy::Rule CallFrom(const std::string& file) {
  return {.kind = RuleKind::kSyscall,
          .words = {"read"},
          .verdict = true,
          .origin = {.file = file, .line = 1}};
}

class SavedPolicy : public ::testing::Test {
 protected:
  unsigned int Create(const std::string& name) {
    return state.Domains().Create(name, kNoDefaults, false);
  }

  void Grant(unsigned int domain, const std::string& call, bool granted = true) {
    state.Rules().Install({domain, ""},
                          {.kind = RuleKind::kSyscall, .words = {call}, .verdict = granted});
  }

  void AddPolicy(unsigned int domain, int world, const std::string& path) {
    const LinuxHost::FilePolicy policy{
        .domain = {domain, ""}, .world = world, .path = path, .permission = 1};
    state.FilePolicies().Install({&policy, 1});
  }

  // The number of a label, kNoLabel when there is none.
  unsigned int Label(const std::string& name) {
    state.Refresh();
    return state.Labels().Lookup(name);
  }

  // The whole content of a table, one row a line.
  std::string Table(LinuxHost::Sql query) {
    std::string text;
    LinuxHost::Rows rows = state.Database().Select(query);
    while (rows.Next()) text += rows.Text(0) + "\n";
    return text;
  }

  std::string Domains() { return Table("SELECT id || ' ' || name FROM domain ORDER BY id"); }
  std::string Rules() {
    return Table(
        "SELECT domain_id || ' ' || word1 || ' ' || iif(granted, 'grant', 'revoke') FROM rule "
        "ORDER BY id");
  }
  std::string FilePolicies() {
    return Table(
        "SELECT domain_id || ' ' || world || ' ' || path FROM file_policy ORDER BY domain_id, "
        "world, path");
  }

  // A copy of the state as it is now, for one call of RestorePolicy.
  std::string Copy(const std::string& name = "copy.db") {
    const std::string path = directory.Path() + "/" + name;
    std::filesystem::remove(path);
    CopyDatabase(directory.Database(), CopyOf::kState, path);
    return path;
  }

  // Copies a saved state for its next use.
  std::string CopySaved(const std::string& path) {
    const std::string copy = directory.Path() + "/used.db";
    std::filesystem::remove(copy);
    CopyDatabase(path, CopyOf::kSavedState, copy);
    return copy;
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
};

// Changes a database behind the host's back.
void Execute(const std::string& path, const char* sql) {
  sqlite3* database = nullptr;
  ASSERT_EQ(sqlite3_open(path.c_str(), &database), SQLITE_OK);
  ASSERT_EQ(sqlite3_exec(database, sql, nullptr, nullptr, nullptr), SQLITE_OK) << sql;
  sqlite3_close(database);
}

TEST_F(SavedPolicy, PutsDomainsRulesAndPartsBack) {
  const unsigned int one = Create("oneDom");
  const unsigned int two = Create("twoDom");
  Grant(one, "read");
  Grant(two, "write", false);
  AddPolicy(two, 0, "/srv");
  state.Domains().SetLevel("oneDom", "permissive");
  state.Domains().SetRole(LinuxHost::DomainRole::GlobalVm, one);
  state.Domains().AddGuestService(one, "clock");
  const std::string domains = Domains();
  const std::string rules = Rules();
  const std::string copy = Copy();

  state.Domains().SetRole(LinuxHost::DomainRole::GlobalVm, two);
  state.Domains().Destroy(one);
  Create("threeDom");
  Grant(two, "write");
  Grant(two, "open");
  AddPolicy(two, 0, "/etc");
  RestorePolicy(copy);

  EXPECT_EQ(Domains(), domains);
  EXPECT_EQ(Rules(), rules);
  EXPECT_EQ(FilePolicies(), "3 0 /srv\n");
  EXPECT_EQ(state.Domains().Get("oneDom").level, "permissive");
  EXPECT_TRUE(state.Domains().HasRole(LinuxHost::DomainRole::GlobalVm, one));
  EXPECT_EQ(state.Domains().GuestServices(one), std::vector<std::string>{"clock"});
}

TEST_F(SavedPolicy, KeepsTheNumbersOfLabelsThatAreStillThere) {
  state.Labels().Add({"goneLabel", "keptLabel"});
  const unsigned int gone = Label("goneLabel");
  const unsigned int kept = Label("keptLabel");
  const std::string copy = Copy();
  state.Labels().Remove({"goneLabel"});
  state.Labels().Add({"newLabel"});
  const unsigned int latest = Label("newLabel");

  RestorePolicy(copy);

  EXPECT_EQ(Label("keptLabel"), kept);
  EXPECT_EQ(Label("newLabel"), LinuxHost::kNoLabel);
  EXPECT_EQ(Label("goneLabel"), latest + 1);
  EXPECT_NE(Label("goneLabel"), gone);
}

TEST_F(SavedPolicy, PutsOriginsOfRulesBackAndKeepsThoseOfLabels) {
  const LinuxHost::RuleOrigin rule{"hostDom", CallFrom("/old")};
  const LinuxHost::LabelOrigin label{"/etc", false, "unlabeled", "/old", 1};
  LinuxHost::RecordOrigins(HostState::Current(), {&rule, 1}, {&label, 1});
  const std::string copy = Copy();
  const LinuxHost::RuleOrigin newRule{"hostDom", CallFrom("/new")};
  const LinuxHost::LabelOrigin newLabel{"/etc", false, "unlabeled", "/new", 2};
  LinuxHost::RecordOrigins(HostState::Current(), {&newRule, 1}, {&newLabel, 1});

  RestorePolicy(copy);
  Policy::Rule found = CallFrom("");
  LinuxHost::FindRuleOrigins(HostState::Current(), "hostDom", {&found, 1});
  EXPECT_EQ(found.origin.file, "/old");
  EXPECT_EQ(LinuxHost::FindLabelOrigin(HostState::Current(), "/etc")->file, "/new");
}

TEST_F(SavedPolicy, KeepsWhereInodesCameFromAndTheAttribute) {
  const std::string copy = Copy();
  const LinuxHost::InodeOrigin origin{1, 2, "base.tgz", "/etc", 3};
  state.RecordOrigins({&origin, 1});
  state.ChooseLabelAttribute("user.zorvan.security");
  RestorePolicy(copy);
  EXPECT_EQ(state.FindOrigin(1, 2)->tardisk, "base.tgz");
  EXPECT_EQ(state.LabelAttribute(), "user.zorvan.security");
}

TEST_F(SavedPolicy, IsSeenByOtherConnections) {
  const std::string copy = Copy();
  HostState other(directory.Database());
  const unsigned int late = Create("lateDom");
  other.Refresh();
  ASSERT_NE(other.Domains().Find("lateDom"), nullptr);
  state.Labels().Add({"lateLabel"});
  other.Refresh();
  ASSERT_NE(other.Labels().Lookup("lateLabel"), LinuxHost::kNoLabel);

  RestorePolicy(copy);

  EXPECT_EQ(MessageOf([&] {
              other.Rules().Install(
                  {late, "lateDom"},
                  {.kind = RuleKind::kSyscall, .words = {"read"}, .verdict = false});
            }),
            "unknown domain " + std::to_string(late));
  EXPECT_EQ(other.Labels().Lookup("lateLabel"), LinuxHost::kNoLabel);
}

// ---- Worlds

// In the saved state "oneDom" has the number that "twoDom" has now, and the other way round.
class SwappedDomains : public SavedPolicy {
 protected:
  SwappedDomains() {
    const unsigned int one = Create("oneDom");
    Create("twoDom");
    copy = Copy();
    state.Domains().Destroy(state.Domains().Get("twoDom").id);
    state.Domains().Destroy(one);
    Create("twoDom");
    Create("oneDom");
  }

  unsigned int Id(const std::string& name) { return state.Domains().Get(name).id; }

  std::string copy;
};

TEST_F(SwappedDomains, KeepTheirWorlds) {
  ChildProcess world([] { pause(); });
  const unsigned int before = Id("oneDom");
  state.Worlds().Place(getpid(), Id("oneDom"));
  state.Worlds().Place(world.Id(), Id("twoDom"));
  RestorePolicy(copy);
  ASSERT_NE(Id("oneDom"), before);
  EXPECT_EQ(state.Worlds().DomainOf(getpid()), Id("oneDom"));
  EXPECT_EQ(state.Worlds().DomainOf(world.Id()), Id("twoDom"));
  world.Kill();
}

TEST_F(SwappedDomains, KeepTheFilePoliciesOfTheirWorlds) {
  AddPolicy(Id("oneDom"), getpid(), "/one");
  AddPolicy(Id("oneDom"), getpid(), "/same");
  AddPolicy(Id("twoDom"), getpid(), "/same");
  RestorePolicy(copy);
  const std::string world = " " + std::to_string(getpid()) + " ";
  const std::string one = std::to_string(Id("oneDom")) + world;
  const std::string two = std::to_string(Id("twoDom")) + world;
  EXPECT_EQ(FilePolicies(), one + "/one\n" + one + "/same\n" + two + "/same\n");
}

TEST_F(SavedPolicy, IsRefusedWhileWorldsRunInADomainThatWouldGo) {
  const std::string copy = Copy();
  const unsigned int late = Create("lateDom");
  Grant(late, "read");
  ChildProcess world([] { pause(); });
  state.Worlds().Place(world.Id(), late);
  const std::string rules = Rules();

  EXPECT_EQ(MessageOf([&] { RestorePolicy(copy); }),
            "worlds run in the domain 'lateDom', which it does not have. End them, and run it "
            "again");
  EXPECT_EQ(Rules(), rules);
  EXPECT_EQ(state.Worlds().DomainOf(world.Id()), late);

  world.Kill();
  world.Wait();
  RestorePolicy(copy);
  EXPECT_EQ(state.Domains().Find("lateDom"), nullptr);
  EXPECT_EQ(Table("SELECT id FROM world"), "");
}

TEST_F(SavedPolicy, DropsTheFilePoliciesOfWorldsInADomainThatGoes) {
  AddPolicy(LinuxHost::kStartDomain, getpid(), "/of-then");
  const std::string copy = Copy();
  state.FilePolicies().Remove(LinuxHost::kStartDomain, getpid(), "/of-then");
  AddPolicy(Create("lateDom"), getpid(), "/late");
  RestorePolicy(copy);
  EXPECT_EQ(FilePolicies(), "");
}

// ---- What is refused

TEST_F(SavedPolicy, IsRefusedWhenItIsOfAnotherSchema) {
  const std::string copy = Copy();
  const std::string domains = Domains();
  {
    HostState edited(copy);
    edited.Database().Run("PRAGMA user_version = 1");
  }
  EXPECT_EQ(MessageOf([&] { RestorePolicy(copy); }),
            "it has schema 1, this program works with schema 6: it was saved by another version");
  EXPECT_EQ(Domains(), domains);
}

TEST_F(SavedPolicy, IsRefusedWhenItIsSomethingElse) {
  const std::string copy = Copy();
  {
    HostState edited(copy);
    edited.Database().Run("PRAGMA application_id = 1");
  }
  EXPECT_EQ(MessageOf([&] { RestorePolicy(copy); }), "it is no saved state");
  directory.Write("text",
                  "this is a text of more than one hundred bytes, which no database begins "
                  "with, and it goes on and on and on");
  EXPECT_EQ(MessageOf([&] { RestorePolicy(directory.Path() + "/text"); }), "it is damaged");
}

TEST_F(SavedPolicy, IsRefusedWhenItIsDamaged) {
  for (int number = 0; number < 200; ++number) Create("domain" + std::to_string(number));
  const std::string copy = Copy();
  const std::string domains = Domains();
  {
    std::fstream file(copy, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(4096 * 2);
    file << std::string(4096 * 4, '\x55');
  }
  EXPECT_EQ(MessageOf([&] { RestorePolicy(copy); }), "it is damaged");
  EXPECT_EQ(Domains(), domains);
  // The connection is none the worse for it.
  RestorePolicy(Copy());
  EXPECT_EQ(Domains(), domains);
}

// The one step is one transaction: a killed process leaves the old or the new, never a part.
TEST_F(SavedPolicy, IsWholeWheneverItIsKilled) {
  const auto fill = [&](const std::string& prefix) {
    for (int number = 0; number < 40; ++number) {
      const unsigned int id = Create(prefix + std::to_string(number));
      Grant(id, "read");
      AddPolicy(id, 0, "/" + prefix);
    }
    state.Labels().Add({prefix + "Label"});
  };
  const auto contents = [&] {
    state.Refresh();
    return Domains() + Rules() + FilePolicies() + Table("SELECT name FROM label ORDER BY name");
  };
  const std::string empty = Copy("empty.db");
  fill("one");
  const std::string one = contents();
  const std::string copyOfOne = Copy("one.db");
  RestorePolicy(empty);
  fill("two");
  const std::string two = contents();
  const std::string copyOfTwo = Copy("two.db");

  for (useconds_t delay = 0; delay < 20'000; delay += 1'000) {
    ChildProcess restorer([&] {
      for (;;) {
        RestorePolicy(copyOfOne);
        RestorePolicy(copyOfTwo);
      }
    });
    usleep(delay);
    restorer.Kill();
    ASSERT_EQ(restorer.Wait(), "killed");
    const std::string left = contents();
    EXPECT_TRUE(left == one || left == two) << left;
  }
}

// ---- Saving

TEST_F(SavedPolicy, IsSavedForItsOwnerAlone) {
  Create("savedDom");
  const std::string place = directory.Path() + "/a/saved";
  const std::string path = place + "/one.db";
  SaveState(directory.Database(), path, false);
  struct stat status {};
  ASSERT_EQ(stat(path.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFREG | 0600U);
  ASSERT_EQ(stat(place.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFDIR | 0700U);
  HostState saved(path);
  EXPECT_NE(saved.Domains().Find("savedDom"), nullptr);
}

TEST_F(SavedPolicy, LeavesNothingButTheFile) {
  const std::string place = directory.Path() + "/saved";
  SaveState(directory.Database(), place + "/one.db", false);
  std::size_t files = 0;
  for (const auto& entry : std::filesystem::directory_iterator(place)) {
    EXPECT_EQ(entry.path().filename(), "one.db");
    ++files;
  }
  EXPECT_EQ(files, 1U);
}

TEST_F(SavedPolicy, ReplacesAFileOnlyWhenTold) {
  const std::string path = directory.Path() + "/saved/one.db";
  SaveState(directory.Database(), path, false);
  Create("lateDom");
  EXPECT_EQ(MessageOf([&] { SaveState(directory.Database(), path, false); }),
            "Unable to make " + path + ": File exists");
  EXPECT_EQ(HostState(CopySaved(path)).Domains().Find("lateDom"), nullptr);
  SaveState(directory.Database(), path, true);
  EXPECT_NE(HostState(CopySaved(path)).Domains().Find("lateDom"), nullptr);
}

TEST_F(SavedPolicy, RefusesAPlaceThatOthersMayWrite) {
  const std::string place = directory.Path() + "/saved";
  std::filesystem::create_directory(place);
  std::filesystem::permissions(place, std::filesystem::perms::all);
  EXPECT_EQ(MessageOf([&] { SaveState(directory.Database(), place + "/one.db", false); }),
            "Refusing the saved state: other users may write " + place +
                ". Take that right from them (chmod go-w), or choose another place");
  EXPECT_TRUE(std::filesystem::is_empty(place));
}

TEST_F(SavedPolicy, IsTrustedOnlyWhereNobodyElseMayWrite) {
  const std::string place = directory.Path() + "/saved";
  const std::string path = place + "/one.db";
  SaveState(directory.Database(), path, false);
  EXPECT_NO_THROW(CopySaved(path));

  std::filesystem::permissions(path, std::filesystem::perms(0620));
  EXPECT_EQ(MessageOf([&] { CopySaved(path); }),
            "Refusing the saved state: other users may write " + path +
                ". Take that right from them (chmod go-w), and make it anew");
  std::filesystem::permissions(path, std::filesystem::perms(0600));
  std::filesystem::permissions(place, std::filesystem::perms::all);
  EXPECT_EQ(MessageOf([&] { CopySaved(path); }),
            "Refusing the saved state: other users may write " + place +
                ". Take that right from them (chmod go-w), and make it anew");
  std::filesystem::permissions(place, std::filesystem::perms::owner_all);

  std::filesystem::create_symlink("one.db", place + "/link.db");
  EXPECT_EQ(MessageOf([&] { CopySaved(place + "/link.db"); }),
            "Refusing the saved state: " + place +
                "/link.db is not a regular file. Remove it, and make it anew");
  std::filesystem::create_directory_symlink("saved", directory.Path() + "/linked");
  EXPECT_EQ(MessageOf([&] { CopySaved(directory.Path() + "/linked/one.db"); }),
            "Refusing the saved state: " + directory.Path() + "/linked is not a directory");
  EXPECT_EQ(MessageOf([&] { CopySaved(place + "/none.db"); }),
            "Unable to examine " + place + "/none.db: No such file or directory");
  EXPECT_FALSE(std::filesystem::exists(place + "/none.db"));

  if (geteuid() != 0) return;  // only root can give files away
  ASSERT_EQ(chown(path.c_str(), 65534, 65534), 0);
  EXPECT_EQ(MessageOf([&] { CopySaved(path); }),
            "Refusing the saved state: " + path +
                " belongs to another user. Remove it, and make it anew");
}

TEST_F(SavedPolicy, IsNotSavedFromWhatIsNoState) {
  directory.Write("text",
                  "this is a text of more than one hundred bytes, which no database begins "
                  "with, and it goes on and on and on");
  const std::string from = directory.Path() + "/text";
  EXPECT_EQ(MessageOf([&] { SaveState(from, directory.Path() + "/saved/one.db", false); }),
            "Unable to copy the host state " + from + ": file is not a database");
  EXPECT_TRUE(std::filesystem::is_empty(directory.Path() + "/saved"));
}

// The engine is told how to open a file behind its name, so these letters mean something to it.
TEST_F(SavedPolicy, IsCopiedWhateverLettersItsPathHas) {
  Create("oneDom");
  for (const char* const name : {"a%b.db", "a%23b.db", "a?b.db", "a?mode=ro", "a#b.db"}) {
    const std::string copy = Copy(name);
    const std::string again = directory.Path() + "/again.db";
    std::filesystem::remove(again);
    CopyDatabase(copy, CopyOf::kOwnCopy, again);
    EXPECT_EQ(std::filesystem::file_size(again), std::filesystem::file_size(copy)) << name;
  }
}

// The engine itself takes such files for empty databases.
TEST_F(SavedPolicy, IsNoSavedStateWhenItIsEmpty) {
  const std::string path = directory.Path() + "/saved/one.db";
  SaveState(directory.Database(), path, false);
  for (const std::size_t size : {1U, 0U}) {
    std::filesystem::resize_file(path, size);
    EXPECT_EQ(MessageOf([&] { CopySaved(path); }),
              "Unable to copy the saved state " + path + ": it is no saved state");
  }
}

TEST_F(SavedPolicy, IsRefusedWhenAValueIsNoLongerWhatWasSaved) {
  const unsigned int domain = Create("oneDom");
  Grant(domain, "read", false);
  const std::string path = directory.Path() + "/saved/one.db";
  const char* const changes[] = {"UPDATE rule SET granted = 1",
                                 "UPDATE rule SET id = id + 1",
                                 "DELETE FROM state",
                                 "UPDATE sqlite_sequence SET seq = seq + 1",
                                 "DROP TABLE label_origin",
                                 "CREATE TABLE more (id INTEGER)",
                                 "DELETE FROM seal",
                                 "DROP TABLE seal"};
  for (const char* const change : changes) {
    SaveState(directory.Database(), path, true);
    EXPECT_NO_THROW(CopySaved(path));
    Execute(path, change);
    EXPECT_EQ(MessageOf([&] { CopySaved(path); }),
              "Unable to copy the saved state " + path + ": it is damaged")
        << change;
  }
}

}  // namespace
}  // namespace LinuxHostTest
