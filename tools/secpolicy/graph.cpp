#include <algorithm>
#include <iostream>
#include <memory>
#include <string>

#include "command_line.h"
#include "ending.h"
#include "graph/graphviz.h"
#include "graph/policy_graph.h"
#include "installed/installed_policy.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

DotGraph Draw(const std::string& name, SecPolicy::TeskAccessInterfaceImpl& access) {
  const Policy::InstalledPolicy policy = ReadInstalledPolicy(access);
  if (name.empty()) return DrawDomains(policy);
  const unsigned int id = FindDomain(name, access).id;
  const auto domain = std::ranges::find(policy.domains, id, &Policy::InstalledDomain::id);
  if (domain == policy.domains.end()) RefuseDomain(name, access);
  return DrawDomain(*domain, policy);
}

ExitCode Graph(const std::string& name, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const std::string dot = Draw(name, access).Text();
  if (format == "dot") {
    std::cout << dot << std::flush;
    return kWell;
  }
  try {
    DrawSvg(dot);
  } catch (const std::runtime_error& failure) {
    return Refuse("graph", failure.what());
  }
  return kWell;
}

Action Define(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  const auto format = std::make_shared<std::string>();
  syntax
      .AddOption("--domain", *domain,
                 "Draw only this domain, by its name or its number, with all that it may reach")
      .NameValue("DOMAIN");
  syntax.AddFormat(*format, "the graph", {"dot", "svg"});
  return [=] { return Ask("graph", [=] { return Graph(*domain, *format); }); };
}

}  // namespace

const Verb kGraph = {
    "graph", "Draw the installed domains and the transitions between them",
    "Writes a graph to standard output: a box for each domain, dashed when it is permissive and\n"
    "dotted when it is disabled, and an arrow for each transition that is granted, with the "
    "object\n"
    "and the kind. With --domain, one domain and what it may reach: other domains, objects, "
    "paths,\n"
    "capabilities and the rest. 'dot' is the language of Graphviz; 'svg' is drawn by Graphviz.\n"
    "\n"
    "Examples:\n"
    "  secpolicy graph --format svg >policy.svg\n"
    "  secpolicy graph --domain sshDom --format svg >sshDom.svg\n"
    "  secpolicy graph | dot -Tpdf >policy.pdf",
    Define, KeepSystemRoot};

}  // namespace SecPolicyCli
