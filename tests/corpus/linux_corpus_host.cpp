// The corpus's host when it is the Linux host.

#include "corpus_host.h"
#include "host/linux/state_directory.h"

namespace CorpusTest {

// The keywords are the host's own; labels and domains are made.
class CorpusHost::Impl {
 public:
  explicit Impl(const Words& words) {
    TeskCtl::Security::TeskAccessInterfaceImpl access;
    access.AddLabels(words.labels, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
    for (const std::string& domain : words.domains) {
      if (domain == "hostDom") continue;
      access.CreateDomain(domain, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
    }
  }

 private:
  LinuxHostTest::StateDirectory state;
};

CorpusHost::CorpusHost(const Words& words) : impl(std::make_unique<Impl>(words)) {}
CorpusHost::~CorpusHost() = default;

}  // namespace CorpusTest
