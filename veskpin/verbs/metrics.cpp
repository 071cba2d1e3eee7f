#include "verbs/metrics.h"

#include "text/escape.h"
#include "text/file_output.h"
#include "text/utf8.h"
#include "verbs/answer.h"
#include "verbs/list.h"
#include "verbs/verbs.h"

#include <cstdio>
#include <cstring>
#include <ctime>

namespace vesk {
namespace {
// A label's value in quotation marks.
std::string Label(const std::string &name, const std::string &value) {
    std::string escaped;
    for (const char letter : Utf8Repaired(value)) {
        if (letter == '\\' || letter == '"') {
            escaped += '\\';
        }
        escaped += letter == '\n' ? "\\n" : std::string(1, letter);
    }
    return name + "=\"" + escaped + "\"";
}

class MetricsWriter {
public:
    // Begins a figure: all of its lines follow.
    void Begin(const std::string &name, const std::string &help) {
        name_ = "veskpin_" + name;
        text_ += "# HELP " + name_ + " " + help + "\n# TYPE " + name_ + " gauge\n";
    }
    void Put(const std::string &labels, const std::optional<uint64_t> &value) {
        if (value) {
            text_ += name_ + (labels.empty() ? "" : "{" + labels + "}") + " " +
                     std::to_string(*value) + "\n";
        }
    }
    const std::string &Text() const { return text_; }

private:
    std::string name_;
    std::string text_;
};

std::optional<uint64_t> BoolNumber(const std::optional<bool> &answer) {
    return answer ? std::optional<uint64_t>(*answer ? 1 : 0) : std::nullopt;
}

using VolumeFigure = std::optional<uint64_t> (*)(const WorldVolume &);
struct VolumeMetric {
    const char *name;
    const char *help;
    VolumeFigure figure;
};

const VolumeMetric kVolumeMetrics[] = {
    {"device_bytes", "Size of the cache device.",
     [](const WorldVolume &world) { return world.volume.deviceBytes; }},
    {"ssd_blocks", "Blocks of 64 KiB that fit on the SSD.",
     [](const WorldVolume &world) { return world.volume.ssdBlocks; }},
    {"supports_pin", "Whether cache and driver can pin.",
     [](const WorldVolume &world) { return BoolNumber(world.volume.supportsPin); }},
    {"driver_has_bitmap", "Whether the driver was given a bitmap.",
     [](const WorldVolume &world) { return BoolNumber(world.volume.driverHasBitmap); }},
    {"all_unpinned", "Whether no block is pinned in the driver.",
     [](const WorldVolume &world) { return BoolNumber(world.volume.allUnpinned); }},
    {"bitmap_bytes", "Size of the bitmap file.",
     [](const WorldVolume &world) { return world.volume.bitmapBytes; }},
    {"bitmap_bytes_needed", "Size that the bitmap file should have.",
     [](const WorldVolume &world) { return world.volume.bitmapBytesNeeded; }},
    {"blocks_marked", "Blocks marked in the bitmap file.",
     [](const WorldVolume &world) -> std::optional<uint64_t> {
         return world.volume.marked ? std::optional(BlockSetCount(*world.volume.marked))
                                    : std::nullopt;
     }},
    {"blocks_resident", "Blocks that lie on the SSD.",
     [](const WorldVolume &world) -> std::optional<uint64_t> {
         return world.volume.resident ? std::optional(BlockSetCount(*world.volume.resident))
                                      : std::nullopt;
     }},
    {"blocks_held", "Blocks pinned in the driver.",
     [](const WorldVolume &world) { return world.volume.blocksHeld; }},
    {"held", "Whether the volume is held for a change.",
     [](const WorldVolume &world) { return BoolNumber(world.volume.held); }},
};

void PutService(MetricsWriter &metrics, const StatusView &status) {
    metrics.Begin("services", "Pin services that run.");
    metrics.Put("", status.services.size());
    metrics.Begin("service_thread_up", "Whether the thread of the service lives.");
    for (const Service &service : status.services) {
        const std::string pid = Label("pid", std::to_string(service.pid));
        const auto isUp = [](const std::optional<ThreadLook> &look) {
            return look ? std::optional<uint64_t>(*look == ThreadLook::Ended ? 0 : 1)
                        : std::nullopt;
        };
        metrics.Put(pid + ",thread=\"receiver\"", isUp(service.receiver));
        metrics.Put(pid + ",thread=\"worker\"", isUp(service.worker));
    }
    metrics.Begin("queued_messages", "Messages in the queue that nobody has taken.");
    if (status.queue.cause == MsgQueueCause::Found) {
        metrics.Put("", status.queue.state.messages);
    }
    metrics.Begin("stored_requests", "Requests stored in the configuration.");
    metrics.Put("", status.storedRequests);
}

void PutVolumes(MetricsWriter &metrics, const MetricsView &view) {
    for (const VolumeMetric &metric : kVolumeMetrics) {
        metrics.Begin(metric.name, metric.help);
        for (const WorldVolume *world : view.status.volumes) {
            metrics.Put(Label("volume", world->volume.mountPath), metric.figure(*world));
        }
    }
    if (!view.status.isConfigKnown) {
        return;
    }
    metrics.Begin("files", "Recorded files.");
    for (const WorldVolume *world : view.status.volumes) {
        metrics.Put(Label("volume", world->volume.mountPath),
                    world->known.isRecordedKnown ? std::optional(world->known.recorded)
                                                 : std::nullopt);
    }
    metrics.Begin("requests", "Stored requests of the volume.");
    for (const WorldVolume *world : view.status.volumes) {
        metrics.Put(Label("volume", world->volume.mountPath), world->known.requests);
    }
    metrics.Begin("files_by_state", "Recorded and requested files by their state.");
    for (const auto &[mountPath, counts] : view.states) {
        for (size_t state = 0; state < kFileStates; ++state) {
            metrics.Put(Label("volume", mountPath) + "," +
                            Label("state", FileStateText(static_cast<FileState>(state))),
                        counts[state]);
        }
    }
}
} // namespace

std::string MetricsText(const MetricsView &view) {
    MetricsWriter metrics;
    PutService(metrics, view.status);
    PutVolumes(metrics, view);
    metrics.Begin("look_errors", "Things that could not be looked at.");
    metrics.Put("", view.errors);
    metrics.Begin("last_look_timestamp_seconds", "When all this was looked at.");
    metrics.Put("", static_cast<uint64_t>(view.lookedAt));
    return metrics.Text();
}

ExitStatus MetricsCommand(const Settings &settings, TextSink &out) {
    World world = WorldLook(settings.configPath);
    MetricsView view;
    ListLook(world, {}, std::nullopt, [&](const ListedFile &file) {
        if (file.state) {
            ++view.states[file.volume][static_cast<size_t>(*file.state)];
        }
    });
    view.status = StatusLook(world, {});
    view.errors = world.errors.list.size() + world.errors.more;
    view.lookedAt = time(nullptr);
    const std::string text = MetricsText(view);
    AnswerErrors(world.errors);
    if (settings.output.empty()) {
        out.Put(text);
    } else if (const int error = FileOutputReplace(settings.output, text)) {
        fprintf(stderr, "veskpin: %s: %s\n", TextEscaped(settings.output).c_str(), strerror(error));
        return ExitStatusOf(world.errors.isUnknown, false);
    }
    return ExitStatusOf(world.errors.isUnknown, true);
}
} // namespace vesk
