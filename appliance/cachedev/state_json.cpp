#include "cachedev/state_json.h"

#include "bitmap/bit_runs.h"

#include <json/json.h>
#include <unistd.h>

namespace vesk {
namespace {
Json::Value Number(uint64_t value) {
    return Json::Value(static_cast<Json::UInt64>(value));
}

Json::Value Pair(uint64_t first, uint64_t second) {
    Json::Value pair(Json::arrayValue);
    pair.append(Number(first));
    pair.append(Number(second));
    return pair;
}

Json::Value RunArray(const std::vector<BitRun> &runs) {
    Json::Value array(Json::arrayValue);
    for (const BitRun &run : runs) {
        array.append(Pair(run.first, run.count));
    }
    return array;
}

Json::Value RequestCounts(const RequestCounters &requests) {
    Json::Value counts(Json::objectValue);
    counts["setBitmap"] = Number(requests.setBitmap);
    counts["queryBitmapSet"] = Number(requests.queryBitmapSet);
    counts["unpinRanges"] = Number(requests.unpinRanges);
    counts["unpinAll"] = Number(requests.unpinAll);
    counts["queryAllUnpinned"] = Number(requests.queryAllUnpinned);
    counts["getSize"] = Number(requests.getSize);
    counts["refused"] = Number(requests.refused);
    return counts;
}
} // namespace

std::string StateJsonText(const CacheSnapshot &snapshot, pid_t pid) {
    Json::Value state(Json::objectValue);
    state["pid"] = static_cast<Json::Int64>(pid);
    state["deviceBytes"] = Number(snapshot.deviceBytes);
    state["blockBytes"] = Number(kBlockBytes);
    state["slots"] = Number(snapshot.slots);
    state["bitmapSet"] = snapshot.bitmap != nullptr;
    state["bitmapBits"] =
        RunArray(snapshot.bitmap ? BitRunsOf(snapshot.bitmap->data(), snapshot.bitmap->size())
                                 : std::vector<BitRun>());
    state["pinned"] = RunArray(snapshot.pinned);
    state["pinnedBlocks"] = Number(snapshot.pinnedBlocks);
    state["cachedBlocks"] = Number(snapshot.cachedBlocks);
    state["hits"] = Number(snapshot.counters.hits);
    state["misses"] = Number(snapshot.counters.misses);
    state["ssdReads"] = Number(snapshot.counters.ssdReads);
    state["backingReads"] = Number(snapshot.counters.backingReads);
    state["writes"] = Number(snapshot.counters.writes);
    state["evictions"] = Number(snapshot.evictions);
    state["ioctls"] = RequestCounts(snapshot.requests);
    Json::Value &lastUnpin = state["lastUnpin"] = Json::Value(Json::arrayValue);
    for (const SectorRange &range : snapshot.lastUnpin) {
        lastUnpin.append(Pair(range.startSector, range.sectorCount));
    }

    Json::StreamWriterBuilder writer;
    writer["indentation"] = ""; // one line: shell scripts look for members in it
    return Json::writeString(writer, state) + "\n";
}

std::string StateJsonOf(CacheDevice &device) {
    return StateJsonText(CacheDeviceSnapshot(device), getpid());
}
} // namespace vesk
