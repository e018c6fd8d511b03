#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>

#include "host/enforce/module/map_entries.h"
#include "host/enforce/supervise/file_descriptor.h"

struct ring_buffer;

namespace Enforce {

// Takes an event, and the path that stands behind it, which is empty where there is none.
using TakeEvent = std::function<void(const ModuleEvent&, std::string_view path)>;

// What the running module refuses, as it tells it. An event is told once, to whoever reads it
// first: there should be one reader. Everything throws Braxo::Lib::BraxoException, and takes the
// capabilities of Module.
class EventReader {
 public:
  // Throws as well where no module runs.
  explicit EventReader(TakeEvent take);
  EventReader(const EventReader&) = delete;
  EventReader& operator=(const EventReader&) = delete;
  ~EventReader();

  // Hands over all events that there are.
  void Drain();

  // Waits until there is one, or a signal, and no longer than that; then it hands all over.
  void Wait(std::chrono::milliseconds longest);

  // How many events of a domain there was no room for since the module was started.
  std::uint64_t UntoldIn(unsigned int domain) const;

  // False once the module has been stopped, or another one was started.
  bool IsOfRunningModule() const;

 private:
  struct End {
    void operator()(ring_buffer* ended) const;
  };

  static int Take(void* self, void* data, std::size_t size);

  const TakeEvent take;
  const FileDescriptor events;
  const FileDescriptor refusals;
  std::unique_ptr<ring_buffer, End> ring;
};

}  // namespace Enforce
