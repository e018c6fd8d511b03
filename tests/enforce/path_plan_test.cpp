// Rights to paths: hunts for a right that no rule gives, on random trees by a model that knows the
// decision only, and for one that is lost without a word.

#include "host/enforce/plan/path_plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <random>
#include <set>

#include "policy/decision.h"

namespace EnforceTest {
namespace {

using Enforce::Fate;
using Enforce::FileKind;
using Enforce::LabelledPath;
using Enforce::Mask;
using Enforce::MaskKind;
using Enforce::PathPlan;
using Enforce::PathRight;
using Policy::FileAccess;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
namespace Landlock = Enforce::Landlock;

// ---- Files in memory

class MemoryTree : public Enforce::FileTree {
 public:
  FileKind KindOf(const std::string& path) override {
    const auto found = kinds.find(path);
    return found == kinds.end() ? FileKind::kNothing : found->second;
  }

  std::optional<std::vector<std::string>> List(const std::string& directory,
                                               std::size_t most) override {
    std::vector<std::string> names;
    for (const auto& [path, kind] : kinds) {
      if (path != "/" && ParentOf(path) == directory) {
        names.push_back(path.substr(path.rfind('/') + 1));
      }
    }
    if (names.size() > most || crowded.contains(directory)) return std::nullopt;
    return names;
  }

  bool CanMask() override { return canMask; }

  static std::string ParentOf(const std::string& path) {
    return path.substr(0, std::max<std::size_t>(path.rfind('/'), 1));
  }

  std::map<std::string, FileKind> kinds = {{"/", FileKind::kDirectory}};
  std::set<std::string> crowded;  // with too many entries to list
  bool canMask = true;
};

MemoryTree Files(std::initializer_list<const char*> directories,
                 std::initializer_list<const char*> files) {
  MemoryTree tree;
  for (const char* path : directories) tree.kinds[path] = FileKind::kDirectory;
  for (const char* path : files) {
    const bool isDevice = std::string_view(path).starts_with("/dev/");
    tree.kinds[path] = isDevice ? FileKind::kSpecial : FileKind::kFile;
  }
  return tree;
}

Rule Path(const std::string& path, const char* letters) {
  return {
      .kind = RuleKind::kFilePath, .words = {path}, .verdict = Policy::Permissions::Parse(letters)};
}

Rule RuleOf(RuleKind kind, const decltype(Rule::words)& words, bool grant = true) {
  return {.kind = kind, .words = words, .verdict = grant};
}

Rule Object(const char* label, const char* access, bool grant = true) {
  return RuleOf(RuleKind::kObjectAccess, {label, access}, grant);
}

PathPlan PlanPaths(const InstalledDomain& domain, const std::vector<LabelledPath>& places,
                   MemoryTree& files) {
  return Enforce::PlanPaths(domain, places, files, true);
}

InstalledDomain Domain(std::vector<Rule> rules) {
  InstalledDomain domain;
  domain.name = "testDom";
  domain.rules = std::move(rules);
  return domain;
}

constexpr std::uint64_t kReading = Landlock::kReadFile | Landlock::kReadDir;
constexpr std::uint64_t kWriting =
    Landlock::kWriteFile | Landlock::kTruncate | Landlock::kIoctlDev | Landlock::kRemoveFile |
    Landlock::kRemoveDir | Landlock::kRefer | Landlock::kMakeReg | Landlock::kMakeDir |
    Landlock::kMakeSym | Landlock::kMakeFifo | Landlock::kMakeSock;

std::string HowOf(const PathPlan& plan, std::size_t rule) {
  const auto& fate = plan.fates.at(rule);
  return std::string(TextOf(fate.fate)) + (fate.how.empty() ? "" : ": " + fate.how);
}

// ---- One rule at a time

TEST(PlanPaths, GivesADirectoryToEverythingBeneath) {
  MemoryTree files = Files({"/srv", "/srv/a"}, {"/srv/a/f"});
  const PathPlan plan = PlanPaths(Domain({Path("/srv", "rw")}), {}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/srv", kReading | kWriting}));
  EXPECT_EQ(HowOf(plan, 0), "enforced");
}

TEST(PlanPaths, GivesAFileOnlyWhatFitsIt) {
  MemoryTree files = Files({}, {"/f"});
  const PathPlan plan = PlanPaths(Domain({Path("/f", "rwx")}), {}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/f", Landlock::kOfFiles}));
}

TEST(PlanPaths, GivesANarrowerPathMore) {
  MemoryTree files = Files({"/opt", "/opt/spool"}, {"/opt/f"});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "r"), Path("/opt/spool", "rw")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", kReading}, PathRight{"/opt/spool", kWriting}));
  EXPECT_EQ(HowOf(plan, 0), "enforced");
  EXPECT_EQ(HowOf(plan, 1), "enforced");
}

TEST(PlanPaths, TakesADirectoryApartWhereANarrowerPathHasLess) {
  MemoryTree files = Files({"/opt", "/opt/bin", "/opt/spool"}, {"/opt/f", "/opt/spool/s"});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "rx"), Path("/opt/spool", "r")}), {}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/opt", kReading},
                                       PathRight{"/opt/bin", Landlock::kExecute, true},
                                       PathRight{"/opt/f", Landlock::kExecute, true}));
  EXPECT_EQ(HowOf(plan, 0),
            "narrowed: entries of /opt have different rights: those that are there at the start "
            "have theirs, new ones and the directory itself do not");
  EXPECT_EQ(HowOf(plan, 1), "enforced");
}

