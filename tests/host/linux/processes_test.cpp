// Several processes on one state, and processes that end in the middle of their work.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <list>
#include <random>
#include <set>
#include <stdexcept>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "state_directory.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;
using TeskCtl::Security::TeskAccessInterfaceImpl;

// What a load does, with `domains` domains of `rules` rules each.
void Load(int domains, int rules) {
  TeskAccessInterfaceImpl access;
  std::vector<std::string> labels;
  for (int label = 0; label < rules; ++label) labels.push_back("label" + std::to_string(label));
  access.AddLabels(labels, TESKACCESS_LABEL_OBJECT);
  for (int domain = 0; domain < domains; ++domain) {
    const std::string name = "dom" + std::to_string(domain);
    unsigned int id = 0;
    if (!access.FindDomain(name, &id)) id = access.CreateDomain(name, TESKACCESS_DEFAULT_DOM_NONE);
    for (int rule = 0; rule < rules; ++rule) {
      access.SetObjectAccessRule({static_cast<unsigned int>(rule), id, name,
                                  labels.at(static_cast<std::size_t>(rule)), "read", true});
    }
  }
}

std::size_t CountRules(unsigned int id) {
  TeskAccessInterfaceImpl access;
  std::list<TeskAccess_ObjectAccessRule> rules;
  access.GetObjectAccessRules(id, rules);
  return rules.size();
}

void ExpectIntact() {
  auto rows = HostState::Current().Database().Select("PRAGMA integrity_check");
  ASSERT_TRUE(rows.Next());
  EXPECT_EQ(rows.Text(0), "ok");
}

void ExpectLoaded(int domains, int rules) {
  ExpectIntact();
  HostState& state = HostState::Current();
  state.Refresh();
  std::set<unsigned int> ids;
  for (int domain = 0; domain < domains; ++domain) {
    const auto& found = state.Domains().Get("dom" + std::to_string(domain));
    EXPECT_EQ(CountRules(found.id), static_cast<std::size_t>(rules));
    ids.insert(found.id);
  }
  EXPECT_EQ(ids.size(), static_cast<std::size_t>(domains));
  EXPECT_EQ(state.Labels().All().size(), static_cast<std::size_t>(rules) + 2);
}

class Processes : public ::testing::Test {
 protected:
  StateDirectory directory;
};

TEST_F(Processes, LoadAtTheSameTimeAndEndRight) {
  for (const int loaders : {2, 4}) {
    std::list<ChildProcess> children;
    for (int loader = 0; loader < loaders; ++loader) children.emplace_back([] { Load(8, 60); });
    for (auto& child : children) EXPECT_EQ(child.Wait(), "");
    ExpectLoaded(8, 60);
  }
}

TEST_F(Processes, NeverGetTheSameSlot) {
  std::list<ChildProcess> children;
  for (int child = 0; child < 4; ++child) {
    children.emplace_back([child] {
      TeskAccessInterfaceImpl access;
      for (int number = 0; number < 50; ++number) {
        access.CreateDomain("c" + std::to_string(child) + "n" + std::to_string(number),
                            TESKACCESS_DEFAULT_DOM_NONE);
      }
    });
  }
  for (auto& child : children) EXPECT_EQ(child.Wait(), "");
  TeskAccessInterfaceImpl access;
  std::set<unsigned int> ids;
  for (int child = 0; child < 4; ++child) {
    for (int number = 0; number < 50; ++number) {
      unsigned int id = 0;
      EXPECT_TRUE(
          access.FindDomain("c" + std::to_string(child) + "n" + std::to_string(number), &id));
      ids.insert(id);
    }
  }
  EXPECT_EQ(ids.size(), 200U);
}

TEST_F(Processes, MayBeKilledAtAnyTime) {
  std::mt19937 random(7);
  for (int round = 0; round < 20; ++round) {
    ChildProcess loader([] {
      for (;;) Load(5, 40);
    });
    usleep(static_cast<useconds_t>(random() % 20'000));
    loader.Kill();
    ASSERT_EQ(loader.Wait(), "killed");
    ExpectIntact();
  }
  Load(5, 40);
  ExpectLoaded(5, 40);
}

TEST_F(Processes, LeaveAllThatTheyDidWhenTheyAreKilled) {
  ChildProcess loader([] {
    Load(3, 30);
    for (;;) pause();
  });
  TeskAccessInterfaceImpl access;
  unsigned int id = 0;
  while (!access.FindDomain("dom2", &id) || CountRules(id) < 30) usleep(1000);
  loader.Kill();
  EXPECT_EQ(loader.Wait(), "killed");
  ExpectLoaded(3, 30);
}

TEST_F(Processes, SeeABatchWholeOrNotAtAll) {
  constexpr unsigned int kBatch = 50;
  const unsigned int id =
      TeskAccessInterfaceImpl().CreateDomain("owner", TESKACCESS_DEFAULT_DOM_NONE);
  ChildProcess writer([id] {
    TeskAccessInterfaceImpl access;
    for (unsigned int batch = 0; batch < 40; ++batch) {
      std::list<TeskAccess_FilePathAccessRule> rules;
      for (unsigned int rule = 0; rule < kBatch; ++rule) {
        rules.push_back({rule, id, "owner", "/" + std::to_string(batch * kBatch + rule), "r"});
      }
      access.SetFilePathAccessRules(rules);
    }
  });
  TeskAccessInterfaceImpl access;
  std::size_t seen = 0;
  while (seen < 40 * kBatch) {
    std::list<TeskAccess_FilePathAccessRule> rules;
    access.GetFilePathAccessRules(id, rules);
    ASSERT_EQ(rules.size() % kBatch, 0U);
    ASSERT_GE(rules.size(), seen);
    seen = rules.size();
  }
  EXPECT_EQ(writer.Wait(), "");
}

TEST_F(Processes, SeeEachOthersLabelsAtOnce) {
  TeskAccessInterfaceImpl access;
  for (int round = 0; round < 20; ++round) {
    const std::string name = "label" + std::to_string(round);
    EXPECT_EQ(access.LookupLabel(name, TESKACCESS_LABEL_OBJECT), 1U);
    ASSERT_EQ(
        RunInChild([&] { TeskAccessInterfaceImpl().AddLabels({name}, TESKACCESS_LABEL_OBJECT); }),
        "");
    EXPECT_GT(access.LookupLabel(name, TESKACCESS_LABEL_OBJECT), 1U);
  }
}

}  // namespace
}  // namespace LinuxHostTest
