// A service that confines a job: it makes a domain for it, says what the job may do, looks at what
// is installed, and removes the domain when the job is over.
//
//   c++ -std=c++20 runtime.cpp $(pkg-config --cflags --libs secpolicy) -o runtime

#include <unistd.h>

#include <iostream>
#include <vector>

#include "secpolicy/secpolicy.h"
#include "secpolicyhost/mode_param.h"
#include "secpolicyhost/values.h"

namespace {

// The policies may change between the two calls; then the library asks for another try.
std::vector<SecPolicy::TeskAccess_FileRule> ReadFilePolicies(unsigned int domain) {
  for (;;) {
    std::vector<SecPolicy::TeskAccess_FileRule> rules(
        SecPolicy::RetrieveNumberOfFilePolicies(domain));
    try {
      SecPolicy::RetrieveFilePolicies(domain, rules.data(),
                                      static_cast<unsigned int>(rules.size()));
      return rules;
    } catch (const SecPolicy::SecPolicyRetryException&) {
    }
  }
}

}  // namespace

int main() {
  try {
    std::cout << "This service runs in "
              << SecPolicy::GetDomainNameForID(SecPolicy::GetDomainIDForWorld(getpid())) << '\n';

    const unsigned int job =
        SecPolicy::CreateDomain("job7", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
    SecPolicy::TeskAccess_FileRule allowed[] = {
        {"/srv/jobs/7", LinuxHost::kPermitRead | LinuxHost::kPermitWrite},
        {"/usr/bin/convert", LinuxHost::kPermitRead | LinuxHost::kPermitExecute}};
    unsigned int result = 0;
    SecPolicy::AddFilePolicyBatch(0, job, allowed, 2, &result);
    for (const SecPolicy::TeskAccess_FileRule& rule : ReadFilePolicies(job)) {
      std::cout << SecPolicy::GetDomainNameForID(job) << ": " << rule.path << " 0x" << std::hex
                << rule.permission << std::dec << '\n';
    }

    // It may bind port 80 and no other, which takes the capability and the check.
    const TeskCtl::Security::TeskAccess_ModeParam webPort{80, 80};
    SecPolicy::SetCapRule(job, LinuxHost::kCapNetBindService, 1);
    SecPolicy::SetParamCheckRule(job, LinuxHost::kCheckBindPort, &webPort, 1);

    TeskCtl::Security::TeskAccessInterfaceImpl access;
    SecPolicy::DisplayDomainPolicy(access, job);
    SecPolicy::DestroyDomain(job);
  } catch (const Braxo::Lib::BraxoException& failure) {
    std::cerr << failure.what() << '\n';
    return 1;
  }
}
