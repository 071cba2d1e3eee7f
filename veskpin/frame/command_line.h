// The command line of veskpin. Thread rule: called once.
#pragma once

#include "verbs/verbs.h"

#include <optional>

namespace vesk {
using Command = ExitStatus (*)(const Settings &settings, TextSink &out);

struct CommandLine {
    Settings settings;
    Command command = nullptr;
};

// What is to be done. Nothing: --help or --version was answered on `out` (Done), or an error
// message was written and nothing may be done (Usage); `*status` tells.
std::optional<CommandLine> CommandLineRead(int argc, char *argv[], TextSink &out,
                                           ExitStatus *status);
} // namespace vesk
