#include <cstring>
#include <filesystem>
#include <iostream>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "json.h"
#include "policy/limits.h"
#include "policy/permissions.h"
#include "policy/rule.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "runtime/change.h"
#include "runtime/retry.h"
#include "text/format.h"
#include "text/shell_word.h"
#include "text/visible.h"
#include "verb.h"
#include "zorvan/kernel.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccess_FileRule;
using SecPolicy::TeskAccessInterfaceImpl;

// ---- What is typed

constexpr char kNoPermissions[] = "none";

Policy::Permissions ReadPermissions(const std::string& word) {
  if (word == kNoPermissions) return {};
  try {
    const auto permissions = Policy::Permissions::Parse(word);
    if (!permissions.IsEmpty()) return permissions;
  } catch (const Braxo::Lib::BraxoException&) {
  }
  throw QuestionError("'" + word +
                      "' are no permissions: letters of \"rwx\", each at most once, or none");
}

// A path is compared as it stands, and one that no file can have would be about nothing.
void RequirePolicyPath(const std::string& path) {
  RequirePath(path);
  if (path.size() > 1 && path.ends_with('/')) {
    throw QuestionError("'" + path + "' ends in a slash, so it is the path of no file");
  }
  if (path.size() > Policy::kLongestPolicyPath) {
    throw QuestionError("the path of a file policy has at most " +
                        std::to_string(Policy::kLongestPolicyPath) + " bytes, and not " +
                        std::to_string(path.size()));
  }
}

// A path with such a name in it is the path of no file, as files are known by where they lie.
void RequireNewPolicyPath(const std::string& path) {
  RequirePolicyPath(path);
  if (path == std::filesystem::path(path).lexically_normal().native()) return;
  throw QuestionError("'" + path + "' is the path of no file: it holds '.', '..' or two slashes");
}

// 0, which stands for all processes of the domain, when none is named.
int ReadWorld(const std::string& word) { return word.empty() ? 0 : ReadProcess(word); }

std::shared_ptr<const std::string> AddWorld(Syntax& syntax) {
  const auto world = std::make_shared<std::string>();
  syntax.AddOption("--world", *world, "Only for this process, instead of for the whole domain")
      .NameValue("PID");
  return world;
}

std::shared_ptr<const std::string> AddPermissions(Syntax& syntax) {
  const auto permissions = std::make_shared<std::string>();
  syntax.AddOption("PERMISSIONS", *permissions, "Letters of \"rwx\", or none").Require();
  return permissions;
}

std::shared_ptr<const std::string> AddPath(Syntax& syntax, const char* name, const char* meaning) {
  const auto path = std::make_shared<std::string>();
  syntax.AddOption(name, *path, meaning).Require().Offer(OfferFiles());
  return path;
}

std::string ListHint(const NamedDomain& domain) {
  return Call("file-policy list " + ShellWord(domain.name)) + " lists those of " + domain.name;
}

// ---- Adding, removing and changing

TeskAccess_FileRule ToFileRule(const std::string& path, Policy::Permissions permissions) {
  TeskAccess_FileRule rule{};
  path.copy(rule.path, sizeof rule.path - 1);
  rule.permission = permissions.Bits();
  return rule;
}

// Tells of paths that lead elsewhere: what a link leads to is judged by its own path.
void TellOfLinks(const std::vector<TeskAccess_FileRule>& rules) {
  for (const TeskAccess_FileRule& rule : rules) {
    TeskAccess_FileRule resolved{};
    if (Zorvan::Kernel::RealPath(rule.path, resolved.path) != 0) continue;
    if (std::strcmp(rule.path, resolved.path) == 0) continue;
    Summarize("file-policy add", std::string(rule.path) + " leads to " + resolved.path +
                                     ", which has to be added by that path to count");
  }
}

