#pragma once

namespace LinuxHost {

// Places this process in the domain `id`, which it leaves by its end or by being placed elsewhere.
// Throws HostError when there is no such domain, or the state cannot be written.
void EnterWorld(unsigned int id);

// The domain that this process was placed in, or the nearest process above it, or the start domain.
// Throws HostError for a confined process of which that cannot be told.
unsigned int DomainOfCaller();

}  // namespace LinuxHost
