#include "tests/faults/scenario.h"

#include "tests/faults/child.h"
#include "tests/faults/world.h"

#include <signal.h>

namespace vesk {
namespace {
const char kConfig[] = "/run/faults/config.json";

const Scenario kScenarios[] = {
    {"pin-files", {"--pin-files", "/volume1/a", "--mount-path", "/volume1"}, 0, false, {}},
    {"reload-blocks", {"--reload-blocks", "--mount-path", "/volume1"}, 0, false, {}},
    {"add-pending", {"--add-pending", "--mount-path", "/volume1"}, 255, false, {}},
    {"support-pin", {"--support-pin", "--mount-path", "/volume1"}, 0, false, {}},
    {"check-bitmap", {"--check-bitmap", "--mount-path", "/volume1"}, 0, false, {}},
    {"get-uuid", {"--get-uuid", "--mount-path", "/volume1"}, 0, false, {}},
    {"send-bitmap", {"--send-bitmap", "--mount-path", "/volume1"}, 0, false, {}},
    {"handle-mount",
     {"--handle-mount", "--mount-path", "/gone", "--config-path", kConfig},
     0,
     false,
     {}},
    {"handle-umount", {"--handle-umount", "--mount-path", "/volume1"}, 0, false, {}},
    {"delete-bitmap", {"--delete-bitmap", "--mount-path", "/volume1"}, 0, false, {}},
    {"check-pin", {"--check-pin", "/volume1/b", "--config-path", kConfig}, 0, false, {}},
    {"unpin-all", {"--unpin-all", "--mount-path", "/volume1"}, 0, false, {}},
    {"is-all-unpin", {"--is-all-unpin", "/run/vesk1/cachedev_1"}, 0, false, {}},
    {"set-bitmap",
     {"--set-bitmap", "--mount-path", "/volume1", "--start-sector", "0", "--num-sectors", "128"},
     0,
     false,
     {}},
    {"unset-bitmap",
     {"--unset-bitmap", "--mount-path", "/volume1", "--start-sector", "1024", "--num-sectors",
      "128"},
     0,
     false,
     {}},
    {"unpin-range",
     {"--unpin-range", "--mount-path", "/volume1", "--start-sector", "0", "--num-sectors", "128"},
     0,
     false,
     {}},
    {"get-bitmap-size", {"--get-bitmap-size-byte", "--mount-path", "/volume1"}, 0, false, {}},
    {"service", {"--start-service", "--config-path", kConfig}, 0, true, {'a', 'u'}},
};

bool Contains(const std::string &text, const std::string &part) {
    return text.find(part) != std::string::npos;
}

// A document that cannot be written stays as it was, which is reported to nobody: what was to be
// added is not stored.
bool IsWriteFault(const std::string &kind) {
    return kind == "write" || kind == "fsync" || kind == "rename";
}

// Each request of the messages is still on the queue, stored, carried out, or told to be given up;
// the drop of a volume that cannot be seen to support pinning tells of all its requests at once.
std::string LossComplaint(const Outcome &outcome) {
    if (IsWriteFault(outcome.faultKind) || Contains(outcome.log, ": Drop requests finish")) {
        return "";
    }
    const auto given = static_cast<int>(WorldMessages());
    int accounted = outcome.messagesLeft;
    for (const char *end : {"drop it.", ") OK ", "Can't add request to config"}) {
        for (size_t at = outcome.log.find(end); at != std::string::npos;
             at = outcome.log.find(end, at + 1)) {
            ++accounted;
        }
    }
    Json::Value root;
    if (WorldParse(outcome.document, root)) {
        accounted += static_cast<int>(root["requestQueue"].size());
    }
    return accounted < given ? "a request is lost" : "";
}
} // namespace

const Scenario *ScenarioFind(const std::string &name) {
    for (const Scenario &scenario : kScenarios) {
        if (name == scenario.name) {
            return &scenario;
        }
    }
    return nullptr;
}

Outcome ScenarioRun(const Program &program, const Scenario &scenario, const Fault &fault,
                    int descriptors) {
    WorldReset(kConfig, scenario.messages);
    Outcome outcome;
    outcome.faultKind = fault.kind;
    Child child(program, scenario.arguments, fault);
    if (scenario.isService) {
        child.AwaitQuiet();
        outcome.descriptors = child.Descriptors(descriptors);
        child.Signal(SIGTERM);
    }
    outcome.status = child.AwaitEnd();
    outcome.faultReached = child.FaultReached();
    outcome.allocations = child.LiveAllocations();
    outcome.log = child.Output();
    outcome.document = WorldRead(kConfig);
    outcome.bitmap = WorldRead("/volume1/veskcachepinfile.bitmap");
    outcome.messagesLeft = WorldMessagesLeft();
    if (outcome.status != 0 && outcome.status != 255) {
        outcome.complaint = "it ended with status " + std::to_string(outcome.status);
    }
    return outcome;
}

std::string ScenarioJudge(const Scenario &scenario, const Outcome &good, const Outcome &outcome) {
    if (const std::string complaint = WorldComplaint(outcome.document); !complaint.empty()) {
        return complaint;
    }
    if (WorldLeftovers(kConfig)) {
        return "a temporary file is left beside the configuration file";
    }
    if (scenario.isService) {
        if (outcome.descriptors > good.descriptors) {
            return "the service holds more descriptors than without the fault";
        }
        return outcome.status == 255 ? "" : LossComplaint(outcome);
    }
    if (outcome.allocations > good.allocations) {
        return std::to_string(outcome.allocations - good.allocations) + " allocations are left";
    }
    if (outcome.document != good.document && outcome.document != WorldDocument()) {
        return "the configuration file is neither the old nor the new one";
    }
    if (outcome.bitmap != good.bitmap && outcome.bitmap != WorldBitmap()) {
        return "the bitmap file is neither the old nor the new one";
    }
    if (outcome.status == 255 && scenario.goodStatus == 0 &&
        !Contains(outcome.log, "veskcachepinfiletool: ") && !Contains(outcome.log, "failed")) {
        return "it failed without a word";
    }
    return "";
}
} // namespace vesk
