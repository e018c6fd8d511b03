#include "host/linux/operation/stable_view.h"

#include "host/linux/state/host_state.h"

namespace LinuxHost {

StableView::StableView(HostState& viewed)
    : state(viewed.shared_from_this()), snapshot(std::make_unique<Snapshot>(state->Database())) {
  state->Forget();
}

// What was learnt meanwhile may be older than the commit that it is taken for.
StableView::~StableView() {
  snapshot.reset();
  state->Forget();
}

}  // namespace LinuxHost
