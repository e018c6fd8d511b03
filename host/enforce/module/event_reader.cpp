#include "host/enforce/module/event_reader.h"

#include <bpf/bpf.h>
#include <bpf/libbpf.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>
#include <vector>

#include "braxo/lib/exception.h"
#include "host/enforce/module/module_maps.h"

namespace Enforce {
namespace {

// Who has no rights to look is told of that by what is opened.
FileDescriptor OpenEvents() {
  if (access(kModulePins, F_OK) != 0 && errno == ENOENT)
    throw Braxo::Lib::BraxoException("the module: it does not run, so it refuses nothing");
  return OpenPinned("events");
}

__u32 IdOf(const FileDescriptor& map) {
  bpf_map_info info = {};
  __u32 size = sizeof info;
  Require(bpf_obj_get_info_by_fd(map.Number(), &info, &size) == 0, "cannot ask about events");
  return info.id;
}

}  // namespace

void EventReader::End::operator()(ring_buffer* ended) const { ring_buffer__free(ended); }

EventReader::EventReader(TakeEvent takeEvent)
    : take(std::move(takeEvent)), events(OpenEvents()), refusals(OpenPinned("refusals")) {
  ring.reset(ring_buffer__new(events.Number(), Take, this, nullptr));
  Require(ring != nullptr, "cannot read events");
}

EventReader::~EventReader() = default;

int EventReader::Take(void* self, void* data, std::size_t size) {
  ModuleEvent event = {};
  if (size < sizeof event) return 0;
  std::memcpy(&event, data, sizeof event);
  const char* const path = static_cast<const char*>(data) + sizeof event;
  const std::size_t longest = size - sizeof event;
  static_cast<EventReader*>(self)->take(event, {path, strnlen(path, longest)});
  return 0;
}

void EventReader::Drain() { Require(ring_buffer__consume(ring.get()) >= 0, "cannot read events"); }

void EventReader::Wait(std::chrono::milliseconds longest) {
  const int result = ring_buffer__poll(ring.get(), static_cast<int>(longest.count()));
  Require(result >= 0 || result == -EINTR, "cannot wait for events");
}

std::uint64_t EventReader::UntoldIn(unsigned int domain) const {
  return SumOf(refusals, domain).untold;
}

bool EventReader::IsOfRunningModule() const {
  const FileDescriptor now(bpf_obj_get(PinOf("events").c_str()));
  return now.IsOpen() && IdOf(now) == IdOf(events);
}

}  // namespace Enforce
