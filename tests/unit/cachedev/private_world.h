// A world of its own for a test body: mount and PID namespaces with a private /run, all of which
// ends with the body, whatever ends it. Processes, mounts and the daemon cannot outlive it.
#pragma once

#include <functional>

namespace vesk {
// Runs `body` in a child process that is the first process of a new PID namespace. Its test
// failures become one failure of the calling test, which is skipped when such a world cannot be
// made (no root, no /dev/fuse, no namespaces) or when the body skips.
void RunInPrivateWorld(const std::function<void()> &body);

// Ends the body of the running world as skipped, with the reason on standard output.
[[noreturn]] void SkipWorld(const char *reason);
} // namespace vesk
