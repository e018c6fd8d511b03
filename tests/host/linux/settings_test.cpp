// Stored options and levels: kind and value come back, the absent is told from the empty, and
// files are for their owner.

#include "host/linux/operation/settings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <limits>
#include <memory>

#include "braxo/adv/advanced_option.h"
#include "orinconfigstore/config_store.h"
#include "scratch_root.h"
#include "teskctl/adv.h"

namespace LinuxHostTest {
namespace {

using Braxo::Adv::AdvancedIntegerOption;
using Braxo::Adv::AdvancedOption;
using LinuxHost::OptionValue;
using OrinConfigStore::ConfigStoreObjectId;
using OrinConfigStore::FLAG_NONE;
using OrinConfigStore::GetDesiredUserConfig;

class Settings : public ScratchRootTest {
 protected:
  std::filesystem::path Database() const { return scratch.Directory() / "config/config.db"; }
};

// The option as the library sees it.
std::string Seen(const std::string& path) {
  const std::unique_ptr<AdvancedOption> option(TeskCtl::Adv::AdvancedOptionImpl::FindOption(path));
  if (!option) return "none";
  const auto* integer = dynamic_cast<const AdvancedIntegerOption*>(option.get());
  return integer == nullptr ? "no integer" : std::to_string(integer->GetValue());
}

ConfigStoreObjectId DomainSettings(const std::string& domain) {
  return {"domain_settings", "security", "orin", domain};
}

TEST(ParseOptionValue, TakesDecimalIntegers) {
  EXPECT_EQ(LinuxHost::ParseOptionValue("0"), OptionValue(0L));
  EXPECT_EQ(LinuxHost::ParseOptionValue("-12"), OptionValue(-12L));
  EXPECT_EQ(LinuxHost::ParseOptionValue("9223372036854775807"),
            OptionValue(std::numeric_limits<long>::max()));
}

TEST(ParseOptionValue, TakesAllElseAsText) {
  for (const std::string text :
       {"", "yes", "1x", " 1", "1 ", "0x10", "+1", "9223372036854775808"}) {
    EXPECT_EQ(LinuxHost::ParseOptionValue(text), OptionValue(text)) << text;
  }
}

TEST_F(Settings, ReadingCreatesNothing) {
  EXPECT_EQ(
      Run([] {
        return Seen("/UserVars/Any") +
               (LinuxHost::FindWantedEnforcement("appDom") ? " stored" : " none") +
               (GetDesiredUserConfig(DomainSettings("appDom"), FLAG_NONE) ? " object" : " none") +
               (LinuxHost::WasEnforcementApplied("appDom") ? " applied" : " not applied");
      }),
      "none none none not applied");
  EXPECT_FALSE(std::filesystem::exists(Database().parent_path()));
}

TEST_F(Settings, OptionKeepsItsKindAndValue) {
  Run([] {
    LinuxHost::StoreWantedOption("/UserVars/Number", -7L);
    LinuxHost::StoreWantedOption("/UserVars/Text", std::string("7"));
    return "";
  });
  EXPECT_EQ(Run([] { return Seen("/UserVars/Number"); }), "-7");
  EXPECT_EQ(Run([] { return Seen("/UserVars/Text"); }), "no integer");
  EXPECT_EQ(Run([] { return Seen("/UserVars/number"); }), "none");
}

TEST_F(Settings, OptionsAreListedWithTheirKinds) {
  EXPECT_EQ(Run([] {
              LinuxHost::StoreWantedOption("/UserVars/Number", 0L);
              LinuxHost::StoreWantedOption("/UserVars/Text", std::string("7"));
              const std::map<std::string, OptionValue> expected = {
                  {"/UserVars/Number", 0L}, {"/UserVars/Text", std::string("7")}};
              return LinuxHost::ListWantedOptions() == expected ? "as stored" : "otherwise";
            }),
            "as stored");
}

// A later version of this program has to know the file again, and others what it is.
TEST_F(Settings, AreInAFileOfTheirKind) {
  Run([] {
    LinuxHost::StoreWantedOption("/UserVars/Any", 1L);
    return "";
  });
  EXPECT_THAT(Content(Database()) + Content(Database().string() + "-wal"),
              testing::HasSubstr("ZOCF"));
}

TEST_F(Settings, LaterValueReplacesEarlier) {
  EXPECT_EQ(Run([] {
              LinuxHost::StoreWantedOption("/UserVars/Any", std::string("text"));
              const std::string before = Seen("/UserVars/Any");
              LinuxHost::StoreWantedOption("/UserVars/Any", 1L);
              return before + " " + Seen("/UserVars/Any");
            }),
            "no integer 1");
}

TEST_F(Settings, RefusesOptionWithoutLeadingSlash) {
  EXPECT_EQ(Run([] {
              LinuxHost::StoreWantedOption("UserVars/Any", 1L);
              return "stored";
            }),
            "The path of an advanced option begins with \"/\": UserVars/Any");
}

TEST_F(Settings, EnforcementIsFoundByTheLibrary) {
  Run([] {
    LinuxHost::StoreWantedEnforcement("appDom", "Permissive");
    return "";
  });
  EXPECT_EQ(Run([] {
              std::string value = "as before";
              GetDesiredUserConfig(DomainSettings("appDom"), FLAG_NONE)
                  ->GetValue("enforcement_level", &value);
              return value + " " + *LinuxHost::FindWantedEnforcement("appDom");
            }),
            "permissive permissive");
}

TEST_F(Settings, RefusesUnknownLevel) {
  EXPECT_EQ(Run([] {
              LinuxHost::StoreWantedEnforcement("appDom", "strict");
              return "stored";
            }),
            "Unknown enforcement level strict: use enforcing, permissive or disabled");
  EXPECT_FALSE(std::filesystem::exists(Database()));
}

TEST_F(Settings, AbsentKeyLeavesTheValue) {
  EXPECT_EQ(
      Run([]() -> std::string {
        LinuxHost::StoreWantedEnforcement("appDom", "permissive");
        std::string value = "as before";
        const bool found =
            GetDesiredUserConfig(DomainSettings("appDom"), FLAG_NONE)->GetValue("other", &value);
        return value + (found ? " found" : " none");
      }),
      "as before none");
}

TEST_F(Settings, ObjectIsNamedByAllComponents) {
  EXPECT_EQ(Run([]() -> std::string {
              LinuxHost::StoreWantedEnforcement("appDom", "permissive");
              std::string found;
              for (const auto& id :
                   {ConfigStoreObjectId("domain_settings", "security", "orin", "appDom"),
                    ConfigStoreObjectId("other", "security", "orin", "appDom"),
                    ConfigStoreObjectId("domain_settings", "other", "orin", "appDom"),
                    ConfigStoreObjectId("domain_settings", "security", "other", "appDom"),
                    ConfigStoreObjectId("domain_settings", "security", "orin", "other")}) {
                found += GetDesiredUserConfig(id, FLAG_NONE) ? "1" : "0";
              }
              return found;
            }),
            "10000");
}

TEST_F(Settings, BootStatusIsKept) {
  EXPECT_EQ(Run([] {
              std::string told = LinuxHost::WasEnforcementApplied("appDom") ? "1" : "0";
              OrinConfigStore::SetBootStatus(DomainSettings("appDom"), true);
              told += LinuxHost::WasEnforcementApplied("appDom") ? "1" : "0";
              told += LinuxHost::WasEnforcementApplied("otherDom") ? "1" : "0";
              OrinConfigStore::SetBootStatus(DomainSettings("appDom"), false);
              return told + (LinuxHost::WasEnforcementApplied("appDom") ? "1" : "0");
            }),
            "0100");
}

TEST_F(Settings, AreForTheirOwnerOnly) {
  Run([] {
    LinuxHost::StoreWantedOption("/UserVars/Any", 1L);
    return "";
  });
  struct stat status {};
  ASSERT_EQ(stat(Database().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFREG | 0600U);
}

TEST_F(Settings, LieUnderVarLib) {
  if (!MayChangeRoot()) GTEST_SKIP() << "the root directory cannot be changed here";
  EXPECT_EQ(scratch.RunInside([] {
    LinuxHost::StoreWantedOption("/UserVars/Any", 1L);
    return Seen("/UserVars/Any");
  }),
            "1");
  EXPECT_TRUE(std::filesystem::exists(scratch.Root() / "var/lib/secpolicy/config.db"));
}

TEST_F(Settings, RefusesWhatIsNoDatabase) {
  std::filesystem::create_directory(Database().parent_path());
  scratch.Write("../config/config.db", std::string(8192, 'x'));
  EXPECT_EQ(Run([] { return Seen("/UserVars/Any"); }),
            "Unable to use the configuration " + Database().string() +
                ": it is damaged or no such thing (file is not a database). Move the file away "
                "and store the wanted settings again");
  EXPECT_EQ(Content(Database()), std::string(8192, 'x'));
}

}  // namespace
}  // namespace LinuxHostTest
