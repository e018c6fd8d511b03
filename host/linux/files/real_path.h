#pragma once

namespace LinuxHost {

// While one lives, this thread looks once for each path that leads over no link: the rules of a
// load are about what was there at one moment, and many of them name the same places. Only one at a
// time.
class OneLook {
 public:
  OneLook();
  OneLook(const OneLook&) = delete;
  OneLook& operator=(const OneLook&) = delete;
  ~OneLook();
};

}  // namespace LinuxHost
