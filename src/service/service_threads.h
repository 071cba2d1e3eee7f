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

// The worker waits while nothing is stored that it could carry out: of volumes in `heldVolumes`
// (mount paths) it carries out nothing. What it sleeps for, between two requests or for want of
// one, does not show in its thread. Absent where that cannot be told, or not yet.
std::optional<ThreadLook> ServiceWorkerLook(const ServiceProcess &process,
                                            const std::set<std::string> &heldVolumes,
                                            const std::string &procFolder);
} // namespace vesk
