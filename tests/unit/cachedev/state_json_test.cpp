#include "cachedev/state_json.h"

#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <chrono>
#include <json/json.h>
#include <sstream>

namespace vesk {
namespace {
Json::Value Parse(const std::string &text) {
    Json::Value value;
    std::istringstream stream(text);
    std::string errors;
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &value, &errors))
        << errors;
    return value;
}

// A value as compact JSON text.
std::string Text(const Json::Value &value) {
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "";
    return Json::writeString(writer, value);
}
} // namespace

TEST(StateJsonTest, AFreshDevice) {
    TestDevice test(16 * kBlockBytes + 512, 3);
    const std::string text = StateJsonText(CacheDeviceSnapshot(test.device), 4711);
    ASSERT_FALSE(text.empty());
    EXPECT_EQ(text.back(), '\n');
    const Json::Value state = Parse(text);
    EXPECT_EQ(state["pid"].asInt(), 4711);
    EXPECT_EQ(state["deviceBytes"].asUInt64(), 16 * kBlockBytes + 512);
    EXPECT_EQ(state["blockBytes"].asUInt(), 65536U);
    EXPECT_EQ(state["slots"].asUInt(), 3U);
    EXPECT_TRUE(state["bitmapSet"].isBool());
    EXPECT_FALSE(state["bitmapSet"].asBool());
    for (const char *name : {"bitmapBits", "pinned", "lastUnpin"}) {
        EXPECT_EQ(Text(state[name]), "[]") << name;
    }
    EXPECT_EQ(state.size(), 17U);
    for (const char *name : {"pinnedBlocks", "cachedBlocks", "hits", "misses", "ssdReads",
                             "backingReads", "writes", "evictions"}) {
        EXPECT_EQ(Text(state[name]), "0") << name;
    }
    for (const char *name : {"setBitmap", "queryBitmapSet", "unpinRanges", "unpinAll",
                             "queryAllUnpinned", "getSize", "refused"}) {
        EXPECT_EQ(Text(state["ioctls"][name]), "0") << name;
    }
    EXPECT_EQ(state["ioctls"].size(), 7U);
}

TEST(StateJsonTest, ADeviceThatHasSeenSomething) {
    TestDevice test(16 * kBlockBytes, 3);
    CacheDevice &device = test.device;
    CacheDeviceSetBitmap(device, {0x06, 0x80});
    TestTouch(device, {1, 2, 15, 5, 1});
    CacheDeviceWrite(device, 0, "x", 1);
    CacheDeviceUnpinRanges(device, {{2 * kBlockSectors, 3}, {7, 0}});
    CacheDeviceCountRequest(device, &RequestCounters::unpinRanges, false);
    CacheDeviceCountRequest(device, nullptr, true);
    const Json::Value state = Parse(StateJsonText(CacheDeviceSnapshot(device), 1));
    EXPECT_TRUE(state["bitmapSet"].asBool());
    EXPECT_EQ(Text(state["bitmapBits"]), "[[1,2],[15,1]]");
    EXPECT_EQ(Text(state["pinned"]), "[[1,1],[15,1]]");
    EXPECT_EQ(Text(state["pinnedBlocks"]), "2");
    EXPECT_EQ(Text(state["cachedBlocks"]), "3");
    EXPECT_EQ(Text(state["hits"]), "1");
    EXPECT_EQ(Text(state["misses"]), "4");
    EXPECT_EQ(Text(state["ssdReads"]), "1");
    EXPECT_EQ(Text(state["backingReads"]), "4");
    EXPECT_EQ(Text(state["writes"]), "1");
    EXPECT_EQ(Text(state["evictions"]), "0");
    EXPECT_EQ(Text(state["lastUnpin"]), "[[256,3],[7,0]]");
    EXPECT_EQ(Text(state["ioctls"]["unpinRanges"]), "1");
    EXPECT_EQ(Text(state["ioctls"]["refused"]), "1");
}

TEST(StateJsonTest, BigNumbersAreExact) {
    CacheSnapshot snapshot = {};
    snapshot.deviceBytes = UINT64_MAX;
    snapshot.counters.hits = 0x100000001;
    snapshot.lastUnpin = {{UINT64_MAX - 1, 1}};
    const std::string text = StateJsonText(snapshot, 1);
    const Json::Value state = Parse(text);
    EXPECT_EQ(state["deviceBytes"].asUInt64(), UINT64_MAX);
    EXPECT_EQ(state["hits"].asUInt64(), 0x100000001U);
    EXPECT_EQ(state["lastUnpin"][0][0].asUInt64(), UINT64_MAX - 1);
}
} // namespace vesk
