// The contract tests' host when it is the Linux host.

#include "contract_host.h"
#include "host/linux/files/security_attribute.h"
#include "linux/state_directory.h"

namespace HostContractTest {

class ContractHost::Impl {
 public:
  Impl() : file(state.Path() + "/labelled") {
    state.Write("labelled", "");
    LinuxHost::GiveFirstLabel(file.c_str(), LinuxHost::LabelAttribute());
  }

  LinuxHostTest::StateDirectory state;
  std::string file;
};

ContractHost::ContractHost() : impl(std::make_unique<Impl>()) {}
ContractHost::~ContractHost() = default;

const std::string& ContractHost::LabelledFile() const { return impl->file; }

}  // namespace HostContractTest
