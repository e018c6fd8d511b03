// The contract tests' host when it is the Linux host of a whole machine whose kernel keeps what is
// installed. What was installed there is gone, so it is for virtual machines alone.

#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <string>
#include <utility>

#include "host/contract_host.h"
#include "host/linux/common/module_library.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/state/host_state.h"
#include "support/temporary_directory.h"

namespace HostContractTest {
namespace {

using Enforce::RunningModule;

// Throws where the kernel keeps no policies, before anything is touched.
std::unique_ptr<RunningModule> RunModule() {
  auto running = LinuxHost::ModuleLibrary().find();
  return running ? std::move(running) : LinuxHost::ModuleLibrary().start();
}

}  // namespace

class ContractHost::Impl {
 public:
  Impl() : running(RunModule()), file(directory / "labelled") {
    LinuxHost::HostState::Current().Reset();
    LinuxHost::BeginPublishing(*running);
    std::ofstream(file).close();
    LinuxHost::GiveFirstLabel(file.c_str(), LinuxHost::LabelAttribute());
  }
  Impl(const Impl&) = delete;
  Impl& operator=(const Impl&) = delete;
  ~Impl() {
    EXPECT_TRUE(LinuxHost::IsPublishedTo(*running)) << "a commit that the kernel was not told of";
    EXPECT_TRUE(running->IsRefusing());
    LinuxHost::EndPublishing();
  }

  const std::unique_ptr<RunningModule> running;
  const SecPolicyTest::TemporaryDirectory directory;
  const std::string file;
};

ContractHost::ContractHost() : impl(std::make_unique<Impl>()) {}
ContractHost::~ContractHost() = default;

const std::string& ContractHost::LabelledFile() const { return impl->file; }

}  // namespace HostContractTest
