#include "verbs/metrics.h"

#include "tests/unit/verbs/records.h"

#include <gtest/gtest.h>

#include <sstream>

namespace vesk {
namespace {
class MetricsTextTest : public ::testing::Test {
protected:
    void SetUp() override {
        view_.status.isConfigKnown = true;
        view_.status.storedRequests = 2;
        view_.status.volumes = {&world_};
        view_.lookedAt = 1795255200;
    }
    // The lines of this figure, without its help.
    std::string Of(const std::string &name) const {
        std::istringstream lines(MetricsText(view_));
        std::string found;
        for (std::string line; std::getline(lines, line);) {
            if (line.compare(0, name.size(), name) == 0 &&
                (line[name.size()] == '{' || line[name.size()] == ' ')) {
                found += line + "\n";
            }
        }
        return found;
    }
    WorldVolume world_ = MakeVolume();
    MetricsView view_;
};
} // namespace

TEST_F(MetricsTextTest, TheWholeTextOfOneVolume) {
    BlockSetAdd(&*world_.volume.marked, {3, 20});
    world_.volume.resident = BlockSet{0x0F};
    world_.volume.blocksHeld = 19;
    world_.known.recorded = 5;
    world_.known.requests = 2;
    Service service;
    service.pid = 100;
    service.receiver = ThreadLook::Waiting;
    service.worker = ThreadLook::Ended;
    view_.status.services = {service};
    view_.status.queue.cause = MsgQueueCause::Found;
    view_.status.queue.state.messages = 3;
    view_.states["/volume1"] = {4, 0, 1, 0, 0, 0, 0, 0, 0, 0, 2};
    view_.errors = 1;
    EXPECT_EQ(MetricsText(view_), R"(# HELP veskpin_services Pin services that run.
# TYPE veskpin_services gauge
veskpin_services 1
# HELP veskpin_service_thread_up Whether the thread of the service lives.
# TYPE veskpin_service_thread_up gauge
veskpin_service_thread_up{pid="100",thread="receiver"} 1
veskpin_service_thread_up{pid="100",thread="worker"} 0
# HELP veskpin_queued_messages Messages in the queue that nobody has taken.
# TYPE veskpin_queued_messages gauge
veskpin_queued_messages 3
# HELP veskpin_stored_requests Requests stored in the configuration.
# TYPE veskpin_stored_requests gauge
veskpin_stored_requests 2
# HELP veskpin_device_bytes Size of the cache device.
# TYPE veskpin_device_bytes gauge
veskpin_device_bytes{volume="/volume1"} 4194304
# HELP veskpin_ssd_blocks Blocks of 64 KiB that fit on the SSD.
# TYPE veskpin_ssd_blocks gauge
veskpin_ssd_blocks{volume="/volume1"} 32
# HELP veskpin_supports_pin Whether cache and driver can pin.
# TYPE veskpin_supports_pin gauge
veskpin_supports_pin{volume="/volume1"} 1
# HELP veskpin_driver_has_bitmap Whether the driver was given a bitmap.
# TYPE veskpin_driver_has_bitmap gauge
veskpin_driver_has_bitmap{volume="/volume1"} 1
# HELP veskpin_all_unpinned Whether no block is pinned in the driver.
# TYPE veskpin_all_unpinned gauge
veskpin_all_unpinned{volume="/volume1"} 0
# HELP veskpin_bitmap_bytes Size of the bitmap file.
# TYPE veskpin_bitmap_bytes gauge
veskpin_bitmap_bytes{volume="/volume1"} 8
# HELP veskpin_bitmap_bytes_needed Size that the bitmap file should have.
# TYPE veskpin_bitmap_bytes_needed gauge
veskpin_bitmap_bytes_needed{volume="/volume1"} 8
# HELP veskpin_blocks_marked Blocks marked in the bitmap file.
# TYPE veskpin_blocks_marked gauge
veskpin_blocks_marked{volume="/volume1"} 20
# HELP veskpin_blocks_resident Blocks that lie on the SSD.
# TYPE veskpin_blocks_resident gauge
veskpin_blocks_resident{volume="/volume1"} 4
# HELP veskpin_blocks_held Blocks pinned in the driver.
# TYPE veskpin_blocks_held gauge
veskpin_blocks_held{volume="/volume1"} 19
# HELP veskpin_held Whether the volume is held for a change.
# TYPE veskpin_held gauge
veskpin_held{volume="/volume1"} 0
# HELP veskpin_files Recorded files.
# TYPE veskpin_files gauge
veskpin_files{volume="/volume1"} 5
# HELP veskpin_requests Stored requests of the volume.
# TYPE veskpin_requests gauge
veskpin_requests{volume="/volume1"} 2
# HELP veskpin_files_by_state Recorded and requested files by their state.
# TYPE veskpin_files_by_state gauge
veskpin_files_by_state{volume="/volume1",state="pinned"} 4
veskpin_files_by_state{volume="/volume1",state="marked"} 0
veskpin_files_by_state{volume="/volume1",state="partial"} 1
veskpin_files_by_state{volume="/volume1",state="unmarked"} 0
veskpin_files_by_state{volume="/volume1",state="replaced"} 0
veskpin_files_by_state{volume="/volume1",state="renamed"} 0
veskpin_files_by_state{volume="/volume1",state="missing"} 0
veskpin_files_by_state{volume="/volume1",state="unreadable"} 0
veskpin_files_by_state{volume="/volume1",state="pinning"} 0
veskpin_files_by_state{volume="/volume1",state="unpinning"} 0
veskpin_files_by_state{volume="/volume1",state="unpinned"} 2
# HELP veskpin_look_errors Things that could not be looked at.
# TYPE veskpin_look_errors gauge
veskpin_look_errors 1
# HELP veskpin_last_look_timestamp_seconds When all this was looked at.
# TYPE veskpin_last_look_timestamp_seconds gauge
veskpin_last_look_timestamp_seconds 1795255200
)");
}

TEST_F(MetricsTextTest, WhatIsNotKnownHasNoNumber) {
    world_ = WorldVolume();
    world_.volume.mountPath = "/volume9";
    view_.status.isConfigKnown = false;
    view_.status.storedRequests = std::nullopt;
    view_.status.services = {Service{}};
    for (const MsgQueueCause cause : {MsgQueueCause::NoKeyFile, MsgQueueCause::NotAllowed,
                                      MsgQueueCause::Foreign, MsgQueueCause::NoQueue}) {
        view_.status.queue.cause = cause;
        EXPECT_EQ(Of("veskpin_queued_messages"), "");
    }
    const std::string text = MetricsText(view_);
    EXPECT_EQ(text.find("/volume9"), std::string::npos) << text;
    EXPECT_EQ(text.find("veskpin_files"), std::string::npos) << text;
    EXPECT_EQ(Of("veskpin_service_thread_up"), "");
    EXPECT_EQ(Of("veskpin_stored_requests"), "");
    EXPECT_EQ(Of("veskpin_services"), "veskpin_services 1\n");
}

TEST_F(MetricsTextTest, AllLinesOfAFigureStandTogether) {
    WorldVolume second = MakeVolume("/volume2");
    second.volume.supportsPin = false;
    view_.status.volumes.push_back(&second);
    EXPECT_NE(MetricsText(view_).find("veskpin_supports_pin{volume=\"/volume1\"} 1\n"
                                      "veskpin_supports_pin{volume=\"/volume2\"} 0\n"),
              std::string::npos);
}

TEST_F(MetricsTextTest, ALabelIsEscaped) {
    world_.volume.mountPath = "/a\"b\\c\nd\xFF\xC3\xB6";
    EXPECT_EQ(Of("veskpin_held"),
              "veskpin_held{volume=\"/a\\\"b\\\\c\\nd\xEF\xBF\xBD\xC3\xB6\"} 0\n");
}
} // namespace vesk
