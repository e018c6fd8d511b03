#include "boot_plan.h"

#include <sys/stat.h>

#include <ostream>
#include <string>
#include <vector>

#include "json.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::BootPlan;
using LinuxHost::PlannedFile;

enum class Effect { kAdd, kReplace, kKeep };

// A directory that is there is kept, and so is in a way what is replaced by its like.
Effect EffectOf(const PlannedFile& file) {
  if (file.present == 0) return Effect::kAdd;
  return file.differs ? Effect::kReplace : Effect::kKeep;
}

const char* WordFor(mode_t type) {
  if (S_ISDIR(type)) return "directory";
  if (S_ISLNK(type)) return "link";
  return S_ISFIFO(type) ? "fifo" : "file";
}

std::size_t CountKept(const BootPlan& plan) {
  std::size_t count = 0;
  for (const auto& [path, file] : plan.files) {
    if (EffectOf(file) == Effect::kKeep && !S_ISDIR(file.type)) ++count;
  }
  return count;
}

// The files that `isWanted` picks, each with its tardisk.
template <class Choice>
std::vector<std::string> Pick(const BootPlan& plan, Choice isWanted) {
  std::vector<std::string> lines;
  for (const auto& [path, file] : plan.files) {
    if (isWanted(file)) lines.push_back(path + " (" + file.tardisk + ")");
  }
  return lines;
}

}  // namespace

void WriteBootPlanText(const BootPlan& plan, std::size_t maximum, std::ostream& output) {
  const auto added = Pick(plan, [](const auto& file) { return EffectOf(file) == Effect::kAdd; });
  const auto replaced = Pick(
      plan, [](const auto& file) { return EffectOf(file) == Effect::kReplace && !file.isEdited; });
  const auto edited = Pick(plan, [](const auto& file) { return file.isEdited; });
  WriteSection("files to add", added, maximum, output);
  WriteSection("files to replace", replaced, maximum, output);
  WriteSection("edited files to replace", edited, maximum, output);
  output << "files to unpack again as they are: " << CountKept(plan) << '\n'
         << "files to get their first label: " << plan.labelCount << '\n';
}

void WriteBootPlanJson(const BootPlan& plan, std::ostream& output) {
  Json added = Json::Array();
  Json replaced = Json::Array();
  for (const auto& [path, file] : plan.files) {
    Json entry = {{"path", path}, {"tardisk", file.tardisk}, {"type", WordFor(file.type)}};
    if (EffectOf(file) == Effect::kAdd) added.Append(entry);
    if (EffectOf(file) != Effect::kReplace) continue;
    entry["edited"] = file.isEdited;
    replaced.Append(entry);
  }
  const Json document = {
      {"schema", "secpolicy.boot-plan/1"},
      {"tardisks", plan.tardisks},
      {"add", added},
      {"replace", replaced},
      {"unchanged", CountKept(plan)},
      {"firstLabels", plan.labelCount},
  };
  output << document.Text();
}

}  // namespace SecPolicyCli
