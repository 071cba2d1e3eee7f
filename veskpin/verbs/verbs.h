// The commands; each has a source file of its name. They write their answer to `out` and what could
// not be looked at to standard error, or, with JSON, into the answer.
//
// Thread rule: one thread.
#pragma once

#include "text/text_sink.h"
#include "verbs/settings.h"

namespace vesk {
ExitStatus StatusCommand(const Settings &settings, TextSink &out);
ExitStatus ListCommand(const Settings &settings, TextSink &out);
ExitStatus PlanCommand(const Settings &settings, TextSink &out);
ExitStatus ExportCommand(const Settings &settings, TextSink &out);
ExitStatus PinCommand(const Settings &settings, TextSink &out);
ExitStatus UnpinCommand(const Settings &settings, TextSink &out);
ExitStatus MetricsCommand(const Settings &settings, TextSink &out);
} // namespace vesk
