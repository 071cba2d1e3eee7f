#include "verbs/status.h"

#include "bitmap/pin_bitmap.h"
#include "text/escape.h"
#include "text/units.h"
#include "verbs/answer.h"
#include "verbs/verbs.h"

namespace vesk {
namespace {
std::optional<uint64_t> MarkedOf(const Volume &volume) {
    return volume.marked ? std::optional(BlockSetCount(*volume.marked)) : std::nullopt;
}

std::optional<uint64_t> IfKnown(uint64_t count, bool isKnown) {
    return isKnown ? std::optional(count) : std::nullopt;
}

bool HasQueue(const Queue &queue) {
    return queue.cause == MsgQueueCause::Found || queue.cause == MsgQueueCause::Foreign;
}

void PutService(JsonWriter &json, const Service &service) {
    json.BeginObject();
    json.Number("pid", static_cast<uint64_t>(service.pid));
    if (service.config) {
        json.Path("config", *service.config);
    } else {
        json.Null("config");
    }
    json.Text("receiver", ThreadLookText(service.receiver));
    json.Text("worker", ThreadLookText(service.worker));
    if (service.otherNamespaces) {
        json.BeginArray("otherNamespaces");
        for (const std::string &name : *service.otherNamespaces) {
            json.Text("", std::string_view(name));
        }
        json.EndArray();
    } else {
        json.Null("otherNamespaces");
    }
    json.EndObject();
}

void PutQueue(JsonWriter &json, const Queue &queue) {
    if (!HasQueue(queue)) {
        json.Null("queue");
        return;
    }
    json.BeginObject("queue");
    json.Signed("key", queue.state.key);
    json.Signed("id", queue.state.id);
    json.Number("owner", queue.state.owner);
    json.Number("bytes", queue.state.bytes);
    json.Number("maxBytes", queue.state.maxBytes);
    json.EndObject();
}

void PutVolume(JsonWriter &json, const WorldVolume &world, bool isConfigKnown) {
    const Volume &volume = world.volume;
    json.BeginObject();
    json.Path("volume", volume.mountPath);
    json.Text("uuid", volume.uuid);
    json.Text("cacheDevice", volume.cacheDevice);
    json.Text("ssd", volume.ssd);
    json.Number("deviceBytes", volume.deviceBytes);
    json.Number("ssdBlocks", volume.ssdBlocks);
    json.Bool("supportsPin", volume.supportsPin);
    json.Bool("driverHasBitmap", volume.driverHasBitmap);
    json.Bool("allUnpinned", volume.allUnpinned);
    json.Number("bitmapBytes", volume.bitmapBytes);
    json.Number("bitmapBytesNeeded", volume.bitmapBytesNeeded);
    json.Number("blocksMarked", MarkedOf(volume));
    json.Number("blocksHeld", volume.blocksHeld);
    json.Number("files",
                IfKnown(world.known.recorded, isConfigKnown && world.known.isRecordedKnown));
    json.Number("requests", IfKnown(world.known.requests, isConfigKnown));
    json.Bool("held", volume.held);
    json.EndObject();
}

std::string ServiceText(const Service &service, bool color) {
    const auto thread = [&](const std::optional<ThreadLook> &look) {
        const std::string text = ThreadLookText(look).value_or("unknown");
        return look == ThreadLook::Ended ? Colored(text, 31, color) : text;
    };
    std::string text = "Service " + std::to_string(service.pid) + ": receiver " +
                       thread(service.receiver) + ", worker " + thread(service.worker) +
                       ", configuration " + TextEscaped(service.config.value_or("unknown"));
    for (const std::string &name : service.otherNamespaces.value_or(std::vector<std::string>())) {
        text += name == "ipc" ? ", in another IPC namespace: takes no message from here"
                              : ", in another mount namespace: may see other files";
    }
    return text + "\n";
}

std::string QueueText(const Queue &queue) {
    if (!HasQueue(queue)) {
        return queue.cause == MsgQueueCause::NotAllowed ? "Queue: unknown\n" : "Queue: none\n";
    }
    return "Queue " + std::to_string(queue.state.id) + " of user " +
           std::to_string(queue.state.owner) + ": " +
           UnitsOfThings(queue.state.messages, "message") + " waiting\n";
}

std::string BitmapText(const Volume &volume) {
    if (!volume.isMounted) {
        return "not mounted";
    }
    if (!volume.hasCache) {
        return "no cache";
    }
    if (!volume.supportsPin) {
        return "unknown";
    }
    if (!*volume.supportsPin) {
        return "cannot pin";
    }
    if (volume.held.value_or(false)) {
        return "held";
    }
    if (!volume.driverHasBitmap) {
        return "unknown";
    }
    return *volume.driverHasBitmap ? "pinning" : "no bitmap in the driver";
}
} // namespace

void StatusShowJson(const StatusView &view, const LookErrors &errors, TextSink &out) {
    JsonWriter json(out);
    AnswerBegin(json, "status");
    json.Path("config", view.configPath);
    json.BeginArray("services");
    for (const Service &service : view.services) {
        PutService(json, service);
    }
    json.EndArray();
    PutQueue(json, view.queue);
    json.Number("queuedMessages", IfKnown(view.queue.state.messages, HasQueue(view.queue)));
    json.Number("storedRequests", view.storedRequests);
    json.BeginArray("volumes");
    for (const WorldVolume *volume : view.volumes) {
        PutVolume(json, *volume, view.isConfigKnown);
    }
    json.EndArray();
    AnswerEnd(json, out, errors);
}

void StatusShowTable(const StatusView &view, bool color, TextSink &out) {
    if (view.services.empty()) {
        out.Put(Colored("No service runs", 33, color) + "\n");
    }
    for (const Service &service : view.services) {
        out.Put(ServiceText(service, color));
    }
    out.Put(QueueText(view.queue));
    out.Put("Configuration " + TextEscaped(view.configPath) + ": " +
            (view.storedRequests ? UnitsOfThings(*view.storedRequests, "request") + " stored\n"
                                 : "cannot be read\n"));
    if (view.volumes.empty()) {
        return;
    }
    const std::vector<int> widths = {-12, 6, 8, 8, 8, 8, -12};
    out.Put("\n" + Colored(TableRow({"VOLUME", "FILES", "REQUESTS", "MARKED", "HELD", "SSD",
                                     "OF DEVICE", "STATE"},
                                    widths),
                           1, color));
    for (const WorldVolume *world : view.volumes) {
        const Volume &volume = world->volume;
        const auto bytes = [](const std::optional<uint64_t> &blocks) {
            return blocks ? UnitsOfBytes(*blocks << kBitmapByteShift) : "-";
        };
        out.Put(TableRow(
            {TextEscaped(volume.mountPath),
             UnitsOfCount(IfKnown(world->known.recorded,
                                  view.isConfigKnown && world->known.isRecordedKnown)),
             UnitsOfCount(IfKnown(world->known.requests, view.isConfigKnown)),
             bytes(MarkedOf(volume)), bytes(volume.blocksHeld), bytes(volume.ssdBlocks),
             volume.deviceBytes ? UnitsOfBytes(*volume.deviceBytes) : "-", BitmapText(volume)},
            widths));
    }
}

StatusView StatusLook(World &world, const std::vector<std::string> &volumes) {
    StatusView view;
    view.configPath = world.configPath;
    view.volumes = WorldVolumesWanted(world, volumes);
    std::set<std::string> held;
    for (const WorldVolume &volume : world.volumes) {
        if (volume.volume.held.value_or(false)) {
            held.insert(volume.volume.mountPath);
        }
    }
    view.services = ServicesLook(held, &world.errors);
    view.queue = QueueLook(&world.errors);
    view.isConfigKnown = world.isConfigKnown;
    view.storedRequests = world.storedRequests;
    return view;
}

ExitStatus StatusCommand(const Settings &settings, TextSink &out) {
    World world = WorldLook(settings.configPath);
    const StatusView view = StatusLook(world, settings.volumes);
    if (settings.json) {
        StatusShowJson(view, world.errors, out);
    } else {
        StatusShowTable(view, settings.color, out);
        AnswerErrors(world.errors);
    }
    return ExitStatusOf(world.errors.isUnknown, true);
}
} // namespace vesk
