#pragma once

#include <csignal>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

// What a confined program and the broker of its domain tell each other. The broker believes none of
// it: whose domain it serves it knows by itself, and what a program is by its descriptor.
namespace Enforce {

// Tells a confined program the number of the descriptor that its broker listens at.
inline constexpr char kBrokerVariable[] = "SECPOLICY_BROKER";

// In place of that number, where the module keeps the domain: whoever executes a program goes where
// its label leads.
inline constexpr std::string_view kKernelAsBroker = "kernel";

// Asks for a program to be started.
struct EntryRequest {
  std::vector<std::string> command;      // its name, and its arguments
  std::vector<std::string> environment;  // variables that MayBeHandedOn
};

// No request is longer.
constexpr std::size_t kMostRequestBytes = std::size_t{64} << 10;

// The descriptors that are sent along with a request, in this order.
enum EntryDescriptor : unsigned int {
  kProgram,    // to be executed
  kDirectory,  // to be the working directory
  kInput,      // to be the standard descriptors
  kOutput,
  kErrors,
  kAnswers,  // of a pipe, to write the answer to
  kSignals,  // of a pipe, from which the numbers of signals are read that the program is to get
  kEntryDescriptors
};

// What a program may be sent that was started for another: what terminals and service managers
// send.
inline constexpr int kHandedOnSignals[] = {SIGHUP,  SIGINT,  SIGQUIT, SIGTERM,
                                           SIGCONT, SIGUSR1, SIGUSR2};

// Comes once for each request that brings a pipe for it.
struct EntryAnswer {
  enum Kind : std::uint32_t {
    kEnded,   // `value` is the exit status, as a shell has it
    kRefused  // nothing was started; `value` is the system error that tells why
  };
  std::uint32_t kind = kRefused;
  std::uint32_t value = 0;
};

// True for a variable, "NAME=VALUE", that a program may be given by one of another domain: it says
// how to talk to people, and nothing about what to load.
bool MayBeHandedOn(std::string_view variable);

std::string Serialize(const EntryRequest& request);

// The request that Serialize has made the bytes of. False when they are anything else; `request` is
// undefined then.
bool Parse(std::string_view bytes, EntryRequest* request);

}  // namespace Enforce
