// The pin service: shared state, the worker and the wait for signals on threads of their own, named
// "worker" and "signals" for those who look from outside, and the receiver on the calling one.
#pragma once

namespace vesk {
struct ToolParameters;

const char kWorkerThreadName[] = "worker";

// Runs the service. `parameters` must outlive the process's threads. -1 after an error message when
// it cannot start; otherwise it does not return: the receiver ends the calling thread, a signal the
// process.
int StartService(const ToolParameters *parameters);
} // namespace vesk
