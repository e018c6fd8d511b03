#include "host/linux/state/state_base.h"

#include <unistd.h>

#include <cerrno>

#include "host/linux/state/plan_place.h"
#include "host/linux/state/schema.h"

namespace LinuxHost {

// Plans are of the state before the commit, which others may see as soon as it is made. Where they
// cannot be ended, nothing may change.
StateBase::StateBase(const std::string& path, const std::string& shownAs)
    : database(path, kStateLayout, shownAs, [current = CurrentPlansOf(path)] {
        return unlink(current.c_str()) == 0 || errno == ENOENT;
      }) {
  Refresh();
}

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
