#include "check_run.h"
#include "secpolicy/labels/object_policy.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

void ReadObjects(CheckRun& run, const SourceFile& file, SecPolicy::ObjectPolicy& policy) {
  const std::size_t first = policy.names.size();
  const std::vector<unsigned int> lines = ParseEveryLine(
      file, run.scratch.ScratchFile(), [&](const std::string& path) { policy.ParsePolicy(path); },
      [&] { return policy.names.size(); },
      [&](unsigned int line, const std::string& message) {
        const std::size_t last = file.Lines().at(line).size() - 1;
        run.diagnostics.Add(file.AtWords(CodeOfRefusal(message), line, 1, last, message,
                                         "write each name on a line of its own"));
      });
  for (std::size_t i = 0; i < lines.size(); ++i) {
    const auto [object, isNew] =
        run.objects.emplace(policy.names[first + i], Place{&file, lines[i]});
    if (isNew) continue;
    const auto& [declaredIn, declaredAt] = object->second;
    run.diagnostics.Add(file.AtWord(Codes::kDuplicateObject, lines[i], 0,
                                    "'" + object->first + "' is declared in line " +
                                        std::to_string(declaredAt) + " of " + declaredIn->Path() +
                                        " already"));
  }
}

// The host takes all names or none. When it refuses them, the ones to blame are looked for.
void AddNames(CheckRun& run, const std::vector<std::string>& names) {
  try {
    run.access.AddLabels(names, TESKACCESS_LABEL_OBJECT);
    return;
  } catch (const BraxoException&) {
  }
  for (const auto& [name, place] : run.objects) {
    try {
      run.access.AddLabels({name}, TESKACCESS_LABEL_OBJECT);
    } catch (const BraxoException& refusal) {
      run.diagnostics.Add(place.file->AtWord(Codes::kBadName, place.line, 0, refusal.what()));
    }
  }
}

}  // namespace

void CheckObjects(CheckRun& run, const std::string& dir) {
  SecPolicy::ObjectPolicy policy;
  for (const NamedFile& named : OpenPolicyFiles(run, dir)) ReadObjects(run, *named.file, policy);
  // As a load brings the kernel's objects into line with the policy's, but without a report.
  run.access.RemoveLabels(SecPolicy::GetObsoleteLabels(
                              policy.names, run.access.GetKeywordsMap(TESKACCESS_KEYWORD_LABEL),
                              TESKACCESS_LABEL_OBJECT, run.access),
                          TESKACCESS_LABEL_OBJECT);
  AddNames(run, policy.names);
}

}  // namespace SecPolicyCli
