// The corpus's host when it is the scripted one.

#include "corpus_host.h"
#include "support/scripted_host.h"

namespace CorpusTest {

class CorpusHost::Impl {
 public:
  explicit Impl(const Words& words) {
    host.strict = true;
    unsigned int nextLabel = 2;
    for (const std::string& label : words.labels) host.DeclareLabel(label, nextLabel++);
    for (const std::string& domain : words.domains) {
      if (domain != "hostDom") host.DeclareDomain(domain);
    }
    for (const auto& [kind, table] : words.keywords) {
      for (const std::string& word : table) host.keywords[kind].emplace(word, 0);
    }
    host.tardiskLaunchDomains = words.launchDomains;
    host.defaultTardiskName = words.tardisk;
  }

  SecPolicyTest::ScriptedHost host;
};

CorpusHost::CorpusHost(const Words& words) : impl(std::make_unique<Impl>(words)) {}
CorpusHost::~CorpusHost() = default;

}  // namespace CorpusTest
