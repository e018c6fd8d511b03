#pragma once

#include <string>
#include <vector>

#include "support/fixed_roots.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {

// A small host on which everything works: a policy under /policy, an early policy under /early, and
// what always comes from the fixed roots. Each also has files in places that are not to be read.
class GoodRoots : public FixedRoots {
 public:
  GoodRoots();
};

// Brings a host on good roots into its first state, and into the one that a first load leaves.
void ScriptGoodHost(ScriptedHost& host);
void LoadOnce(ScriptedHost& host);

struct GoodHost {
  GoodHost() { ScriptGoodHost(host); }

  ScriptedHost host;
  GoodRoots roots;
};

// What the trace shows for one message, each line ended.
std::string Informed(const std::string& message);
std::string Reported(const std::string& message);
std::string Printed(const std::string& line);
std::string PrintedHeader(const std::string& title, const std::string& subtitle);

std::string WithoutLines(const std::string& text, const std::string& start);
std::string WithoutLastLine(const std::string& text);
std::string FirstLines(const std::string& text, std::size_t count);
std::vector<std::string> SplitLines(const std::string& text);

// The transcript of a load, by its steps.
struct LoadSections {
  std::string begin;
  std::string objects;
  std::string templateDomain;
  std::string domains;
  std::string partners;
  std::string wellKnown;
  std::string tardisks;
  std::string fileLabels;
  std::string end;

  std::string Text() const { return UpToPartners() + wellKnown + tardisks + fileLabels + end; }
  std::string UpToPartners() const { return begin + objects + templateDomain + domains + partners; }
};

// LoadPolicy("/policy") of the good host, on a fresh kernel and after LoadOnce.
extern const LoadSections kFirstLoad;
extern const LoadSections kNextLoad;

// LoadPolicyEarly("/early") of the good host; it has fewer steps.
extern const LoadSections kEarlyLoad;

// DisplayPolicy of the good host after LoadOnce, with "base.tgz" as the only tardisk.
std::string DisplayedDomains();
std::string DisplayedDomain(unsigned int id);
std::string DisplayedObjects();
std::string DisplayedTardisks();

// The destruction of the interface object, the last thing of every entry point.
extern const std::string kDone;
// How a load ends in which something failed.
extern const std::string kFailed;

}  // namespace SecPolicyTest
