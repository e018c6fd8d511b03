// Unix sockets, by the module: hunts for one that is given a path, or reached, where no rule grants
// it.

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"
#include "vm/module_fixture.h"
#include "vm/unix_sockets.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using Enforce::FileDescriptor;

const Enforce::LabelNumbers kLabels = {{"red", 100}, {"blue", 101}};
const std::string kTree = "/tmp/sockets";

const std::string kNameAlone("\0secpolicy-test", 15);

int BindOnce(int type, const std::string& name) {
  const int error = BindUnix(OpenUnix(type), name);
  if (error == 0) unlink(name.c_str());
  return error;
}

class ModuleUnixTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->Publish({}, 1);
    fs::remove_all(kTree);
    for (const char* const name : {"red", "blue", "plain"}) {
      fs::create_directories(kTree + "/" + name);
      const auto number = kLabels.find(name);
      if (number == kLabels.end()) continue;
      const std::uint32_t label = number->second;
      ASSERT_EQ(
          setxattr((kTree + "/" + name).c_str(), "security.bpf.zorvan", &label, sizeof(label), 0),
          0);
    }
    module->LearnLabels();
  }

  void Grant(const std::vector<std::string>& rules) {
    ModulePlan plan = PlanModule({NumberedStrictly(rules)}, CAP_LAST_CAP, kLabels);
    plan[0].rules.capabilities = kAll;
    module->Publish(plan, 2);
  }

  // What was made may not be removed in the domain.
  void ExpectGranted(const Act& act) {
    EXPECT_EQ(In(kDomain, act), 0);
    for (const char* const name : {"red", "plain"}) fs::remove(kTree + "/" + name + "/made");
  }
};

TEST_F(ModuleUnixTest, GivesPathsToSocketsOfGrantedKindsAlone) {
  const std::pair<const char*, int> kinds[] = {
      {"stream", SOCK_STREAM}, {"dgram", SOCK_DGRAM}, {"seqpacket", SOCK_SEQPACKET}};
  for (const auto& [word, granted] : kinds) {
    Grant({std::string("-u red ") + word + " grant"});
    for (const int type : kUnixTypes) {
      SCOPED_TRACE(std::string(word) + " " + std::to_string(type));
      const Act inRed = [type] { return BindOnce(type, kTree + "/red/made"); };
      if (type == granted) {
        ExpectGranted(inRed);
      } else {
        ExpectRefused(inRed);
      }
      ExpectRefused([type] { return BindOnce(type, kTree + "/blue/made"); });
    }
    // Of no kind, as it is nobody's.
    ExpectRefused([] {
      const std::string path = kTree + "/red/made";
      const int error = ErrorOf(mknod(path.c_str(), S_IFSOCK | 0600, 0));
      unlink(path.c_str());
      return error;
    });
  }
}

TEST_F(ModuleUnixTest, GivesPathsByRulesForThem) {
  Grant({"-r /tmp/sockets/plain w", "-r /tmp/sockets/red r", "-u red stream grant"});
  for (const int type : kUnixTypes) {
    ExpectGranted([type] { return BindOnce(type, kTree + "/plain/made"); });
    ExpectRefused([type] { return BindOnce(type, kTree + "/red/made"); });
  }
  ExpectGranted([] { return BindOnce(SOCK_STREAM, kNameAlone); });
}

TEST_F(ModuleUnixTest, ReachesSocketsWhoseFilesItMayWrite) {
  for (const int type : kUnixTypes) {
    SCOPED_TRACE(type);
    for (const char* const name : {"red", "blue", "plain"}) fs::remove(kTree + "/" + name + "/s");
    const FileDescriptor red = ServeUnix(type, kTree + "/red/s");
    const FileDescriptor blue = ServeUnix(type, kTree + "/blue/s");
    const FileDescriptor plain = ServeUnix(type, kTree + "/plain/s");
    Grant({"-a red write grant", "-a blue read grant"});
    ExpectGranted([type] { return ConnectUnix(type, kTree + "/red/s"); });
    ExpectRefused([type] { return ConnectUnix(type, kTree + "/blue/s"); });
    Grant({"-r /tmp/sockets/plain w", "-r /tmp/sockets/red r", "-a red write grant"});
    ExpectGranted([type] { return ConnectUnix(type, kTree + "/plain/s"); });
    ExpectRefused([type] { return ConnectUnix(type, kTree + "/red/s"); });
  }
}

TEST_F(ModuleUnixTest, SendsToSocketsWhoseFilesItMayWrite) {
  const FileDescriptor red = ServeUnix(SOCK_DGRAM, kTree + "/red/s");
  const FileDescriptor blue = ServeUnix(SOCK_DGRAM, kTree + "/blue/s");
  Grant({"-a red write grant"});
  ExpectGranted([] { return SendUnix(kTree + "/red/s"); });
  ExpectRefused([] { return SendUnix(kTree + "/blue/s"); });
}

TEST_F(ModuleUnixTest, ReachesNamesAloneWithinTheDomain) {
  Grant({});
  for (const int type : kUnixTypes) {
    SCOPED_TRACE(type);
    const FileDescriptor outside = ServeUnix(type, kNameAlone);
    ExpectRefused([type] { return ConnectUnix(type, kNameAlone); });
    if (type == SOCK_DGRAM) ExpectRefused([] { return SendUnix(kNameAlone); });
    ExpectGranted([type] {
      const std::string own("\0secpolicy-own", 14);
      const FileDescriptor inside = ServeUnix(type, own);
      return ConnectUnix(type, own);
    });
  }
}

TEST_F(ModuleUnixTest, SendsByPairs) {
  Grant({});
  for (const int type : kUnixTypes) {
    int pair[2];
    ASSERT_EQ(socketpair(AF_UNIX, type | SOCK_CLOEXEC, 0, pair), 0);
    const FileDescriptor one(pair[0]);
    const FileDescriptor other(pair[1]);
    ExpectGranted([&one] { return ErrorOf(send(one.Number(), "x", 1, MSG_DONTWAIT)); });
    ExpectGranted([type] {
      int own[2];
      if (socketpair(AF_UNIX, type | SOCK_CLOEXEC, 0, own) != 0) return errno;
      return ErrorOf(send(own[0], "x", 1, MSG_DONTWAIT));
    });
  }
}

}  // namespace
}  // namespace EnforceTest
