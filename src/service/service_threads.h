// What the threads of a pin service do, seen from outside.
//
// Thread rule: no state.
#pragma once

#include "service/service_processes.h"

#include <optional>
#include <set>
#include <string>

namespace vesk {
enum class ThreadLook { Waiting, Busy, Ended };

// Whether the receiver waits for a message. Absent where the kernel does not tell the caller.
std::optional<ThreadLook> ServiceReceiverLook(const ServiceProcess &process);

// How often the receiver has gone to sleep by itself. In a wait for a message that is another than
// the one before it has gone to sleep anew: the kernel hands a message over before the thread runs.
std::optional<uint64_t> ServiceReceiverSleeps(const ServiceProcess &process);

// Whether the worker is there. Absent where that cannot be told, or not yet.
std::optional<bool> ServiceWorkerLives(const ServiceProcess &process,
                                       const std::string &procFolder);

// The worker waits while nothing is stored that it could carry out: of volumes in `heldVolumes`
// (mount paths) it carries out nothing. What it sleeps for, between two requests or for want of
// one, does not show in its thread. Absent where that cannot be told, or not yet.
std::optional<ThreadLook> ServiceWorkerLook(const ServiceProcess &process,
                                            const std::set<std::string> &heldVolumes,
                                            const std::string &procFolder);
} // namespace vesk
