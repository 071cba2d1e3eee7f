#include "verbs/status.h"

#include "tests/unit/verbs/records.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
class StatusShowTest : public ::testing::Test {
protected:
    void SetUp() override {
        BlockSetAdd(&*world_.volume.marked, {3, 20});
        world_.volume.blocksHeld = 19;
        world_.known.recorded = 5;
        world_.known.requests = 2;
        view_.configPath = "/etc/pins.json";
        view_.storedRequests = 2;
        view_.isConfigKnown = true;
        view_.volumes = {&world_};
        view_.queue.cause = MsgQueueCause::Found;
        view_.queue.state = {-7, 32768, 0, 3, 4620, 1576960, 0};
        view_.services = {Service{}};
        view_.services[0].pid = 100;
        view_.services[0].config = "/etc/pins.json";
        view_.services[0].receiver = ThreadLook::Waiting;
        view_.services[0].worker = ThreadLook::Busy;
        view_.services[0].otherNamespaces = std::vector<std::string>();
    }
    std::string Json() const {
        TextSink sink;
        StatusShowJson(view_, errors_, sink);
        return sink.Kept();
    }
    std::string Table(bool color = false) const {
        TextSink sink;
        StatusShowTable(view_, color, sink);
        return sink.Kept();
    }
    // The first line that begins so.
    std::string Line(const std::string &begin) const {
        const std::string text = "\n" + Table();
        const size_t at = text.find("\n" + begin);
        return at == std::string::npos ? "(none)"
                                       : text.substr(at + 1, text.find('\n', at + 1) - at - 1);
    }
    // What the last column says of the volume.
    std::string State() const {
        const std::string line = Line("/volume1 ");
        return line.substr(line.rfind("  ") + 2);
    }
    WorldVolume world_ = MakeVolume();
    StatusView view_;
    LookErrors errors_;
};
} // namespace

TEST_F(StatusShowTest, TheDocumentHasAllMembers) {
    LookErrorAdd(&errors_, "/etc/pins.json", "is damaged");
    EXPECT_EQ(Json(),
              R"({"command":"status","schema":1,"config":"/etc/pins.json","services":[{"pid":100,)"
              R"("config":"/etc/pins.json","receiver":"waiting","worker":"busy",)"
              R"("otherNamespaces":[]}],"queue":{"key":-7,"id":32768,"owner":0,"bytes":4620,)"
              R"("maxBytes":1576960},"queuedMessages":3,"storedRequests":2,"volumes":[)"
              R"({"volume":"/volume1","uuid":"uuid-1","cacheDevice":"/dev/mapper/cachedev_0",)"
              R"("ssd":"/dev/ssd1","deviceBytes":4194304,"ssdBlocks":32,"supportsPin":true,)"
              R"("driverHasBitmap":true,"allUnpinned":false,"bitmapBytes":8,)"
              R"("bitmapBytesNeeded":8,"blocksMarked":20,"blocksHeld":19,"files":5,)"
              R"("requests":2,"held":false}],"errors":[{"path":"/etc/pins.json",)"
              R"("text":"is damaged"}]})"
              "\n");
}

TEST_F(StatusShowTest, WhatCannotBeHadIsNull) {
    world_ = WorldVolume();
    world_.volume.mountPath = "/volume9";
    view_.isConfigKnown = false;
    view_.storedRequests = std::nullopt;
    view_.queue.cause = MsgQueueCause::NotAllowed;
    view_.services[0] = Service{};
    view_.services[0].pid = 7;
    EXPECT_EQ(
        Json(),
        R"({"command":"status","schema":1,"config":"/etc/pins.json","services":[{"pid":7,)"
        R"("config":null,"receiver":null,"worker":null,"otherNamespaces":null}],"queue":null,)"
        R"("queuedMessages":null,"storedRequests":null,"volumes":[{"volume":"/volume9",)"
        R"("uuid":null,"cacheDevice":null,"ssd":null,"deviceBytes":null,"ssdBlocks":null,)"
        R"("supportsPin":null,"driverHasBitmap":null,"allUnpinned":null,"bitmapBytes":null,)"
        R"("bitmapBytesNeeded":null,"blocksMarked":null,"blocksHeld":null,"files":null,)"
        R"("requests":null,"held":null}],"errors":[]})"
        "\n");
}

TEST_F(StatusShowTest, OtherNamespacesAndAForeignQueueAreShown) {
    view_.services[0].otherNamespaces = {"ipc", "mnt"};
    view_.queue.cause = MsgQueueCause::Foreign;
    view_.queue.state.owner = 65534;
    EXPECT_NE(Json().find(R"("otherNamespaces":["ipc","mnt"]}],"queue":{"key":-7,"id":32768,)"
                          R"("owner":65534,)"),
              std::string::npos)
        << Json();
    EXPECT_EQ(
        Line("Service"),
        "Service 100: receiver waiting, worker busy, configuration /etc/pins.json, in another "
        "IPC namespace: takes no message from here, in another mount namespace: may see "
        "other files");
    EXPECT_EQ(Line("Queue"), "Queue 32768 of user 65534: 3 messages waiting");
}

