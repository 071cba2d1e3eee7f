#include "model/world.h"

#include "model/service_look.h"
#include "tests/support/private_world.h"
#include "tests/unit/model/volume_fixture.h"

namespace vesk {
namespace {
class WorldTest : public VolumeTest {
protected:
    World Look(const std::string &document) {
        WriteWhole(config_, document);
        return WorldLook(config_);
    }
    // The mount paths, the wanted ones' alike.
    static Texts Paths(const World &world) {
        Texts paths;
        for (const WorldVolume &volume : world.volumes) {
            paths.push_back(volume.volume.mountPath);
        }
        return paths;
    }
    static Texts Wanted(World &world, const Texts &asked) {
        Texts paths;
        for (const WorldVolume *volume : WorldVolumesWanted(world, asked)) {
            paths.push_back(volume->volume.mountPath);
        }
        return paths;
    }
    const std::string config_ = folder_.Path("pins.json");
};
} // namespace

TEST_F(WorldTest, AMissingConfigurationIsAnEmptyOne) {
    World world = WorldLook(config_);
    EXPECT_EQ(world.configPath, config_);
    EXPECT_TRUE(world.isConfigKnown);
    EXPECT_EQ(world.storedRequests, 0U);
    EXPECT_EQ(Paths(world), Texts{mountPath_});
    EXPECT_TRUE(world.volumes[0].volume.hasCache);
    EXPECT_EQ(world.volumes[0].known.recorded, 0U);
    EXPECT_EQ(TextsOf(world.errors), Texts{});
}

TEST_F(WorldTest, VolumesHaveTheirRecordsAndRequests) {
    World world = Look(R"({"volumes": {")" + mountPath_ + R"(": {"files": {"5": "a", "6": "b"}}},
        "requestQueue": ["3"], "requests": {"3": {"type": "pinFiles", "mountPath": ")" +
                       mountPath_ + R"(", "data": "c#7"}}})");
    ASSERT_EQ(world.volumes.size(), 1U);
    EXPECT_EQ(world.storedRequests, 1U);
    EXPECT_EQ(world.volumes[0].known.recorded, 2U);
    EXPECT_EQ(world.volumes[0].known.requests, 1U);
    EXPECT_EQ(world.volumes[0].known.files.size(), 3U);
    EXPECT_TRUE(world.volumes[0].volume.isMounted);
    EXPECT_EQ(TextsOf(world.errors), Texts{});
}

TEST_F(WorldTest, RequestsThatWaitInTheQueueAreKnownAndStay) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    const int id = MsgQueueGet(kMessageKeyFile);
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, mountPath_, mountPath_ + "/a")));
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, "/volume8", "/volume8/a")));
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestAddPendingSpace, "/volume9")));
    World world = WorldLook(config_);
    EXPECT_EQ(Paths(world), (Texts{mountPath_, "/volume8"}));
    EXPECT_EQ(world.volumes[0].known.files.at(0).stored, kRequestPinFiles);
    EXPECT_EQ(world.volumes[0].known.sent, 1U);
    EXPECT_EQ(world.volumes[0].known.requests, 0U);
    EXPECT_TRUE(world.areSentKnown);
    EXPECT_EQ(CountMessages(id), 3);
    EmptyPrivateWorld();
}

TEST_F(WorldTest, AQueueThatCannotBeSeenLeavesNothingWhole) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    ASSERT_NE(MsgQueueGet(kMessageKeyFile), -1);
    FakeLibc::Fail("msgctl", EACCES);
    const World world = WorldLook(config_);
    EXPECT_FALSE(world.areSentKnown);
    EXPECT_FALSE(world.volumes[0].known.isWhole);
    EXPECT_EQ(TextsOf(world.errors), Texts{std::string(kMessageKeyFile) +
                                           ": the requests that wait in the queue cannot be seen"});
    EmptyPrivateWorld();
}

TEST_F(WorldTest, WhatIsNamedAndNotMountedIsThereToo) {
    World world = Look(R"({"volumes": {"/volume9": {"files": {"5": "a"}}, "/volume8": {}},
        "requestQueue": ["3"],
        "requests": {"3": {"type": "reloadPinBlocks", "mountPath": "/a", "data": null}}})");
    EXPECT_EQ(Paths(world), (Texts{"/a", mountPath_, "/volume8", "/volume9"}));
    EXPECT_FALSE(world.volumes[0].volume.isMounted);
    EXPECT_EQ(world.volumes[0].known.requests, 1U);
    EXPECT_FALSE(world.volumes[3].volume.isMounted);
    EXPECT_EQ(world.volumes[3].known.recorded, 1U);
    EXPECT_TRUE(world.volumes[1].volume.isMounted);
}

TEST_F(WorldTest, AVolumeWithoutACacheIsThereOnlyWhereItIsNamed) {
    FakeAppliance::spaces.push_back({"/dev/space2", "/plain", "uuid-2"});
    FakeAppliance::spaces.push_back({"/dev/space3", "/named", "uuid-3"});
    World world = Look(R"({"volumes": {"/named": {}}})");
    EXPECT_EQ(Paths(world), (Texts{"/named", mountPath_}));
    EXPECT_FALSE(world.volumes[0].volume.hasCache);
    EXPECT_TRUE(world.volumes[0].volume.isMounted);
    EXPECT_EQ(world.withoutCache, Texts{"/plain"});
}

