// Numbers of labels over boots: a name has the one that it has ever had, and none is given to two
// names, whatever became of the state and of the settings.

#include "host/linux/operation/label_numbers.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <set>

#include "child_process.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/state/config_database.h"
#include "host/linux/state/host_state.h"
#include "scratch_root.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::ConfigDatabase;
using LinuxHost::HostState;

// The state and the settings of a host of its own, each of which may go.
class NumbersOfLabels : public ScratchRootTest {
 protected:
  void EndBoot() { std::filesystem::remove_all(scratch.Directory() / "state"); }
  void LoseSettings() { std::filesystem::remove_all(scratch.Directory() / "config"); }

  void DamageSettings() {
    LoseSettings();
    std::filesystem::create_directory(scratch.Directory() / "config");
    scratch.Write("../config/config.db", "no database");
  }

  // Adds labels, and tells the numbers of all but those that are built in.
  std::string Add(const std::vector<std::string>& names) {
    return Run([&] {
      HostState::Current().Labels().Add(names);
      return Numbers();
    });
  }

  std::string Remove(const std::string& name) {
    return Run([&] {
      HostState::Current().Labels().Remove({name});
      return Numbers();
    });
  }

  std::string TakeOver() {
    return Run([] { return LinuxHost::TakeOverLabelNumbers(); });
  }

  static std::string Numbers() {
    HostState& state = HostState::Current();
    state.Refresh();
    std::string text;
    for (const auto& [name, number] : state.Labels().All()) {
      if (state.Labels().IsPredefined(name)) continue;
      text += (text.empty() ? "" : " ") + name + "=" + std::to_string(number);
    }
    return text;
  }
};

TEST_F(NumbersOfLabels, AreTheSameAfterABoot) {
  EXPECT_EQ(Add({"a", "b"}), "a=4 b=5");
  EXPECT_EQ(Remove("b"), "a=4");
  EXPECT_EQ(Add({"c"}), "a=4 c=6");
  EndBoot();
  EXPECT_EQ(Add({"d"}), "d=7");
  EXPECT_EQ(Add({"c", "b", "a"}), "a=4 b=5 c=6 d=7");
}

TEST_F(NumbersOfLabels, AreTheSameForALabelThatComesBack) {
  Add({"a", "b"});
  Remove("a");
  EXPECT_EQ(Add({"c", "a"}), "a=4 b=5 c=6");
}

TEST_F(NumbersOfLabels, GoOnWhenOnlyTheStateIsReset) {
  Add({"a", "b"});
  Run([] {
    HostState::Current().Reset();
    return "";
  });
  EXPECT_EQ(Add({"c", "b"}), "b=5 c=6");
}

TEST_F(NumbersOfLabels, AreAboveThoseInUseWhenTheSettingsAreLost) {
  Add({"a", "b", "c"});
  Remove("c");
  LoseSettings();
  EXPECT_EQ(Add({"d"}), "a=4 b=5 d=7");
  EndBoot();
  EXPECT_EQ(Add({"d", "b", "a", "e"}), "a=4 b=5 d=7 e=8");
}

TEST_F(NumbersOfLabels, AreAboveThoseOfTheBootBeforeWhenTheSettingsAreLost) {
  Add({"a", "b"});
  LoseSettings();
  Run([] {
    HostState::Current().Reset();
    return "";
  });
  EXPECT_EQ(Add({"c"}), "c=6");
}

TEST_F(NumbersOfLabels, AreTakenOverBySettingsThatWereLost) {
  Add({"a", "b", "c"});
  Remove("c");
  EXPECT_EQ(TakeOver(), "");
  LoseSettings();
  EXPECT_EQ(TakeOver(), (scratch.Directory() / "config/config.db").string() +
                            " did not know the numbers of the labels in use, so they were written "
                            "into it again; new ones begin above 6");
  EXPECT_EQ(TakeOver(), "");
  EndBoot();
  EXPECT_EQ(Add({"c", "b", "a"}), "a=4 b=5 c=7");
}

TEST_F(NumbersOfLabels, AreNotTakenOverWhereThereAreNone) {
  EXPECT_EQ(TakeOver(), "");
  EXPECT_EQ(Add({}), "");
  EXPECT_EQ(TakeOver(), "");
  EXPECT_FALSE(std::filesystem::exists(scratch.Directory() / "config"));
}