TEST_F(StatusShowTest, TheTableShowsServiceQueueConfigurationAndVolumes) {
    EXPECT_EQ(
        Table(),
        "Service 100: receiver waiting, worker busy, configuration /etc/pins.json\n"
        "Queue 32768 of user 0: 3 messages waiting\n"
        "Configuration /etc/pins.json: 2 requests stored\n"
        "\n"
        "VOLUME         FILES  REQUESTS    MARKED      HELD       SSD  OF DEVICE     STATE\n"
        "/volume1           5         2   1.2 MiB   1.2 MiB   2.0 MiB  4.0 MiB       pinning\n");
}

TEST_F(StatusShowTest, TheTableShowsADashForWhatCannotBeHad) {
    world_ = WorldVolume();
    world_.volume.mountPath = "/volume9";
    view_.isConfigKnown = false;
    view_.storedRequests = std::nullopt;
    view_.queue.cause = MsgQueueCause::NoKeyFile;
    view_.services.clear();
    EXPECT_EQ(
        Table(),
        "No service runs\n"
        "Queue: none\n"
        "Configuration /etc/pins.json: cannot be read\n"
        "\n"
        "VOLUME         FILES  REQUESTS    MARKED      HELD       SSD  OF DEVICE     STATE\n"
        "/volume9           -         -         -         -         -  -             not mounted\n");
}

TEST_F(StatusShowTest, WithoutVolumesThereIsNoTable) {
    view_.volumes.clear();
    view_.storedRequests = 1;
    view_.queue.state.messages = 1;
    EXPECT_EQ(Table(), "Service 100: receiver waiting, worker busy, configuration /etc/pins.json\n"
                       "Queue 32768 of user 0: 1 message waiting\n"
                       "Configuration /etc/pins.json: 1 request stored\n");
}

TEST_F(StatusShowTest, AQueueThatMayNotBeLookedAtIsNotNone) {
    view_.queue.cause = MsgQueueCause::NotAllowed;
    EXPECT_EQ(Line("Queue"), "Queue: unknown");
    for (const MsgQueueCause cause :
         {MsgQueueCause::NoKeyFile, MsgQueueCause::NoKey, MsgQueueCause::NoQueue}) {
        view_.queue.cause = cause;
        EXPECT_EQ(Line("Queue"), "Queue: none");
    }
}

TEST_F(StatusShowTest, AVolumesStateIsTheFirstThatHolds) {
    Volume &volume = world_.volume;
    EXPECT_EQ(State(), "pinning");
    volume.held = true;
    EXPECT_EQ(State(), "held");
    volume.held = std::nullopt;
    volume.driverHasBitmap = false;
    EXPECT_EQ(State(), "no bitmap in the driver");
    volume.supportsPin = false;
    EXPECT_EQ(State(), "cannot pin");
    volume.supportsPin = std::nullopt;
    EXPECT_EQ(State(), "unknown");
    volume.hasCache = false;
    EXPECT_EQ(State(), "no cache");
    volume.isMounted = false;
    EXPECT_EQ(State(), "not mounted");
}

// The driver's word that it could not be asked is no "no".
TEST_F(StatusShowTest, ADriverThatDoesNotAnswerHasAnUnknownState) {
    world_.volume.driverHasBitmap = std::nullopt;
    EXPECT_EQ(State(), "unknown");
}

TEST_F(StatusShowTest, ColourMarksWhatHasEndedAndTheHeadings) {
    view_.services[0].receiver = ThreadLook::Ended;
    view_.services[0].worker = std::nullopt;
    const std::string text = Table(true);
    EXPECT_EQ(text.find("Service 100: receiver \033[31mended\033[0m, worker unknown, conf"), 0U)
        << text;
    EXPECT_NE(text.find("\n\033[1mVOLUME "), std::string::npos);
    view_.services.clear();
    EXPECT_EQ(Table(true).compare(0, 25, "\033[33mNo service runs\033[0m\n"), 0);
}

TEST_F(StatusShowTest, NamesCannotForgeALine) {
    view_.configPath = "/etc/a\nb";
    view_.services[0].config = "/etc/\x1b[2J";
    world_.volume.mountPath = "/v\n";
    EXPECT_EQ(Line("Service"),
              "Service 100: receiver waiting, worker busy, configuration /etc/\\x1b[2J");
    EXPECT_EQ(Line("Configuration"), "Configuration /etc/a\\x0ab: 2 requests stored");
    EXPECT_EQ(Line("/v\\x0a ").substr(0, 7), "/v\\x0a ");
}
} // namespace vesk