// ---- Directories with too many entries to take them apart

// A directory /opt with more entries than that.
MemoryTree Crowd(std::initializer_list<const char*> directories,
                 std::initializer_list<const char*> files) {
  MemoryTree tree = Files(directories, files);
  tree.kinds["/opt"] = FileKind::kDirectory;
  for (std::size_t count = 0; count <= Enforce::kMostSiblings; ++count) {
    tree.kinds["/opt/" + std::to_string(count)] = FileKind::kFile;
  }
  return tree;
}

constexpr char kTooMany[] = "narrowed: /opt has more than 64 entries, and some have other rights";

TEST(PlanPaths, ListsDirectoriesUpToSomeNumberOfEntries) {
  MemoryTree files = Crowd({"/opt/spool"}, {});
  files.kinds.erase("/opt/0");
  files.kinds.erase("/opt/1");
  const InstalledDomain domain = Domain({Path("/opt", "rx"), Path("/opt/spool", "r")});
  EXPECT_THAT(PlanPaths(domain, {}, files).masks, IsEmpty());
  files.kinds["/opt/0"] = FileKind::kFile;
  EXPECT_THAT(PlanPaths(domain, {}, files).masks, SizeIs(1));
}

TEST(PlanPaths, MountsWhatIsNotExecuted) {
  MemoryTree files = Crowd({"/opt/spool"}, {});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "rx"), Path("/opt/spool", "r")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", kReading}, PathRight{"/opt", Landlock::kExecute}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/spool", MaskKind::kNoExec}));
  EXPECT_EQ(HowOf(plan, 0), "enforced");
  EXPECT_EQ(HowOf(plan, 1),
            "narrowed: /opt/spool is mounted so that nothing there is executed, libraries neither");
}

TEST(PlanPaths, HidesWhereNothingIsGranted) {
  MemoryTree files = Crowd({"/opt/spool", "/opt/spool/inner"}, {});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "rwx"), Path("/opt/spool", "")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", kReading | kWriting | Landlock::kExecute}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/spool", MaskKind::kHidden}));
  EXPECT_EQ(HowOf(plan, 0), "enforced");
  EXPECT_EQ(HowOf(plan, 1), "enforced");
}

