#include "space/space.h"

#include "base/malloc_text.h"
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <cstring>
#include <gtest/gtest.h>

namespace vesk {
namespace {
const char kNone[] = "(none)";

std::string Taken(char *text) {
    const MallocText owner(text);
    return text == nullptr ? kNone : text;
}

std::string ReferencePathOf(const char *uuid) {
    return Taken(SpaceGetReferencePath(uuid));
}
std::string DevicePathOf(const char *referencePath) {
    return Taken(SpaceGetDevicePath(referencePath));
}
std::string UuidOf(const char *referencePath) {
    return Taken(SpaceGetUUID(referencePath));
}

class SpaceTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeAppliance::spaces = {{"/dev/space1", "/volume1", "uuid-1"},
                                 {"/dev/space10", "/volume10", "uuid-10"},
                                 {"/dev/space2", "/volume2", "uuid-2"}};
    }
};
} // namespace

TEST_F(SpaceTest, IsFoundByUuidAndByReferencePath) {
    CapturedLog log;
    EXPECT_EQ(ReferencePathOf("uuid-2"), "/volume2");
    EXPECT_EQ(DevicePathOf("/volume2"), "/dev/space2");
    EXPECT_EQ(UuidOf("/volume2"), "uuid-2");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceTest, ProperPrefixAndLongerTextDoNotMatch) {
    CapturedLog log;
    for (const char *uuid : {"uuid", "uuid-", "uuid-100", ""}) {
        EXPECT_EQ(ReferencePathOf(uuid), kNone);
    }
    for (const char *path : {"/volume", "/volume100", "/volume1/", ""}) {
        EXPECT_EQ(DevicePathOf(path), kNone);
        EXPECT_EQ(UuidOf(path), kNone);
    }
    EXPECT_EQ(ReferencePathOf("uuid-10"), "/volume10");
    EXPECT_EQ(DevicePathOf("/volume10"), "/dev/space10");
    EXPECT_EQ(log.Text(), ""); // not found is no error
}

TEST_F(SpaceTest, FirstMatchInListOrderWins) {
    CapturedLog log;
    FakeAppliance::spaces = {{"/dev/first", "/volume1", "uuid-1"},
                             {"/dev/second", "/volume1", "uuid-2"}};
    EXPECT_EQ(DevicePathOf("/volume1"), "/dev/first");
    EXPECT_EQ(UuidOf("/volume1"), "uuid-1");
}

TEST_F(SpaceTest, EveryLookupAsksForScope1) {
    CapturedLog log;
    ReferencePathOf("uuid-1");
    EXPECT_EQ(FakeAppliance::enumScope, 1);
    FakeAppliance::enumScope = 0;
    DevicePathOf("/volume1");
    EXPECT_EQ(FakeAppliance::enumScope, 1);
    FakeAppliance::enumScope = 0;
    UuidOf("/volume1");
    EXPECT_EQ(FakeAppliance::enumScope, 1);
}

TEST_F(SpaceTest, EveryLookupEnumeratesAfresh) {
    CapturedLog log;
    EXPECT_EQ(UuidOf("/volume3"), kNone);
    FakeAppliance::spaces.push_back({"/dev/space3", "/volume3", "uuid-3"});
    EXPECT_EQ(UuidOf("/volume3"), "uuid-3");
}

TEST_F(SpaceTest, NoSpaceAtAllIsNoError) {
    CapturedLog log;
    FakeAppliance::spaces.clear();
    EXPECT_EQ(ReferencePathOf("uuid-1"), kNone);
    EXPECT_EQ(DevicePathOf("/volume1"), kNone);
    EXPECT_EQ(UuidOf("/volume1"), kNone);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceTest, FailedEnumerationIsAnErrorAndTheListIsReleased) {
    FakeAppliance::enumResult = -1;
    CapturedLog log(2);
    EXPECT_EQ(ReferencePathOf("uuid-1"), kNone);
    EXPECT_EQ(DevicePathOf("/volume1"), kNone);
    EXPECT_EQ(UuidOf("/volume1"), kNone);
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"SpaceGetReferencePath() [N] : ***** Can't enum spaces",
                                        "SpaceGetDevicePath() [N] : ***** Can't enum spaces",
                                        "SpaceGetUUID() [N] : ***** Can't enum spaces"}));
}

TEST_F(SpaceTest, OnlyANegativeEnumerationResultIsAFailure) {
    CapturedLog log;
    FakeAppliance::enumResult = 3;
    EXPECT_EQ(UuidOf("/volume1"), "uuid-1");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceTest, SpaceWhoseUuidCannotBeReadIsAnErrorAndDoesNotMatch) {
    CapturedLog log(2);
    FakeAppliance::spaces[0].uuid = "";
    EXPECT_EQ(ReferencePathOf("uuid-2"), "/volume2");
    EXPECT_EQ(log.Messages(), (std::vector<std::string>{
                                  "SpaceGetReferencePath() [N] : ***** Get space uuid failed",
                                  "SpaceGetReferencePath() [N]: Get reference path = /volume2"}));
    EXPECT_EQ(ReferencePathOf(""), kNone);
    EXPECT_EQ(UuidOf("/volume1"), kNone);
}

TEST_F(SpaceTest, MissingReferencePathEndsTheDevicePathLookup) {
    CapturedLog log(2);
    FakeAppliance::spaces[1].referencePath = "";
    EXPECT_EQ(DevicePathOf("/volume2"), kNone);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{
                  "SpaceGetDevicePath() [N] : ***** Reference path should not be null"});
    EXPECT_EQ(DevicePathOf("/volume1"), "/dev/space1"); // found before it
}

