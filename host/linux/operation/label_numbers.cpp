#include "host/linux/operation/label_numbers.h"

#include "braxo/misc/strcat.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/state/config_database.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {

std::string TakeOverLabelNumbers() {
  HostState* const state = AreLabelNumbersKept() ? HostState::Find() : nullptr;
  if (state == nullptr) return "";
  state->Refresh();
  const LabelNumbers used = state->Labels().All();
  const std::int64_t highest = state->Labels().HighestNumber();
  const bool hasGivenAny = highest > kHighestBuiltInId;
  if (!hasGivenAny || ConfigDatabase::Current().HighestLabelNumber() >= highest) return "";
  ConfigDatabase::Current().TakeOverLabelNumbers(used, highest);
  return Braxo::Misc::StrCat(SettingsPath(),
                             " did not know the numbers of the labels in use, so they were written "
                             "into it again; new ones begin above ",
                             highest);
}

}  // namespace LinuxHost
