#include <iostream>

#include "braxo/misc/strcat.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

void DisplayPolicyTardiskLabels(TeskAccessInterfaceImpl& access) {
  DisplayPolicyTardiskLabels(access, Nobody());
}

void DisplayPolicyTardiskLabels(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  DisplayHeader("Tardisk Path (label)", "");
  std::list<std::string> tardisks;
  GetAllTardisks(tardisks, observer);
  for (const std::string& tardisk : tardisks) {
    // The path stands before the label is read: a tardisk whose label cannot be read leaves its
    // line open.
    std::cout << tardisk << " (";
    try {
      PrintLine(GetFileLabel(tardisk, access) + ")");
    } catch (const Braxo::Lib::BraxoException& failure) {
      ReportError(
          Braxo::Misc::StrCat("Error in reading tardisk label: (", tardisk, "): ", failure.what()),
          observer);
    }
  }
}

}  // namespace SecPolicy
