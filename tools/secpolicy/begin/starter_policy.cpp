#include "begin/starter_policy.h"

#include <string_view>

namespace SecPolicyCli {
namespace {

constexpr char kObjects[] =
    R"(# The labels that things may carry, one on each line. A label says what a thing is; the rules of
# domains say who may do what with it.

policyFile   # the files of this policy
)";

constexpr char kFileLabels[] =
    R"(# Which files carry which label: a path and a label. "/*" behind a directory means all that is in
# it. Of several lines about a file, the last one counts.

/etc/zorvan/*   policyFile
)";

constexpr char kHostDom[] =
    R"(# The domain "hostDom", in which every process starts. The name of the file is that of the domain.
# A process leaves it by a program whose label a "-d" rule names:
#
#   -d  label of the program   domain   exec   grant or revoke
#
# The kinds of rules are explained in secpolicy(5); "secpolicy words" lists what may stand in them.

-s @start   grant   # what every program needs between its start and its end
-s @file    grant
-s @io      grant
-s @process grant
-s @signal  grant

-a policyFile read  grant
-a policyFile write grant

-r /etc   r
)";

constexpr char kEarlyHostDom[] =
    R"(# Early in a boot only this directory's domains are loaded, with all objects and file labels.

-s @start grant
)";

constexpr char kGlobalVmDom[] =
    R"(# "globalVMDom" is for virtual machines. Every host needs this domain. Without rules, nothing may be
# done in it.
)";

constexpr char kIoFilterDom[] =
    R"(# "ioFilterDom" is for programs that filter input and output. Every host needs this domain. Without
# rules, nothing may be done in it.
)";

constexpr char kAppDom[] =
    R"(# "appDom" is for programs of tardisks that bring no policy of their own. Every host needs this
# domain. Without rules, nothing may be done in it.
)";

constexpr char kDaemonFrameworkDom[] =
    R"(# "daemonFrameworkDom" is for what starts and stops the services of the host. Every host needs this
# domain. Without rules, nothing may be done in it.
)";

constexpr std::string_view kName = "NAME";
constexpr char kDomain[] =
    R"(# The domain "NAME": say here what runs in it.
#
# A process comes here by a rule in the domain that it comes from, such as hostDom:
#   -d LABEL NAME exec grant
# What a program needs:      secpolicy observe NAME -- PROGRAM
# What may be done here:     secpolicy why NAME read /etc/hostname

-s @start grant   # what every program needs between its start and its end
)";

constexpr StarterFile kFiles[] = {
    {"objects/base", kObjects},
    {"fileLabels/base", kFileLabels},
    {"domains/hostDom", kHostDom},
    {"domains/globalVMDom", kGlobalVmDom},
    {"domains/ioFilterDom", kIoFilterDom},
    {"domains/appDom", kAppDom},
    {"domains/daemonFrameworkDom", kDaemonFrameworkDom},
    {"early/domains/hostDom", kEarlyHostDom},
};

}  // namespace

std::span<const StarterFile> StarterFiles() { return kFiles; }

std::string StarterDomain(const std::string& name) {
  std::string text = kDomain;
  for (std::size_t at = text.find(kName); at != std::string::npos; at = text.find(kName, at)) {
    text.replace(at, kName.size(), name);
    at += name.size();
  }
  return text;
}

}  // namespace SecPolicyCli