ExitCode Add(const std::string& word, const std::string& letters,
             const std::vector<std::string>& paths, const std::string& process) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  const Policy::Permissions permissions = ReadPermissions(letters);
  const int world = ReadWorld(process);
  std::vector<TeskAccess_FileRule> rules;
  for (const std::string& path : paths) {
    RequireNewPolicyPath(path);
    rules.push_back(ToFileRule(path, permissions));
  }
  unsigned int added = 0;
  return Change("file-policy add", [&] {
    SecPolicy::AddFilePolicyBatch(world, domain.id, rules.data(),
                                  static_cast<unsigned int>(rules.size()), &added);
    TellOfLinks(rules);
  });
}

Action DefineAdd(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto permissions = AddPermissions(syntax);
  const auto paths = std::make_shared<std::vector<std::string>>();
  syntax.AddList("PATH", *paths, "The files, and the directories with all that is in them")
      .Require();
  const auto world = AddWorld(syntax);
  return [=] {
    return Ask("file-policy add", [=] { return Add(*domain, *permissions, *paths, *world); });
  };
}

ExitCode Remove(const std::string& word, const std::string& path, const std::string& process) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  const int world = ReadWorld(process);
  RequirePolicyPath(path);
  return Change(
      "file-policy remove", [&] { SecPolicy::RemoveFilePolicy(world, domain.id, path); },
      [&] {
        return ListHint(domain) + "; one that was added for a process is removed with --world";
      });
}

Action DefineRemove(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto path = AddPath(syntax, "PATH", "The path, as it was added");
  const auto world = AddWorld(syntax);
  return [=] { return Ask("file-policy remove", [=] { return Remove(*domain, *path, *world); }); };
}

ExitCode Update(const std::string& word, const std::string& letters, const std::string& path) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  const Policy::Permissions permissions = ReadPermissions(letters);
  RequirePolicyPath(path);
  return Change(
      "file-policy update",
      [&] { SecPolicy::UpdateFilePolicy(domain.id, path, permissions.Bits()); },
      [&] { return ListHint(domain); });
}

Action DefineUpdate(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto permissions = AddPermissions(syntax);
  const auto path = AddPath(syntax, "PATH", "The path, as it was added");
  return [=] {
    return Ask("file-policy update", [=] { return Update(*domain, *permissions, *path); });
  };
}

ExitCode Replace(const std::string& oldPath, const std::string& newPath) {
  RequirePolicyPath(oldPath);
  RequireNewPolicyPath(newPath);
  return Change(
      "file-policy replace", [&] { SecPolicy::ReplaceFilePolicyVMs(oldPath, newPath); },
      [] {
        return "It is about policies of single processes, which " +
               Call("file-policy add --world") + " makes";
      });
}

Action DefineReplace(Syntax& syntax) {
  const auto oldPath = AddPath(syntax, "OLD", "The path, as it was added");
  const auto newPath = AddPath(syntax, "NEW", "The path that takes its place");
  return [=] { return Ask("file-policy replace", [=] { return Replace(*oldPath, *newPath); }); };
}

// ---- Listing

// As many as there are, though others may change them between the two calls.
std::vector<TeskAccess_FileRule> ReadFilePolicies(unsigned int domainId) {
  return Retry([&] {
    std::vector<TeskAccess_FileRule> rules(SecPolicy::RetrieveNumberOfFilePolicies(domainId));
    SecPolicy::RetrieveFilePolicies(domainId, rules.data(),
                                    static_cast<unsigned int>(rules.size()));
    // There may have been fewer by then.
    std::erase_if(rules, [](const TeskAccess_FileRule& rule) { return rule.path[0] == '\0'; });
    return rules;
  });
}

Policy::Rule ToRule(const TeskAccess_FileRule& policy) {
  Policy::Rule rule = {.kind = Policy::RuleKind::kFilePath};
  rule.words[0] = policy.path;
  rule.verdict = Policy::Permissions(policy.permission);
  return rule;
}

void WriteText(const NamedDomain&, const std::vector<Policy::Rule>& rules) {
  for (const Policy::Rule& rule : rules) std::cout << Visible(rule.Text()) << '\n';
}

