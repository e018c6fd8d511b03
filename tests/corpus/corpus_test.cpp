// Every input of the corpus, read by the library: what is accepted, record by record, and what is
// refused, with the whole error. Runs on each host.

#include <gtest/gtest.h>

#include <algorithm>
#include <iostream>
#include <sstream>

#include "case.h"
#include "corpus_host.h"
#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/labels/object_policy.h"
#include "support/message_of.h"

namespace CorpusTest {
namespace {

using SecPolicy::DomainPolicy;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using Row = std::vector<std::string>;
using Rows = std::vector<Row>;

Row TokensOf(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) {
  if (rule.permissions.empty()) return {rule.path};
  return {rule.path, rule.permissions};
}

Row WithGrant(Row tokens, bool grant) {
  tokens.emplace_back(grant ? "grant" : "revoke");
  return tokens;
}

Row TokensOf(const TeskCtl::Security::TeskAccess_SyscallRule& rule) {
  return WithGrant({rule.syscall}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_CapabilityRule& rule) {
  return WithGrant({rule.capability}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_CapabilityParamRule& rule) {
  if (rule.secondParam.empty()) return WithGrant({rule.paramCheck, rule.firstParam}, rule.grant);
  return WithGrant({rule.paramCheck, rule.firstParam, rule.secondParam}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_ObjectAccessRule& rule) {
  return WithGrant({rule.label, rule.accessKind}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_DomTransRule& rule) {
  TeskAccessInterfaceImpl access;
  unsigned int id = 0;
  EXPECT_TRUE(access.FindDomain(rule.targetDomain, &id));
  EXPECT_EQ(rule.targetDomainId, id);
  return WithGrant({rule.label, rule.targetDomain, rule.transitionKind}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_FileCreationRule& rule) {
  return WithGrant({rule.label, rule.secondLabel, rule.creationKind}, rule.grant);
}

Row TokensOf(const TeskCtl::Security::TeskAccess_UnixSockCreationRule& rule) {
  return WithGrant({rule.label, rule.sockKind}, rule.grant);
}

template <class Rules>
void AddRows(const DomainPolicy& policy, const std::string& keyword, Rows& rows) {
  for (const auto& rule : dynamic_cast<const Rules&>(*policy.ruleSets.at(keyword)).rules) {
    EXPECT_EQ(rule.domainName, policy.name);
    EXPECT_EQ(rule.domainId, policy.id);
    Row row = {std::to_string(rule.line), keyword};
    const Row tokens = TokensOf(rule);
    row.insert(row.end(), tokens.begin(), tokens.end());
    rows.push_back(row);
  }
}

// The rules of a policy by line.
Rows RulesOf(const DomainPolicy& policy) {
  Rows rows;
  AddRows<SecPolicy::ObjectAccessRules>(policy, "-a", rows);
  AddRows<SecPolicy::CapabilityRules>(policy, "-c", rows);
  AddRows<SecPolicy::DomTransRules>(policy, "-d", rows);
  AddRows<SecPolicy::FileCreationRules>(policy, "-f", rows);
  AddRows<SecPolicy::CapabilityParamRules>(policy, "-p", rows);
  AddRows<SecPolicy::FilePathAccessRules>(policy, "-r", rows);
  AddRows<SecPolicy::SyscallRules>(policy, "-s", rows);
  AddRows<SecPolicy::UnixSockCreationRules>(policy, "-u", rows);
  std::sort(rows.begin(), rows.end(), [](const Row& one, const Row& other) {
    return std::stoi(one[0]) < std::stoi(other[0]);
  });
  return rows;
}

std::string PrintedText(DomainPolicy& policy) {
  const std::ostringstream text;
  std::streambuf* const before = std::cout.rdbuf(text.rdbuf());
  policy.PrintPolicy();
  std::cout.rdbuf(before);
  return text.str();
}

// The rules as they are to be printed: kind by kind in byte order, each with two empty lines.
std::string ExpectedText(const Rows& rules) {
  std::string text;
  for (const char* keyword : {"-a", "-c", "-d", "-f", "-p", "-r", "-s", "-u"}) {
    std::string block;
    for (const Row& rule : rules) {
      if (rule[1] != keyword) continue;
      block += keyword;
      for (std::size_t index = 2; index < rule.size(); ++index) block += " " + rule[index];
      // A path without permissions is followed by its blank.
      block += rule[1] == "-r" && rule.size() == 3 ? " \n" : "\n";
    }
    if (!block.empty()) text += block + "\n\n";
  }
  return text + "\n";
}

class Corpus : public testing::Test {
 protected:
  const Words words = ReadWords();
  const CorpusHost host{words};
  TeskAccessInterfaceImpl access;
};

TEST_F(Corpus, Lexical) {
  for (const Case& input : ReadCases("lexical")) {
    SCOPED_TRACE(input.Name());
    std::map<unsigned int, std::queue<std::string>> parsed;
    SecPolicy::ParseFile(WriteInput(input), parsed);
    Rows lines;
    for (auto& [number, tokens] : parsed) {
      lines.push_back({std::to_string(number)});
      for (; !tokens.empty(); tokens.pop()) lines.back().push_back(tokens.front());
    }
    EXPECT_EQ(lines, input.Rows("lines"));
  }
}

TEST_F(Corpus, Domains) {
  unsigned int id = 0;
  ASSERT_TRUE(access.FindDomain(words.domain, &id));
  for (const Case& input : ReadCases("domains")) {
    SCOPED_TRACE(input.Name());
    DomainPolicy policy(words.domain, id);
    policy.policyFile = WriteInput(input);
    EXPECT_EQ(MessageOf([&] { policy.ParsePolicy(access); }),
              input.Error("error", policy.policyFile));
    EXPECT_EQ(RulesOf(policy), input.Rows("rules"));
    EXPECT_EQ(PrintedText(policy), ExpectedText(input.Rows("rules")));
  }
}

TEST_F(Corpus, Objects) {
  for (const Case& input : ReadCases("objects")) {
    SCOPED_TRACE(input.Name());
    SecPolicy::ObjectPolicy policy;
    const std::string& file = WriteInput(input);
    EXPECT_EQ(MessageOf([&] { policy.ParsePolicy(file); }), input.Error("error", file));
    EXPECT_EQ(policy.names, input.Texts("names"));
  }
}

TEST_F(Corpus, FileLabels) {
  for (const Case& input : ReadCases("file_labels")) {
    SCOPED_TRACE(input.Name());
    SecPolicy::FileLabelPolicy policy;
    const std::string& file = WriteInput(input);
    EXPECT_EQ(MessageOf([&] { policy.ParsePolicy(file, access); }), input.Error("error", file));
    Rows labels;
    for (const auto& label : policy.fileLabels) {
      EXPECT_EQ(label.policyFile, file);
      labels.push_back({std::to_string(label.lineNumber), label.path, label.label,
                        label.recursive ? "true" : "false"});
    }
    EXPECT_EQ(labels, input.Rows("labels"));
  }
}

TEST_F(Corpus, Permissions) {
  unsigned int id = 0;
  ASSERT_TRUE(access.FindDomain(words.domain, &id));
  for (const Case& input : ReadCases("permissions")) {
    SCOPED_TRACE(input.Name());
    const std::string letters = input.Text("letters");
    SecPolicy::FilePathAccessRules rules;
    rules.AddRule(1, words.domain, id, SecPolicy::StringToQueue("/path " + letters), access);

    unsigned int mask = 0;
    EXPECT_EQ(MessageOf([&] { mask = rules.GetPermission(letters); }), input.Text("error"));
    EXPECT_EQ(mask, input.Has("mask") ? input.Number("mask") : 0);
    EXPECT_EQ(MessageOf([&] { rules.Set(access); }), input.Text("error"));
  }
}

}  // namespace
}  // namespace CorpusTest
