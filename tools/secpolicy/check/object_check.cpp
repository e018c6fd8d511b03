#include "check_run.h"
#include "secpolicy/observed/policy_lines.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

void Declare(CheckRun& run, const SourceFile& file, unsigned int line, const std::string& name) {
  const auto [object, isNew] = run.objects.emplace(name, Place{&file, line});
  if (isNew) return;
  const auto& [declaredIn, declaredAt] = object->second;
  run.diagnostics.Add(file.AtWord(Codes::kDuplicateObject, line, 0,
                                  "'" + name + "' is declared in line " +
                                      std::to_string(declaredAt) + " of " + declaredIn->Path() +
                                      " already"));
}

void ReadObjects(CheckRun& run, const SourceFile& file, std::vector<std::string>& names) {
  for (const auto& [line, words] : file.Lines()) {
    try {
      names.push_back(SecPolicy::ReadObjectLine(file.Path(), line, file.TokensOf(line)));
      Declare(run, file, line, names.back());
    } catch (const SecPolicy::LineFailure& failure) {
      run.diagnostics.Add(file.AtWords(CodeOf(*failure.problem.fault), line, 1, words.size() - 1,
                                       failure.problem.reason,
                                       "write each name on a line of its own"));
    }
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
  std::vector<std::string> objects;
  for (const NamedFile& named : OpenPolicyFiles(run, dir)) ReadObjects(run, *named.file, objects);
  // As a load brings the kernel's objects into line with the policy's, but without a report.
  run.access.RemoveLabels(
      SecPolicy::GetObsoleteLabels(objects, run.access.GetKeywordsMap(TESKACCESS_KEYWORD_LABEL),
                                   TESKACCESS_LABEL_OBJECT, run.access),
      TESKACCESS_LABEL_OBJECT);
  AddNames(run, objects);
}

}  // namespace SecPolicyCli
