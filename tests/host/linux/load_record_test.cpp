// What is kept of the latest load: all of it, of no other, and gone with a boot.

#include "host/linux/operation/load_record.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/linux/common/host_error.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using LinuxHost::LatestLoad;
using LinuxHost::LoadRecord;
using LinuxHost::RecordLoad;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class LoadRecordTest : public ::testing::Test {
 protected:
  StateDirectory directory;
};

LoadRecord FailedLoad() {
  LoadRecord record;
  record.verb = "load";
  record.directory = "/etc/zorvan/secpolicy";
  record.time = 1'700'000'000;
  record.ending = "failed";
  record.errorCount = 2;
  record.errors = {"second", "first"};
  return record;
}

TEST_F(LoadRecordTest, IsEmptyBeforeTheFirstLoad) {
  EXPECT_FALSE(LatestLoad(HostState::Current()).has_value());
}

TEST_F(LoadRecordTest, KeepsWhatItIsGiven) {
  RecordLoad(HostState::Current(), FailedLoad());
  const auto record = LatestLoad(HostState::Current());
  ASSERT_TRUE(record.has_value());
  EXPECT_EQ(record->verb, "load");
  EXPECT_EQ(record->directory, "/etc/zorvan/secpolicy");
  EXPECT_EQ(record->time, 1'700'000'000);
  EXPECT_EQ(record->ending, "failed");
  EXPECT_EQ(record->errorCount, 2U);
  EXPECT_THAT(record->errors, ElementsAre("second", "first"));
}

TEST_F(LoadRecordTest, KnowsTheLatestBundleWhateverElseWasLoaded) {
  EXPECT_EQ(LoadedBundle(HostState::Current()), "");
  LinuxHost::RecordLoadedBundle(HostState::Current(), "first");
  LinuxHost::RecordLoadedBundle(HostState::Current(), "second");
  RecordLoad(HostState::Current(), FailedLoad());
  EXPECT_EQ(LoadedBundle(HostState::Current()), "second");
  LinuxHost::RecordLoadedBundle(HostState::Current(), "");
  EXPECT_EQ(LoadedBundle(HostState::Current()), "");
}

TEST_F(LoadRecordTest, IsOfTheLatestLoadAlone) {
  RecordLoad(HostState::Current(), FailedLoad());
  LoadRecord good;
  good.verb = "load-early";
  good.ending = "done";
  RecordLoad(HostState::Current(), good);
  const auto record = LatestLoad(HostState::Current());
  ASSERT_TRUE(record.has_value());
  EXPECT_EQ(record->verb, "load-early");
  EXPECT_EQ(record->errorCount, 0U);
  EXPECT_THAT(record->errors, IsEmpty());
}

TEST_F(LoadRecordTest, KeepsTheOneBeforeWhenItCannotBeWritten) {
  RecordLoad(HostState::Current(), FailedLoad());
  HostState::Current().Database().Run(
      "CREATE TEMP TRIGGER full BEFORE INSERT ON load_error BEGIN SELECT RAISE(ABORT, 'full'); "
      "END");
  LoadRecord next = FailedLoad();
  next.verb = "load-early";
  EXPECT_THROW(RecordLoad(HostState::Current(), next), LinuxHost::HostError);
  const auto record = LatestLoad(HostState::Current());
  ASSERT_TRUE(record.has_value());
  EXPECT_EQ(record->verb, "load");
  EXPECT_THAT(record->errors, ElementsAre("second", "first"));
}

TEST_F(LoadRecordTest, KeepsTheFirstOfVeryManyErrors) {
  LoadRecord many = FailedLoad();
  many.errorCount = 1000;
  many.errors.assign(1000, "again");
  many.errors.front() = "first";
  RecordLoad(HostState::Current(), many);
  const auto record = LatestLoad(HostState::Current());
  ASSERT_TRUE(record.has_value());
  EXPECT_EQ(record->errorCount, 1000U);
  ASSERT_EQ(record->errors.size(), LinuxHost::kKeptErrors);
  EXPECT_EQ(record->errors.front(), "first");
}

TEST_F(LoadRecordTest, GoesWithABoot) {
  RecordLoad(HostState::Current(), FailedLoad());
  HostState::Current().Reset();
  EXPECT_FALSE(LatestLoad(HostState::Current()).has_value());
  RecordLoad(HostState::Current(), LoadRecord{});
  EXPECT_THAT(LatestLoad(HostState::Current())->errors, IsEmpty());
}

}  // namespace
}  // namespace LinuxHostTest