TEST(PlanPaths, MasksNothingThatCannotBe) {
  const InstalledDomain domain = Domain({Path("/opt", "rx"), Path("/opt/spool", "r")});
  MemoryTree files = Crowd({"/opt/spool"}, {});
  PathPlan plan = Enforce::PlanPaths(domain, {}, files, false);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/opt", kReading}));
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
  files.canMask = false;
  plan = PlanPaths(domain, {}, files);
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

// No mount keeps from writing to a fifo.
TEST(PlanPaths, MasksNothingThatIsOnlyWrittenLess) {
  MemoryTree files = Crowd({"/opt/spool"}, {});
  const PathPlan plan =
      PlanPaths(Domain({Path("/opt", "rwx"), Path("/opt/spool", "rx")}), {}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/opt", kReading | Landlock::kExecute}));
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

TEST(PlanPaths, MasksForTheRightsForWhichItHelps) {
  MemoryTree files = Crowd({"/opt/bin", "/opt/spool"}, {});
  const PathPlan plan = PlanPaths(
      Domain({Path("/opt", "rwx"), Path("/opt/bin", "rx"), Path("/opt/spool", "rw")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", kReading}, PathRight{"/opt", Landlock::kExecute},
                          PathRight{"/opt/spool", kWriting}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/spool", MaskKind::kNoExec}));
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

TEST(PlanPaths, MasksNoFileThatARuleNames) {
  MemoryTree files = Crowd({"/dev"}, {"/opt/secret", "/dev/null"});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "r"), Path("/opt/secret", "")}), {}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/opt", Landlock::kReadDir}));
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

TEST(PlanPaths, HidesFilesByTheirLabelWhereThereIsADeviceForIt) {
  MemoryTree files = Crowd({"/dev"}, {"/opt/secret", "/dev/null"});
  const InstalledDomain domain = Domain({Object("config", "read")});
  const std::vector<LabelledPath> places = {{"/opt", "config"}, {"/opt/secret", "secret"}};
  PathPlan plan = PlanPaths(domain, places, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/opt", Landlock::kReadFile}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/secret", MaskKind::kHidden}));
  for (const FileKind other : {FileKind::kNothing, FileKind::kFile}) {
    files.kinds["/dev/null"] = other;
    plan = PlanPaths(domain, places, files);
    EXPECT_THAT(plan.rights, IsEmpty());
    EXPECT_THAT(plan.masks, IsEmpty());
  }
}

TEST(PlanPaths, TellsThatNobodyRemovesWhatIsMasked) {
  MemoryTree files = Crowd({"/dev"}, {"/opt/secret", "/dev/null"});
  const PathPlan plan = PlanPaths(Domain({Path("/opt", "w"), Object("secret", "write", false),
                                          Object("secret", "truncate", false)}),
                                  {{"/opt", "config"}, {"/opt/secret", "secret"}}, files);
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/secret", MaskKind::kHidden}));
  EXPECT_EQ(HowOf(plan, 0),
            "narrowed: /opt/secret has a mount over it, so it is neither moved nor removed");
}

// Where nothing is executed it may be read, as its rules say.
TEST(PlanPaths, MountsWhatEntersAnotherDomain) {
  MemoryTree files = Crowd({}, {"/opt/other"});
  const PathPlan plan =
      PlanPaths(Domain({Path("/opt", "rx"),
                        RuleOf(RuleKind::kDomainTransition, {"gate", "otherDom", "exec"})}),
                {{"/opt/other", "gate"}}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", Landlock::kReadDir},
                          PathRight{"/opt", Landlock::kReadFile | Landlock::kExecute}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/other", MaskKind::kNoExec}));
}

TEST(PlanPaths, LetsNobodyMakeWhatAMissingPathRefusesInACrowd) {
  MemoryTree files = Crowd({}, {});
  const PathPlan plan =
      PlanPaths(Domain({Path("/opt", "rw"), Path("/opt/private", "")}), {}, files);
  EXPECT_THAT(plan.rights, IsEmpty());
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

// Or it would be made anew.
TEST(PlanPaths, LetsNobodyMoveTheWayToAPathThatIsMasked) {
  MemoryTree files = Crowd({"/opt/way", "/opt/way/private"}, {});
  const PathPlan plan =
      PlanPaths(Domain({Path("/opt", "rw"), Path("/opt/way/private", "")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/opt", (kReading | kWriting) & ~Landlock::kRemoveDir}));
  EXPECT_THAT(plan.masks, ElementsAre(Mask{"/opt/way/private", MaskKind::kHidden}));
}

TEST(PlanPaths, LaysNoMoreMasksThanSome) {
  MemoryTree files = Crowd({}, {});
  std::vector<LabelledPath> places = {{"/opt", "config"}};
  for (std::size_t count = 0; count < Enforce::kMostMasks; ++count) {
    places.push_back({"/opt/d" + std::to_string(count), "secret"});
    files.kinds[places.back().path] = FileKind::kDirectory;
  }
  const InstalledDomain domain = Domain({Object("config", "read")});
  EXPECT_THAT(PlanPaths(domain, places, files).masks, SizeIs(Enforce::kMostMasks));
  places.push_back({"/opt/last", "secret"});
  files.kinds["/opt/last"] = FileKind::kDirectory;
  const PathPlan plan = PlanPaths(domain, places, files);
  EXPECT_THAT(plan.masks, IsEmpty());
  EXPECT_THAT(plan.rights, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), kTooMany);
}

// ---- What is missing, and labels

TEST(PlanPaths, LetsNobodyMakeWhatAMissingPathRefuses) {
  MemoryTree files = Files({"/srv", "/srv/a"}, {"/srv/f"});
  const PathPlan plan =
      PlanPaths(Domain({Path("/srv", "rw"), Path("/srv/private", "")}), {}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/srv/a", kReading | kWriting, true},
                          PathRight{"/srv/f", (kReading | kWriting) & Landlock::kOfFiles, true}));
}

TEST(PlanPaths, TellsOfAPathThatIsNotThere) {
  MemoryTree files;
  const PathPlan plan = PlanPaths(Domain({Path("/srv", "r")}), {}, files);
  EXPECT_THAT(plan.rights, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0), "narrowed: there is nothing at /srv, or only a link");
}

TEST(PlanPaths, GivesWhatLabelsHave) {
  MemoryTree files = Files({"/etc", "/etc/ssh"}, {"/etc/ssh/key", "/etc/hosts"});
  const std::vector<LabelledPath> places = {
      {"/", "unlabeled"}, {"/etc", "config"}, {"/etc/ssh/key", "key"}};
  const PathPlan plan =
      PlanPaths(Domain({Object("config", "read"), Object("key", "read"), Object("config", "list")}),
                places, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/etc", kReading}));
}

TEST(PlanPaths, TakesADirectoryApartAroundALabelThatHasLess) {
  MemoryTree files = Files({"/etc", "/etc/ssh"}, {"/etc/ssh/key", "/etc/ssh/known", "/etc/hosts"});
  const std::vector<LabelledPath> places = {{"/etc", "config"}, {"/etc/ssh/key", "key"}};
  const PathPlan plan = PlanPaths(Domain({Object("config", "read")}), places, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/etc/hosts", Landlock::kReadFile, true},
                                       PathRight{"/etc/ssh/known", Landlock::kReadFile, true}));
}

TEST(PlanPaths, MakesWhatTheLabelOfADirectoryGrants) {
  MemoryTree files = Files({"/spool"}, {});
  const std::vector<LabelledPath> places = {{"/spool", "spool"}};
  const PathPlan plan =
      PlanPaths(Domain({RuleOf(RuleKind::kFileCreation, {"spool", "mail", "fifo"}),
                        RuleOf(RuleKind::kFileCreation, {"spool", "mail", "regular"}),
                        RuleOf(RuleKind::kFileCreation, {"spool", "spool", "symlink"}, false)}),
                places, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/spool",
                                    Landlock::kMakeFifo | Landlock::kMakeReg | Landlock::kRefer}));
}

TEST(PlanPaths, TellsThatNoNewLabelIsGiven) {
  MemoryTree files = Files({"/spool"}, {});
  const PathPlan plan =
      PlanPaths(Domain({RuleOf(RuleKind::kFileCreation, {"spool", "mail", "regular"}),
                        RuleOf(RuleKind::kFileCreation, {"spool", "spool", "fifo"}),
                        RuleOf(RuleKind::kFileCreation, {"spool", "mail", "symlink"}, false)}),
                {{"/spool", "spool"}}, files);
  EXPECT_EQ(HowOf(plan, 0),
            "narrowed: what is made has the label of its directory, as the kernel gives none");
  EXPECT_EQ(HowOf(plan, 1), "enforced");
  EXPECT_EQ(HowOf(plan, 2), "enforced");
}

TEST(PlanPaths, MakesNoDeviceByAPath) {
  MemoryTree files = Files({"/dev"}, {});
  const PathPlan plan = PlanPaths(
      Domain({Path("/dev", "w"), RuleOf(RuleKind::kFileCreation, {"dev", "dev", "char_device"})}),
      {{"/dev", "dev"}}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/dev", kWriting | Landlock::kMakeChar}));
}

TEST(PlanPaths, TellsKindsOfSocketsApartByWhatCanBeMadeAtAll) {
  MemoryTree files = Files({"/run"}, {});
  const Rule stream = RuleOf(RuleKind::kUnixSocketCreation, {"run", "stream"});
  PathPlan plan = PlanPaths(Domain({stream}), {{"/run", "run"}}, files);
  EXPECT_THAT(plan.rights, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0),
            "narrowed: kinds of unix sockets are not told apart: it takes socket_type rules that "
            "grant no other kind");
  plan = PlanPaths(Domain({stream, RuleOf(RuleKind::kParameterCheck, {"socket_type", "1"})}),
                   {{"/run", "run"}}, files);
  EXPECT_THAT(plan.rights, ElementsAre(PathRight{"/run", Landlock::kMakeSock}));
  EXPECT_EQ(HowOf(plan, 0), "enforced");
}

TEST(PlanPaths, NeedsReadToExecute) {
  MemoryTree files = Files({"/bin"}, {});
  const PathPlan plan = PlanPaths(Domain({Path("/bin", "x")}), {}, files);
  EXPECT_THAT(plan.rights, IsEmpty());
  EXPECT_EQ(HowOf(plan, 0),
            "notExpressible: the kernel reads a program to execute it, and this one may not be "
            "read");
}

TEST(PlanPaths, NeitherReadsNorExecutesWhatEntersAnotherDomain) {
  MemoryTree files = Files({"/bin"}, {"/bin/other", "/bin/tool"});
  const PathPlan plan =
      PlanPaths(Domain({Path("/bin", "rx"),
                        RuleOf(RuleKind::kDomainTransition, {"gate", "otherDom", "exec"})}),
                {{"/bin/other", "gate"}}, files);
  EXPECT_THAT(plan.rights,
              ElementsAre(PathRight{"/bin", Landlock::kReadDir},
                          PathRight{"/bin/tool", Landlock::kReadFile | Landlock::kExecute, true}));
  EXPECT_EQ(HowOf(plan, 1), "narrowed: only by \"secpolicy exec\"");
}

TEST(PlanPaths, EndsAtSomeNumberOfRights) {
  MemoryTree files;
  std::vector<Rule> rules;
  for (std::size_t count = 0; count <= Enforce::kMostPathRights; ++count) {
    rules.push_back(Path("/" + std::to_string(count), "r"));
    files.kinds[rules.back().words[0]] = FileKind::kFile;
  }
  const PathPlan plan = PlanPaths(Domain(rules), {}, files);
  EXPECT_EQ(plan.rights.size(), Enforce::kMostPathRights);
  EXPECT_EQ(std::ranges::count(plan.fates, Fate::kNarrowed, &Enforce::RuleFate::fate), 1);
}

// ---- Random trees, held against the decision

class Chance {
 public:
  explicit Chance(unsigned int seed) : engine(seed) {}
  std::size_t Below(std::size_t end) { return engine() % end; }
  template <class List>
  const auto& Of(const List& list) {
    return list[Below(list.size())];
  }

 private:
  std::mt19937 engine;
};

struct World {
  MemoryTree files;
  std::map<std::string, std::string> labels;  // of every file
  std::vector<LabelledPath> places;
  InstalledDomain domain;
};

const std::vector<std::string> kLabels = {"one", "two", "three"};

void AddEntries(World& world, const std::string& directory, int depth, Chance& chance) {
  const std::size_t count = 1 + chance.Below(4);
  for (std::size_t index = 0; index < count; ++index) {
    const std::string path = (directory == "/" ? "" : directory) + "/" + "abcd"[index];
    const bool isDirectory = depth < 4 && chance.Below(2) == 0;
    world.files.kinds[path] = isDirectory            ? FileKind::kDirectory
                              : chance.Below(4) == 0 ? FileKind::kSpecial
                                                     : FileKind::kFile;
    world.labels[path] =
        chance.Below(4) == 0 ? chance.Of(kLabels) : world.labels[MemoryTree::ParentOf(path)];
    if (isDirectory && chance.Below(3) == 0) world.files.crowded.insert(path);
    if (isDirectory) AddEntries(world, path, depth + 1, chance);
  }
}

Rule RandomRule(const World& world, Chance& chance) {
  std::vector<std::string> paths = {"/e", "/a/new", "/a/b/new"};
  for (const auto& [path, kind] : world.files.kinds) paths.push_back(path);
  const std::vector<const char*> accesses = {"read", "write",  "execute",
                                             "list", "remove", "truncate"};
  const std::vector<const char*> letters = {"", "r", "w", "rw", "rx", "rwx", "rw", "x"};
  const std::vector<const char*> kinds = {"regular", "directory", "symlink", "fifo", "char_device"};
  const bool grant = chance.Below(4) != 0;
  switch (chance.Below(6)) {
    case 0:
    case 1:
      return Path(chance.Of(paths), chance.Of(letters));
    case 2:
    case 3:
      return Object(chance.Of(kLabels).c_str(), chance.Of(accesses), grant);
    case 4:
      return RuleOf(RuleKind::kFileCreation,
                    {chance.Of(kLabels), chance.Of(kLabels), chance.Of(kinds)}, grant);
    default:
      return RuleOf(RuleKind::kDomainTransition, {chance.Of(kLabels), "otherDom", "exec"}, grant);
  }
}

World RandomWorld(unsigned int seed) {
  Chance chance(seed);
  World world;
  world.labels["/"] = chance.Of(kLabels);
  if (chance.Below(3) == 0) world.files.crowded.insert("/");
  if (chance.Below(2) == 0) world.files.kinds["/dev/null"] = FileKind::kSpecial;
  AddEntries(world, "/", 0, chance);
  for (const auto& [path, label] : world.labels) {
    const bool isPlace = path == "/" || world.labels[MemoryTree::ParentOf(path)] != label;
    if (isPlace) world.places.push_back({path, label});
  }
  std::map<decltype(Rule::words), Rule> rules;
  for (std::size_t count = chance.Below(8); count > 0; --count) {
    Rule rule = RandomRule(world, chance);
    auto subject = rule.words;
    if (rule.kind == RuleKind::kFilePath) subject[1] = "path";
    rules[subject] = std::move(rule);
  }
  for (auto& [subject, rule] : rules) world.domain.rules.push_back(std::move(rule));
  world.domain.name = "testDom";
  return world;
}

bool IsAtOrBelow(const std::string& path, const std::string& above) {
  return path == above || path.starts_with(above == "/" ? above : above + "/");
}

// A mask is also an entry that nobody can remove.
bool IsTakenByMask(const PathPlan& plan, const std::string& path, std::uint64_t right) {
  constexpr std::uint64_t kRemoving = Landlock::kRemoveFile | Landlock::kRemoveDir;
  return std::ranges::any_of(plan.masks, [&](const Mask& mask) {
    if (!IsAtOrBelow(path, mask.path)) return false;
    if (mask.kind == MaskKind::kHidden || right == Landlock::kExecute) return true;
    return mask.path == path && (right & kRemoving) != 0;
  });
}

// `path` is what is acted on, `place` where the kernel asks for the right.
bool IsGiven(const PathPlan& plan, const std::string& path, std::string place,
             std::uint64_t right) {
  if (IsTakenByMask(plan, path, right)) return false;
  for (;; place = MemoryTree::ParentOf(place)) {
    for (const PathRight& given : plan.rights) {
      if (given.path == place && (given.rights & right) != 0) return true;
    }
    if (place == "/") return false;
  }
}

bool IsTold(const PathPlan& plan, const Policy::Decision& decision) {
  return std::ranges::any_of(decision.votes, [&](const Policy::Vote& vote) {
    return std::ranges::any_of(plan.fates, [&](const Enforce::RuleFate& fate) {
      return fate.rule.Text() == vote.rule.Text() && fate.fate != Fate::kEnforced;
    });
  });
}

class RandomPaths {
 public:
  explicit RandomPaths(unsigned int number)
      : seed(number),
        world(RandomWorld(number)),
        plan(PlanPaths(world.domain, world.places, world.files)) {}

  void Check() {
    for (const auto& [path, label] : world.labels) CheckFile(path, label);
  }

  std::size_t Kept() const { return kept; }
  std::size_t Masks() const { return plan.masks.size(); }

 private:
  void CheckFile(const std::string& path, const std::string& label) {
    const bool isDirectory = world.files.kinds[path] == FileKind::kDirectory;
    const auto ask = [&](FileAccess access, std::uint64_t right) {
      Compare(Policy::FileQuestion{.access = access, .path = path, .label = label}, path, path,
              right);
    };
    if (path != "/") {
      CheckRemoval(path, label, isDirectory ? Landlock::kRemoveDir : Landlock::kRemoveFile);
    }
    if (!isDirectory) {
      ask(FileAccess::kRead, Landlock::kReadFile);
      ask(FileAccess::kWrite, Landlock::kWriteFile);
      ask(FileAccess::kExecute, Landlock::kExecute);
      ask(FileAccess::kTruncate, Landlock::kTruncate);
      return;
    }
    ask(FileAccess::kList, Landlock::kReadDir);
    for (const char* name : {"new", "e", "z"}) {
      const std::string made = (path == "/" ? "" : path) + "/" + name;
      for (const auto& [what, right] :
           {std::pair("regular", Landlock::kMakeReg), std::pair("directory", Landlock::kMakeDir),
            std::pair("symlink", Landlock::kMakeSym), std::pair("fifo", Landlock::kMakeFifo),
            std::pair("char_device", Landlock::kMakeChar)}) {
        Compare(Policy::CreationQuestion{.what = what, .path = made, .directoryLabel = label}, path,
                path, right);
      }
    }
  }

  // The directory above has to have the right as well. Where its rules do not grant it, that is
  // told of no rule.
  void CheckRemoval(const std::string& path, const std::string& label, std::uint64_t right) {
    const std::string above = MemoryTree::ParentOf(path);
    const auto question = [](const std::string& of, const std::string& itsLabel) {
      return Policy::FileQuestion{.access = FileAccess::kRemove, .path = of, .label = itsLabel};
    };
    const bool isGiven = IsGiven(plan, path, above, right);
    const auto ofAbove = Decide(question(above, world.labels.at(above)), world.domain);
    if (!isGiven && (!ofAbove.granted || IsTold(plan, ofAbove))) return;
    Compare(question(path, label), path, above, right);
  }

  void Compare(const Policy::Question& question, const std::string& path, const std::string& place,
               std::uint64_t right) {
    const Policy::Decision decision = Decide(question, world.domain);
    const bool isGiven = IsGiven(plan, path, place, right);
    if (isGiven == decision.granted) {
      kept += isGiven ? 1 : 0;
      return;
    }
    EXPECT_FALSE(isGiven) << "seed " << seed << ": " << path << " has right " << right
                          << " that no rule grants";
    EXPECT_TRUE(IsTold(plan, decision))
        << "seed " << seed << ": " << path << " lost right " << right;
  }

  const unsigned int seed;
  World world;
  const PathPlan plan;
  std::size_t kept = 0;
};

TEST(PlanPaths, GivesNothingThatTheDecisionRefuses) {
  std::size_t kept = 0;
  std::size_t masks = 0;
  for (unsigned int seed = 0; seed < 2000 && !HasFailure(); ++seed) {
    RandomPaths paths(seed);
    paths.Check();
    kept += paths.Kept();
    masks += paths.Masks();
  }
  EXPECT_GT(kept, 20'000U);
  EXPECT_GT(masks, 200U);
}

}  // namespace
}  // namespace EnforceTest