TEST_F(SpaceTest, MissingReferencePathDoesNotHinderTheOtherLookups) {
    CapturedLog log;
    FakeAppliance::spaces[0].referencePath = "";
    EXPECT_EQ(UuidOf("/volume2"), "uuid-2");
    EXPECT_EQ(ReferencePathOf("uuid-1"), "");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceTest, ResultsAreToldAtLevel2) {
    CapturedLog log(2);
    ReferencePathOf("uuid-1");
    DevicePathOf("/volume1");
    UuidOf("/volume1");
    ReferencePathOf("uuid-9");
    DevicePathOf("/volume9");
    UuidOf("/volume9");
    EXPECT_EQ(log.Messages(), (std::vector<std::string>{
                                  "SpaceGetReferencePath() [N]: Get reference path = /volume1",
                                  "SpaceGetDevicePath() [N]: Get device path = /dev/space1",
                                  "SpaceGetUUID() [N]: Get UUID = uuid-1",
                                  "SpaceGetReferencePath() [N]: Get reference path = (null)",
                                  "SpaceGetDevicePath() [N]: Get device path = (null)",
                                  "SpaceGetUUID() [N]: Get UUID = (null)"}));
}

TEST_F(SpaceTest, EveryLookupTellsItsCause) {
    CapturedLog log;
    SpaceCause cause = SpaceCause::NoPinSupport;
    Taken(SpaceGetReferencePath("uuid-2", &cause));
    EXPECT_EQ(cause, SpaceCause::Found);
    Taken(SpaceGetReferencePath("uuid-3", &cause));
    EXPECT_EQ(cause, SpaceCause::NoSpace);
    Taken(SpaceGetDevicePath("/volume2", &cause));
    EXPECT_EQ(cause, SpaceCause::Found);
    Taken(SpaceGetDevicePath("/volume3", &cause));
    EXPECT_EQ(cause, SpaceCause::NoSpace);
    Taken(SpaceGetUUID("/volume2", &cause));
    EXPECT_EQ(cause, SpaceCause::Found);
    Taken(SpaceGetUUID("/volume3", &cause));
    EXPECT_EQ(cause, SpaceCause::NoSpace);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceTest, CauseOfAFailureIsToldBesideItsMessage) {
    CapturedLog log;
    SpaceCause cause = SpaceCause::Found;
    FakeAppliance::spaces[0].uuid = "";
    FakeAppliance::spaces[1].referencePath = "";
    EXPECT_EQ(Taken(SpaceGetUUID("/volume1", &cause)), kNone);
    EXPECT_EQ(cause, SpaceCause::NoUuid);
    EXPECT_EQ(Taken(SpaceGetReferencePath("uuid-1", &cause)), kNone);
    EXPECT_EQ(cause, SpaceCause::NoSpace);
    EXPECT_EQ(Taken(SpaceGetDevicePath("/volume2", &cause)), kNone);
    EXPECT_EQ(cause, SpaceCause::NoReferencePath);
    FakeAppliance::enumResult = -1;
    for (const auto &lookUp : {SpaceGetReferencePath, SpaceGetDevicePath, SpaceGetUUID}) {
        cause = SpaceCause::Found;
        EXPECT_EQ(Taken(lookUp("/volume2", &cause)), kNone);
        EXPECT_EQ(cause, SpaceCause::CannotEnumerate);
    }
    EXPECT_EQ(log.Text(), "tool: Get space uuid failed\n"
                          "tool: Reference path should not be null\n"
                          "tool: Can't enum spaces\ntool: Can't enum spaces\n"
                          "tool: Can't enum spaces\n");
}

TEST_F(SpaceTest, TakenTextHasAnOwnerAndAMissingOneAMessageAtTheCallersPlace) {
    CapturedLog log(2);
    MallocText owner;
    EXPECT_TRUE(SpaceTake(strdup("text"), &owner, "No text", {"Caller", 1}));
    EXPECT_STREQ(owner.get(), "text");
    EXPECT_EQ(log.Text(), "");
    EXPECT_FALSE(SpaceTake(nullptr, &owner, "No text", {"Caller", 1}));
    EXPECT_EQ(owner, nullptr);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{"Caller() [N] : ***** No text"});
}

TEST_F(SpaceTest, AllAreListedInThePlatformsOrder) {
    FakeAppliance::spaces[1].uuid.clear();
    FakeAppliance::spaces[2].referencePath.clear();
    CapturedLog log;
    SpaceCause cause = SpaceCause::NoSpace;
    const std::vector<SpaceEntry> spaces = SpaceList(&cause);
    EXPECT_EQ(cause, SpaceCause::Found);
    std::vector<std::string> texts;
    for (const SpaceEntry &space : spaces) {
        texts.push_back(space.devicePath + " " + space.referencePath + " " + space.uuid);
    }
    EXPECT_EQ(texts, (std::vector<std::string>{"/dev/space1 /volume1 uuid-1",
                                               "/dev/space10 /volume10 ", "/dev/space2  uuid-2"}));
    EXPECT_EQ(FakeAppliance::enumScope, 1);
    EXPECT_EQ(log.Text(), "");
    FakeAppliance::spaces.clear();
    EXPECT_EQ(SpaceList().size(), 0U);
}

TEST_F(SpaceTest, OfAListingThatFailsWhatWasListedIsGivenAllTheSame) {
    FakeAppliance::enumResult = -1;
    CapturedLog log(2);
    SpaceCause cause = SpaceCause::Found;
    EXPECT_EQ(SpaceList(&cause).size(), 3U);
    EXPECT_EQ(cause, SpaceCause::CannotEnumerate);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"SpaceList() [N] : ***** Can't enum spaces"});
    FakeAppliance::spaces.clear();
    EXPECT_EQ(SpaceList().size(), 0U);
}
} // namespace vesk
