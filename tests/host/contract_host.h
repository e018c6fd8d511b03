#pragma once

#include <memory>
#include <string>

namespace HostContractTest {

// The host that the contract tests are linked with, in the state that a boot leaves it in. There is
// one implementation for each host.
class ContractHost {
 public:
  ContractHost();
  ContractHost(const ContractHost&) = delete;
  ContractHost& operator=(const ContractHost&) = delete;
  ~ContractHost();

  // The path of a regular file that carries a label.
  const std::string& LabelledFile() const;

 private:
  class Impl;
  std::unique_ptr<Impl> impl;
};

}  // namespace HostContractTest