void WriteJson(const NamedDomain& domain, const std::vector<Policy::Rule>& rules) {
  Json list = Json::Array();
  for (const Policy::Rule& rule : rules) {
    list.Append({{"path", rule.words[0]}, {"permissions", TextOf(rule.verdict)}});
  }
  const Json document = {{"schema", "secpolicy.file-policies/1"},
                         {"domain", domain.name},
                         {"id", domain.id},
                         {"policies", list}};
  std::cout << document.Text();
}

ExitCode List(const std::string& word, const std::string& format) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  std::size_t count = 0;
  return CallLibrary(
      "file-policy list",
      [&](ErrorList&) {
        std::vector<Policy::Rule> rules;
        for (const auto& policy : ReadFilePolicies(domain.id)) rules.push_back(ToRule(policy));
        (format == "json" ? WriteJson : WriteText)(domain, rules);
        count = rules.size();
      },
      AdviseOnPrivilege,
      [&] {
        return count == 1 ? std::string("1 file policy") : std::to_string(count) + " file policies";
      });
}

Action DefineList(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("file-policy list", [=] { return List(*domain, *format); }); };
}

const Kind kAdd = {
    "add", "Add file policies to a domain, all or none",
    "Says what the domain, or one process in it, may do with files: r to read and list, w to "
    "write,\n"
    "make and remove, x to execute. One for the same path goes. A directory stands for all that "
    "is\n"
    "in it.\n"
    "\n"
    "Examples:\n"
    "  secpolicy file-policy add job7 rw /srv/jobs/7\n"
    "  secpolicy file-policy add job7 rx /usr/bin/convert /usr/lib\n"
    "  secpolicy file-policy add job7 none /srv/jobs/7/secret     nothing, in a directory of more\n"
    "  secpolicy file-policy add job7 rw --world 1234 /srv/jobs/7/1234",
    DefineAdd};

const Kind kRemove = {"remove", "Remove a file policy of a domain",
                      "A policy of the whole domain is removed without --world, and one of a "
                      "process with it. What a\n"
                      "policy file says comes back with the next load.\n"
                      "\n"
                      "Example:\n"
                      "  secpolicy file-policy remove job7 /srv/jobs/7",
                      DefineRemove};

const Kind kUpdate = {
    "update", "Give the file policies of a domain for a path other permissions",
    "Changes the policy of the whole domain and those of its processes for this very path.\n"
    "\n"
    "Example:\n"
    "  secpolicy file-policy update job7 r /srv/jobs/7",
    DefineUpdate};

const Kind kList = {
    "list", "List the file policies of a domain",
    "Prints them as policy lines, those of single processes among them: which are whose is not\n"
    "told.\n"
    "\n"
    "Examples:\n"
    "  secpolicy file-policy list job7\n"
    "  secpolicy file-policy list job7 --format json | jq -r '.policies[].path'",
    DefineList};

const Kind kReplace = {"replace", "Point file policies of single processes to another path",
                       "In all domains, what processes were given for the path OLD they then have "
                       "for NEW. Policies of\n"
                       "whole domains stay as they are.\n"
                       "\n"
                       "Example:\n"
                       "  secpolicy file-policy replace /vm/disk1 /vm/disk2",
                       DefineReplace};

Action Define(Syntax& syntax) {
  return syntax.AddKinds(std::vector<Kind>{kAdd, kRemove, kUpdate, kList, kReplace});
}

}  // namespace

const Verb kFilePolicy = {
    "file-policy", "Add, remove and list file policies of domains while the system runs",
    "What services do by the library's runtime interface. A file policy is a rule for a path, -r "
    "in\n"
    "a policy file; one of a single process is kept for services, and no program is confined by "
    "it.\n"
    "A DOMAIN is its name or its number. What is changed counts at once, and until the next boot.\n"
    "\n"
    "Examples:\n"
    "  secpolicy file-policy add job7 rw /srv/jobs/7\n"
    "  secpolicy file-policy update job7 r /srv/jobs/7\n"
    "  secpolicy file-policy list job7\n"
    "  secpolicy file-policy remove job7 /srv/jobs/7",
    Define};

}  // namespace SecPolicyCli
