// The state has a number for its index, and the file the same one. Who changes a label sets the
// state's to kLabelsChanged; who makes an index sets it to one of its own, as a negative number,
// and after the walk, in one step with the file, to the positive one, unless it is another by then.
#include "host/linux/operation/label_index.h"

#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/files/file_walk.h"
#include "host/linux/files/labelled_places.h"
#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/contention.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;
using Enforce::IndexedRoot;
using Enforce::LabelIndex;

constexpr char kIndexPurpose[] = "label index";
constexpr char kAdvice[] = "Run \"secpolicy load\", which makes a new one";

std::uint64_t RootDevice() {
  struct stat status {};
  if (stat("/", &status) != 0) ThrowErrno("Unable to examine the root");
  return status.st_dev;
}

// Positive, and none that stands for something else.
std::int64_t NewIndexSerial() {
  std::int64_t serial = 0;
  if (getrandom(&serial, sizeof serial, 0) != sizeof serial) {
    ThrowErrno("Unable to number the label index");
  }
  return (serial & INT64_MAX) | 2;
}

LabelIndex ReadIndexOf(HostState& state) {
  const std::string file = state.LabelIndexPath();
  state.Refresh();
  const bool isGone = access(file.c_str(), F_OK) != 0 && errno == ENOENT;
  if (isGone || state.LabelIndex() == kNeverLabelled) {
    throw HostError(ENOENT, StrCat("There is no label index ", file, ". ", kAdvice));
  }
  RequirePrivateFile(file, kIndexPurpose);
  LabelIndex index = LabelIndex::Read(file);
  const IndexedRoot wanted = {.device = RootDevice(),
                              .serial = static_cast<std::uint64_t>(state.LabelIndex())};
  if (index.Root() == wanted) return index;
  throw HostError(ESTALE,
                  StrCat("The label index ", file, " is not of the labels as they are. ", kAdvice));
}

bool IsIndexWanted(HostState& state) {
  state.Refresh();
  if (state.LabelIndex() == kNeverLabelled) return false;
  if (state.LabelIndex() < 0) return true;
  try {
    ReadIndexOf(state);
    return false;
  } catch (const Braxo::Lib::BraxoException&) {
    return true;
  }
}

// Nothing when a directory was moved while the walk was in it.
std::optional<std::vector<Enforce::LabelledPlace>> FindPlaces() {
  try {
    return FindLabelledPlaces("/", LabelAttribute());
  } catch (const HostError& failure) {
    if (failure.Code() != kMoved) throw;
    return std::nullopt;
  }
}

// Returns whether it is the one of the labels as they are.
bool MakeIndex(HostState& state) {
  const std::int64_t serial = NewIndexSerial();
  Store& store = state.Database();
  const std::int64_t making = -serial;
  store.Run("UPDATE state SET label_index = ?1", making);
  auto places = FindPlaces();
  if (!places) return false;
  const LabelIndex index({.device = RootDevice(), .serial = static_cast<std::uint64_t>(serial)},
                         std::move(*places));
  // Others that make one wait until both are written.
  Transaction transaction(store);
  const int changed =
      store.Run("UPDATE state SET label_index = ?2 WHERE label_index = ?1", making, serial);
  if (changed == 0) return false;
  index.Write(state.LabelIndexPath());
  transaction.Commit();
  return true;
}

}  // namespace

bool RefreshLabelIndex() {
  constexpr int kMostTries = 8;
  HostState* const state = HostState::Find();
  if (state == nullptr || !IsIndexWanted(*state)) return false;
  for (int tries = 1; tries <= kMostTries; ++tries) {
    if (MakeIndex(*state)) return true;
    LetOthersGoFirst(tries);
  }
  throw HostError(EBUSY, StrCat("Unable to make the label index ", state->LabelIndexPath(),
                                ": files are labelled or moved all the time. ", kAdvice));
}

bool IsLabelIndexPossible() {
  HostState* const state = HostState::Find();
  if (state == nullptr) return false;
  state->Refresh();
  return state->LabelIndex() != kNeverLabelled;
}

LabelIndex ReadLabelIndex() {
  HostState* const state = HostState::Find();
  if (state != nullptr) return ReadIndexOf(*state);
  throw HostError(ENOENT,
                  "There is no label index, as nothing is installed. Run \"secpolicy boot\"");
}

}  // namespace LinuxHost
