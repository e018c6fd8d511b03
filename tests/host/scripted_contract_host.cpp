// The contract tests' host when it is the scripted one.

#include "contract_host.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace HostContractTest {
namespace {

using TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY;
using TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS;
using TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION;
using TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS;
using TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK;
using TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL;
using TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION;

std::map<std::string, long> Table(std::initializer_list<const char*> words) {
  std::map<std::string, long> table;
  for (const char* word : words) table.emplace(word, static_cast<long>(table.size()));
  return table;
}

}  // namespace

class ContractHost::Impl {
 public:
  Impl() : tree({{"labelled", ""}}), file(tree / "labelled") {
    host.strict = true;
    host.keywords[TESKACCESS_KEYWORD_CAPABILITY] = Table({"cap_chown", "cap_kill"});
    host.keywords[TESKACCESS_KEYWORD_PARAM_CHECK] = Table({"socket_family", "bind_port"});
    host.keywords[TESKACCESS_KEYWORD_OBJECT_ACCESS] = Table({"read", "write"});
    host.keywords[TESKACCESS_KEYWORD_DOM_TRANS] = Table({"exec", "tardisk_exec", "enter"});
    host.keywords[TESKACCESS_KEYWORD_FILE_CREATION] = Table({"regular", "fifo"});
    host.keywords[TESKACCESS_KEYWORD_UNIX_SOCK_CREATION] = Table({"stream", "dgram"});
    host.keywords[TESKACCESS_KEYWORD_SYSCALL] = Table({"read", "openat"});
  }

  SecPolicyTest::ScriptedHost host;
  SecPolicyTest::PolicyTree tree;
  std::string file;
};

ContractHost::ContractHost() : impl(std::make_unique<Impl>()) {}
ContractHost::~ContractHost() = default;

const std::string& ContractHost::LabelledFile() const { return impl->file; }

}  // namespace HostContractTest
