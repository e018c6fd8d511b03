#include "host/linux/operation/change_mark.h"

#include "host/linux/state/host_state.h"

namespace LinuxHost {

ChangeMark TakeChangeMark() {
  ChangeMark mark{.state = HostState::Current().shared_from_this()};
  mark.isKnown = mark.state->Database().ReadCommitMark(&mark.committed);
  return mark;
}

bool ChangedSince(const ChangeMark& mark) {
  const Store& store = mark.state->Database();
  return !mark.isKnown || !store.IsCurrent() || !store.IsAt(mark.committed);
}

}  // namespace LinuxHost
