// crash_runner TOOL PRELOAD RECORD
//
// Records what a service does to its files while it adds, carries out, finishes and drops requests,
// and then starts one on everything that a crash can leave behind, after each of the operations:
// the process killed, or the power cut with what was not synced lost. Runs in the same world as
// fault_runner. Every time the service must start, have every request that it had done with, carry
// each queued one out once, and come to the document, bitmap file and driver's bitmap that a run
// without a crash has after as many requests. Ends with 1 where that does not hold.
#include "tests/faults/child.h"
#include "tests/faults/crash_points.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <unistd.h>

using namespace vesk;

namespace {
const char kConfig[] = "/run/faults/config.json";
const char kBitmapFile[] = "/volume1/veskcachepinfile.bitmap";
const char kDeviceState[] = "/run/vesk1/cachedev_1.json";
const std::vector<std::string> kServe = {"--start-service", "--config-path", kConfig};
// Pin, unpin, a pin that fails, a reload, one for a volume that is not there.
const std::vector<char> kMessages = {'a', 'u', 'c', 'r', 'g', 'u', 'a'};

// What a run leaves.
struct Left {
    std::string document;
    std::string bitmap;
    std::string driver; // the bits that the device has
    std::string log;
    std::string complaint;
};

std::string DriverBits() {
    const std::string state = WorldRead(kDeviceState);
    const size_t at = state.find("\"bitmapBits\"");
    return at == std::string::npos ? "" : state.substr(at, state.find("]]", at) - at);
}

// A change of a block that holds nothing hands the bitmap file over, whatever the driver has.
void TellDriver(const Program &program, const std::string &bitmap) {
    WorldWrite(kBitmapFile, bitmap);
    Child(program,
          {"--unset-bitmap", "--mount-path", "/volume1", "--start-sector", "130944",
           "--num-sectors", "128"},
          Fault{})
        .AwaitEnd();
}

size_t Count(const std::string &text, const std::string &part) {
    size_t count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

// Requests that the log tells to be carried out or given up.
size_t Ended(const std::string &log) {
    return Count(log, ") OK ") + Count(log, "drop it.");
}

// The service is ended once it has nothing more to do, the requests before number `next` being
// carried out.
Left Serve(const Program &program, long next) {
    Left left;
    Child service(program, kServe, Fault{});
    if (!service.AwaitQuiet()) {
        left.complaint = "the service did not start";
    } else if (!WorldIsIdle(kConfig, next)) {
        left.complaint = "requests stay queued";
    }
    service.Signal(SIGTERM);
    if (service.AwaitEnd() != 0) {
        left.complaint = "the service did not end with 0";
    }
    left.document = WorldRead(kConfig);
    left.bitmap = WorldRead(kBitmapFile);
    left.driver = DriverBits();
    left.log = service.Output();
    return left;
}

void Reset(const Program &program, const std::vector<char> &queued, bool withDocument) {
    WorldReset(kConfig, queued);
    if (!withDocument) {
        std::filesystem::remove(kConfig);
    }
    TellDriver(program, WorldBitmap());
}

void Restore(const Program &program, const CrashPoint &point) {
    WorldReset(kConfig, {});
    std::filesystem::remove(kConfig);
    TellDriver(program, point.driverBitmap);
    for (const auto &[path, content] : point.files) {
        WorldWrite(path, content);
    }
}

// The requests that the document has, carried out or not.
size_t RequestsIn(const Files &files, long first) {
    WorldWrite("/run/faults/document", files.count(kConfig) == 0 ? "" : files.at(kConfig));
    const long next = WorldNextNumber("/run/faults/document");
    std::filesystem::remove("/run/faults/document");
    return next == 0 ? 0 : static_cast<size_t>(next - first);
}

// The requests in the document that end with a message: those of the volume that is there.
size_t QueuedIn(const Files &files) {
    return files.count(kConfig) == 0 ? 0 : Count(files.at(kConfig), "\"mountPath\" : \"/volume1\"");
}

std::string Judge(const CrashPoint &point, size_t requests, const Left &left, const Left &good) {
    if (!left.complaint.empty()) {
        return left.complaint;
    }
    if (requests < static_cast<size_t>(point.acknowledged)) {
        return "a stored request is lost";
    }
    if (left.document != good.document) {
        return "the document is not what " + std::to_string(requests) + " requests lead to:\n" +
               left.document;
    }
    if (Ended(left.log) != QueuedIn(point.files)) {
        return "a queued request was not carried out once";
    }
    if (!point.powerCut && (left.bitmap != good.bitmap || left.driver != good.driver)) {
        return "the bitmap or the driver is not what the requests lead to: " + left.driver +
               " for " + good.driver;
    }
    return "";
}

// Adds the numbers of points and of broken promises.
void RunBeginning(const Program &recorded, const Program &program, bool withDocument,
                  size_t *points, size_t *broken) {
    const long first = withDocument ? 1 : 0;
    std::vector<Left> good;
    for (size_t k = 0; k <= kMessages.size(); ++k) {
        Reset(program, {kMessages.begin(), kMessages.begin() + static_cast<long>(k)}, withDocument);
        good.push_back(Serve(program, first + static_cast<long>(k)));
    }
    Reset(program, kMessages, withDocument);
    Files start = {{kBitmapFile, WorldBitmap()}};
    if (withDocument) {
        start[kConfig] = WorldDocument();
    }
    std::string record;
    {
        Child service(recorded, kServe, Fault{});
        service.AwaitQuiet();
        service.Signal(SIGTERM);
        service.AwaitEnd();
        record = service.Report();
    }
    for (const CrashPoint &point : CrashPointsOf(record, start, kBitmapFile)) {
        Restore(program, point);
        const size_t requests = RequestsIn(point.files, first);
        const Left left = Serve(program, first + static_cast<long>(requests));
        const std::string complaint = Judge(point, requests, left, good.at(requests));
        ++*points;
        if (!complaint.empty()) {
            ++*broken;
            printf("%s after %zu operations: %s\n%s\n", point.powerCut ? "power cut" : "killed",
                   point.operations, complaint.c_str(), left.log.c_str());
        }
    }
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 4) {
        fprintf(stderr, "usage: crash_runner TOOL PRELOAD RECORD\n");
        return 2;
    }
    WorldWrite("/volume1/c", std::string(200000, 'c'));
    WorldWrite("/tmp/veskcachepinfiletool.debug", "/volume1/c\n");
    sync();
    size_t points = 0;
    size_t broken = 0;
    for (const bool withDocument : {true, false}) {
        RunBeginning({argv[1], argv[3]}, {argv[1], argv[2]}, withDocument, &points, &broken);
    }
    printf("%zu crash points replayed, %zu promises broken\n", points, broken);
    return broken == 0 && points > 100 ? 0 : 1;
}