TEST_F(NumbersOfLabels, AreRefusedByDamagedSettings) {
  Add({"a"});
  DamageSettings();
  const std::string refused =
      "Unable to use the configuration " + (scratch.Directory() / "config/config.db").string() +
      ": it is damaged or no such thing (file is not a database). Move the file away and store the "
      "wanted settings again";
  EXPECT_EQ(Add({"b"}), refused);
  EXPECT_EQ(TakeOver(), refused);
  EXPECT_EQ(Run([] { return Numbers(); }), "a=4");
  // What is there needs no new number.
  EXPECT_EQ(Add({"a"}), "a=4");
}

TEST_F(NumbersOfLabels, AreRefusedWhereTheyCannotBeKept) {
  Add({"a"});
  LoseSettings();
  scratch.Write("../config", "a file in place of the directory");
  EXPECT_EQ(Add({"b"}), "Refusing the configuration: " + (scratch.Directory() / "config").string() +
                            " is not a directory");
  EXPECT_EQ(Add({"a"}), "a=4");
}

TEST_F(NumbersOfLabels, AreNotThoseOfOthersInSettingsOfAnotherHost) {
  Add({"other", "a"});
  EndBoot();
  std::filesystem::rename(scratch.Directory() / "config", scratch.Directory() / "foreign");
  Add({"a"});
  LoseSettings();
  std::filesystem::rename(scratch.Directory() / "foreign", scratch.Directory() / "config");
  EXPECT_EQ(Add({"other"}), "a=4 other=6");
  EndBoot();
  EXPECT_EQ(Add({"a", "other"}), "a=5 other=6");
}

TEST_F(NumbersOfLabels, StayWithAStateThatIsNotTheHosts) {
  EXPECT_EQ(Run([this] {
              const LinuxHost::UsedState used((scratch.Directory() / "other/host.db").string());
              HostState::Current().Labels().Add({"a"});
              return Numbers();
            }),
            "a=4");
  EXPECT_FALSE(std::filesystem::exists(scratch.Directory() / "config"));
}

TEST_F(NumbersOfLabels, AreKeptInSettingsThatAreUsedBesideAState) {
  const std::string settings = (scratch.Directory() / "own/config.db").string();
  EXPECT_EQ(Run([&] {
              const LinuxHost::UsedState used((scratch.Directory() / "other/host.db").string());
              const LinuxHost::UsedSettings usedSettings(settings);
              HostState::Current().Labels().Add({"a"});
              return std::to_string(ConfigDatabase::Current().HighestLabelNumber());
            }),
            "4");
  EXPECT_FALSE(std::filesystem::exists(scratch.Directory() / "config"));
}

// Several states at the same time, as of a host and of roots that share its settings.
TEST_F(NumbersOfLabels, AreDifferentWhoeverAsksAtTheSameTime) {
  constexpr int kProcesses = 4;
  constexpr int kLabels = 25;
  const auto name = [](int process, int label) {
    return "of" + std::to_string(process) + "." + std::to_string(label);
  };
  const std::string numbers = Run([&] {
    std::vector<std::unique_ptr<ChildProcess>> children;
    for (int process = 0; process < kProcesses; ++process) {
      children.push_back(std::make_unique<ChildProcess>([&, process] {
        for (int label = 0; label < kLabels; ++label) {
          HostState::Current().Labels().Add({name(process, label), "shared" + name(0, label)});
        }
      }));
    }
    std::string failures;
    for (const auto& child : children) failures += child->Wait();
    if (!failures.empty()) return failures;
    std::set<long> distinct;
    for (const auto& [label, number] : HostState::Current().Labels().All()) distinct.insert(number);
    const std::string before = Numbers();
    HostState::Current().Reset();
    for (int process = kProcesses; process-- > 0;) {
      for (int label = kLabels; label-- > 0;) {
        HostState::Current().Labels().Add({"shared" + name(0, label), name(process, label)});
      }
    }
    return std::to_string(distinct.size()) + (Numbers() == before ? " same" : " different");
  });
  EXPECT_EQ(numbers, std::to_string(2 + kLabels + kProcesses * kLabels) + " same");
}

}  // namespace
}  // namespace LinuxHostTest
