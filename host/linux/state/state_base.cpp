#include "host/linux/state/state_base.h"

#include <unistd.h>

#include <cerrno>
#include <utility>

#include "host/linux/state/module_place.h"
#include "host/linux/state/plan_place.h"
#include "host/linux/state/schema.h"

namespace LinuxHost {
namespace {

thread_local bool hasCommittedForModule = false;

bool IsRemoved(const std::string& path) { return unlink(path.c_str()) == 0 || errno == ENOENT; }

// What the commits of a state make old.
struct MadeFromState {
  explicit MadeFromState(const std::string& state)
      : plans(CurrentPlansOf(state)),
        module(ModuleMarkOf(state)),
        published(PublishedMarkOf(state)) {}

  bool End() const {
    if (!IsRemoved(plans)) return false;
    if (access(module.c_str(), F_OK) != 0) return true;
    hasCommittedForModule = true;
    return IsRemoved(published);
  }

  std::string plans;
  std::string module;
  std::string published;
};

}  // namespace

// Plans, and what the module was told, are of the state before the commit, which others may see as
// soon as it is made. Where they cannot be ended, nothing may change.
StateBase::StateBase(const std::string& path, const std::string& shownAs)
    : database(path, kStateLayout, shownAs, [made = MadeFromState(path)] { return made.End(); }) {
  Refresh();
}

bool StateBase::TakeCommitForModule() { return std::exchange(hasCommittedForModule, false); }

void StateBase::Refresh() {
  if (marked && database.IsAt(seen)) return;
  // The mark is taken first: what is then read is at least as new.
  Store::CommitMark now{};
  const bool told = database.ReadCommitMark(&now);
  Rows rows = database.Select(
      "SELECT domain_version, label_version, label_attribute, label_index FROM state");
  if (!rows.Next()) database.TellDamage("the table state is empty");
  domainVersion = rows.Integer(0);
  labelVersion = rows.Integer(1);
  labelAttribute = rows.Text(2);
  labelIndex = rows.Integer(3);
  marked = told;
  seen = now;
}

void StateBase::Forget() {
  domainVersion = labelVersion = --unknownVersion;
  marked = false;
}

void StateBase::CommitDomains(Transaction& transaction) {
  database.Run("UPDATE state SET domain_version = domain_version + 1");
  transaction.Commit();
  // Within a load nothing tells of it before its end.
  ++domainVersion;
}

void StateBase::CommitLabels(Transaction& transaction) {
  database.Run("UPDATE state SET label_version = label_version + 1");
  transaction.Commit();
  ++labelVersion;
}

std::string StateBase::LabelIndexPath() const {
  const std::string& path = database.Path();
  return path.substr(0, path.rfind('/') + 1) + "labels.index";
}

void StateBase::TellLabelsChange() {
  Refresh();
  if (labelIndex == kLabelsChanged) return;
  database.Run("UPDATE state SET label_index = ?1", kLabelsChanged);
  // Within a transaction nothing tells of it before its end.
  labelIndex = kLabelsChanged;
}

const std::string& StateBase::LabelAttribute() {
  Refresh();
  return labelAttribute;
}

const std::string& StateBase::ChooseLabelAttribute(const std::string& name) {
  database.Run("UPDATE state SET label_attribute = ?1 WHERE label_attribute = ''", name);
  Forget();
  return LabelAttribute();
}

}  // namespace LinuxHost
