// The answer of `status`. Thread rule: no state.
#pragma once

#include "model/service_look.h"
#include "model/world.h"
#include "text/text_sink.h"

#include <vector>

namespace vesk {
struct StatusView {
    std::string configPath;
    std::vector<Service> services;
    Queue queue;
    std::optional<uint64_t> storedRequests; // absent where the configuration cannot be read
    bool isConfigKnown = false;
    std::vector<const WorldVolume *> volumes;
};

// Of the volumes asked for, all where none is; what is unknown becomes an error of the world's.
StatusView StatusLook(World &world, const std::vector<std::string> &volumes);

void StatusShowJson(const StatusView &view, const LookErrors &errors, TextSink &out);
void StatusShowTable(const StatusView &view, bool color, TextSink &out);
} // namespace vesk