TEST_F(WorldTest, AVolumeWithRecordsWhoseUuidCannotBeReadIsUnknown) {
    FakeAppliance::spaces.push_back({"/dev/space2", "/named", ""});
    FakeAppliance::spaces.push_back({"/dev/space3", "/other", ""});
    World world = WorldLook(config_);
    Wanted(world, {});
    EXPECT_FALSE(world.errors.isUnknown);
    world = Look(R"({"volumes": {"/named": {}}})");
    EXPECT_FALSE(world.errors.isUnknown);
    Wanted(world, {mountPath_}); // the trouble of another volume is none of this one's
    EXPECT_FALSE(world.errors.isUnknown);
    Wanted(world, {});
    EXPECT_TRUE(world.errors.isUnknown);
}

TEST_F(WorldTest, ASpaceThatIsNotMountedIsLeftOut) {
    FakeAppliance::spaces.push_back({"/dev/space2", "", "uuid-1"});
    World world = WorldLook(config_);
    EXPECT_EQ(Paths(world), Texts{mountPath_});
    EXPECT_EQ(world.withoutCache, Texts{});
}

TEST_F(WorldTest, AConfigurationThatCannotBeReadLeavesTheVolumes) {
    for (const char *text : {"{", "[]", ""}) {
        World world = Look(text);
        EXPECT_FALSE(world.isConfigKnown) << text;
        EXPECT_EQ(Paths(world), Texts{mountPath_});
        ASSERT_EQ(world.errors.list.size(), 1U);
        EXPECT_EQ(world.errors.list[0].path, config_);
        EXPECT_TRUE(world.errors.isUnknown);
    }
    EXPECT_EQ(Look("{").errors.list[0].text, "Prase file " + config_ + " error");
    EXPECT_EQ(Look("[]").errors.list[0].text, "Config file (" + config_ + ") is no JSON object");
}

TEST_F(WorldTest, WhatCannotBeUsedOfTheConfigurationIsToldAndNothingUnknown) {
    World world = Look(R"({"volumes": {")" + mountPath_ + R"(": {"files": {"x": "a"}}},
        "requestQueue": ["3"], "requests": {"3": {"type": "pinFiles", "mountPath": ")" +
                       mountPath_ + R"(", "data": "c"}}})");
    Wanted(world, {});
    EXPECT_FALSE(world.volumes[0].known.isWhole);
    EXPECT_TRUE(world.volumes[0].known.isRecordedKnown);
    EXPECT_EQ(TextsOf(world.errors),
              (Texts{config_ + ": volume " + mountPath_ + ": record \"x\" names no file",
                     config_ + ": request 3: Parse file inode from string (c) failed"}));
}

TEST_F(WorldTest, WhatIsOfAnotherTypeIsUnknownAndNotZero) {
    const std::string volume = R"({"volumes": {")" + mountPath_ + R"(": )";
    for (const std::string &text :
         Texts{R"({"volumes": []})", volume + R"({"files": []}}})", volume + "7}}"}) {
        World world = Look(text);
        Wanted(world, {});
        EXPECT_TRUE(world.errors.isUnknown) << text;
        EXPECT_FALSE(world.volumes[0].known.isRecordedKnown) << text;
        EXPECT_EQ(world.storedRequests, 0U);
    }
    World world = Look(R"({"requestQueue": {}})");
    EXPECT_TRUE(world.errors.isUnknown);
    EXPECT_EQ(world.storedRequests, std::nullopt);
    EXPECT_FALSE(world.volumes[0].known.isWhole);
}

TEST_F(WorldTest, SpacesThatCannotBeListedAreToldAndThoseThatWereListedUsed) {
    FakeAppliance::enumResult = -1;
    World world = WorldLook(config_);
    EXPECT_EQ(TextsOf(world.errors), (Texts{": Can't enum spaces", "unknown"}));
    EXPECT_EQ(Paths(world), Texts{mountPath_});
}

TEST_F(WorldTest, AllVolumesAreWantedWhereNoneIsNamed) {
    World world = Look(R"({"volumes": {"/volume9": {}}})");
    EXPECT_EQ(Wanted(world, {}), (Texts{mountPath_, "/volume9"}));
    EXPECT_EQ(TextsOf(world.errors), Texts{"/volume9: is not mounted"});
    EXPECT_EQ(Wanted(world, {"/volume9"}), Texts{"/volume9"});
    EXPECT_EQ(Wanted(world, {"/volume9/", mountPath_ + "//", "/volume9"}),
              (Texts{"/volume9", mountPath_}));
    EXPECT_EQ(TextsOf(world.errors), (Texts{"/volume9: is not mounted", "unknown"}));
}

TEST_F(WorldTest, WhatIsNoVolumeOrHasNoCacheIsToldAndUnknown) {
    FakeAppliance::spaces.push_back({"/dev/space2", "/plain", "uuid-2"});
    FakeAppliance::spaces.push_back({"/dev/space3", "/named", "uuid-3"});
    World world = Look(R"({"volumes": {"/named": {}}})");
    EXPECT_EQ(Wanted(world, {"/plain/", "/gone", "/", "/named", mountPath_}),
              (Texts{"/named", mountPath_}));
    EXPECT_EQ(TextsOf(world.errors), (Texts{"/plain: has no cache", "/gone: is no volume",
                                            "/: is no volume", "/named: has no cache", "unknown"}));
}

TEST_F(WorldTest, AVolumeIsFoundByItsMountPathAlone) {
    const World world = WorldLook(config_);
    EXPECT_EQ(WorldVolumeFind(world, mountPath_), &world.volumes[0]);
    EXPECT_EQ(WorldVolumeFind(world, mountPath_ + "/"), nullptr);
    EXPECT_EQ(WorldVolumeFind(world, ""), nullptr);
}
} // namespace vesk
