#pragma once

#include <string>
#include <vector>

#include "reply.h"

// What the verbs of the command do, for programs: each sends one answer, in the JSON that the verb
// of the same name writes, or a failure. A load has no JSON of its own.
namespace SecPolicyPython {

void Check(const std::string& path, bool fresh, const Send& send);
void Plan(const std::string& dir, bool keep, const Send& send);
void Load(const std::string& dir, bool keep, bool allOrNothing, const Send& send);
void Why(const std::string& domain, const std::vector<std::string>& words, const Send& send);
void WhoCan(const std::vector<std::string>& words, const Send& send);
void Diff(const std::string& before, const std::string& after, const Send& send);

}  // namespace SecPolicyPython
