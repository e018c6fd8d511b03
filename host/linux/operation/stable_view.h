#pragma once

#include <memory>

namespace LinuxHost {

class HostState;
class Snapshot;

// While it lives, all that this thread reads of the state was there at one moment, however many
// calls it takes. Keeps others from nothing. Throws Braxo::Lib::BraxoException when the state
// cannot be used.
class StableView {
 public:
  explicit StableView(HostState& viewed);
  StableView(const StableView&) = delete;
  StableView& operator=(const StableView&) = delete;
  ~StableView();

  HostState& State() const { return *state; }

 private:
  std::shared_ptr<HostState> state;
  std::unique_ptr<Snapshot> snapshot;
};

}  // namespace LinuxHost
