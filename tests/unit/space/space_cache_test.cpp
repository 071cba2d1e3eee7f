#include "space/space_cache.h"

#include "base/malloc_text.h"
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include "vesk/flash_cache.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;

class SpaceCacheTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    }
    static FakeCache &Cache() { return FakeAppliance::caches[0]; }
};

std::string Text(char *text) {
    const MallocText owner(text);
    return text == nullptr ? "(none)" : text;
}
} // namespace

TEST_F(SpaceCacheTest, ConfigHoldsTheSsdPath) {
    CapturedLog log(3);
    VESKFlashCacheConfig *config = SpaceGetCacheConfig("uuid-1");
    ASSERT_NE(config, nullptr);
    EXPECT_STREQ(config->ssdPath, "/dev/ssd1");
    VESKFlashCacheConfigFree(config);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, ConfigOfASpaceWithoutCacheIsNullAndSilentAtLevel1) {
    CapturedLog silent;
    EXPECT_EQ(SpaceGetCacheConfig("uuid-9"), nullptr);
    EXPECT_EQ(silent.Text(), "");
    CapturedLog log(2);
    EXPECT_EQ(SpaceGetCacheConfig("uuid-9"), nullptr);
    EXPECT_EQ(log.Messages(), Messages{"SpaceGetCacheConfig() [N]: Can't find cache in the config "
                                       "file. Space UUID is (uuid-9)"});
}

TEST_F(SpaceCacheTest, FailedConfigLookupIsAnError) {
    FakeAppliance::configResult = -1;
    CapturedLog log(2);
    EXPECT_EQ(SpaceGetCacheConfig("uuid-1"), nullptr);
    EXPECT_EQ(log.Messages(),
              Messages{"SpaceGetCacheConfig() [N] : ***** Fail to get SSD cache config"});
}

TEST_F(SpaceCacheTest, EveryOtherConfigResultIsSuccess) {
    for (const int result : {-2, 1, 2}) {
        FakeAppliance::configResult = result;
        CapturedLog log;
        EXPECT_EQ(SpaceHasCache("uuid-1"), 1);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(SpaceCacheTest, PointerThatAResultOf0LeavesIsReturned) {
    CapturedLog log(2);
    FakeAppliance::configResult = 0;
    VESKFlashCacheConfig *config = SpaceGetCacheConfig("uuid-1");
    ASSERT_NE(config, nullptr);
    VESKFlashCacheConfigFree(config);
    EXPECT_EQ(log.Messages(), Messages{"SpaceGetCacheConfig() [N]: Can't find cache in the config "
                                       "file. Space UUID is (uuid-1)"});
}

TEST_F(SpaceCacheTest, HasCacheSaysSoWithA0AtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCache("uuid-1"), 1);
    EXPECT_EQ(log.Messages(), Messages{"SpaceHasCache() [N]: Check Space (uuid-1) ret=0"});
}

TEST_F(SpaceCacheTest, HasNoCachePrintsNothingAtLevel1) {
    CapturedLog log;
    EXPECT_EQ(SpaceHasCache("uuid-9"), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, HasNoCacheSaysSoAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCache("uuid-9"), 0);
    EXPECT_EQ(LastOf(log.Messages()),
              "SpaceHasCache() [N]: Space (uuid-9) doesn't be found in the config");
}

TEST_F(SpaceCacheTest, PrefixOfAUuidHasNoCache) {
    CapturedLog log;
    EXPECT_EQ(SpaceHasCache("uuid-"), 0);
    EXPECT_EQ(SpaceHasCache("uuid-11"), 0);
}

TEST_F(SpaceCacheTest, SsdPathIsCopiedAndItsAbsenceIsSilent) {
    CapturedLog log;
    EXPECT_EQ(Text(SpaceGetCacheSsdPath("uuid-1")), "/dev/ssd1");
    EXPECT_EQ(Text(SpaceGetCacheSsdPath("uuid-9")), "(none)");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, CachePathIsThatOfTheCacheDevice) {
    CapturedLog log;
    EXPECT_EQ(Text(SpaceGetCachePath("uuid-1")), "/dev/mapper/cachedev_0");
    EXPECT_EQ(Text(SpaceGetCachePathByMountPath("/volume1")), "/dev/mapper/cachedev_0");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, CachePathIsBoundedByItsBuffer) {
    CapturedLog log;
    Cache().cachePath = std::string(600, 'c');
    EXPECT_EQ(Text(SpaceGetCachePath("uuid-1")), std::string(511, 'c'));
}

TEST_F(SpaceCacheTest, CachePathWithoutCacheIsAnError) {
    CapturedLog log;
    EXPECT_EQ(Text(SpaceGetCachePath("uuid-9")), "(none)");
    EXPECT_EQ(log.Text(), "tool: Can't get cache's ssd path\n");
}

TEST_F(SpaceCacheTest, CachePathFailsUnlessTheLibraryAnswers1) {
    for (const int result : {0, -1, 2}) {
        Cache().cachePathResult = result;
        CapturedLog log(2);
        EXPECT_EQ(Text(SpaceGetCachePath("uuid-1")), "(none)");
        EXPECT_EQ(log.Messages(), Messages{"SpaceGetCachePath() [N] : ***** Can't get cache path"});
    }
}

TEST_F(SpaceCacheTest, CachePathByMountPathNamesTheStepThatFailed) {
    {
        CapturedLog log;
        EXPECT_EQ(Text(SpaceGetCachePathByMountPath("/volume9")), "(none)");
        EXPECT_EQ(log.Text(), "tool: Can't get space uuid from reference path (/volume9)\n");
    }
    FakeAppliance::caches.clear();
    CapturedLog log(2);
    EXPECT_EQ(Text(SpaceGetCachePathByMountPath("/volume1")), "(none)");
    EXPECT_EQ(log.Messages(),
              (Messages{"SpaceGetUUID() [N]: Get UUID = uuid-1",
                        "SpaceGetCacheConfig() [N]: Can't find cache in the config file. Space "
                        "UUID is (uuid-1)",
                        "SpaceGetCachePath() [N] : ***** Can't get cache's ssd path",
                        "SpaceGetCachePathByMountPath() [N] : ***** Can't get cache path"}));
}

TEST_F(SpaceCacheTest, SupportsPinWhenStateAndSupportPinAre1) {
    CapturedLog log;
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 1);
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, StateOtherThan1MeansNoPinSupport) {
    CapturedLog log;
    for (const int state : {0, 2, -1}) {
        Cache().state = state;
        EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 0);
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, SupportPinOtherThan1MeansNoPinSupport) {
    CapturedLog log;
    for (const int supportPin : {0, 2, -1}) {
        Cache().supportPin = supportPin;
        EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 0);
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceCacheTest, CacheThatIsBeingBuiltHasNoPinSupportAndNoErrorLine) {
    for (const int result : {0, -1}) {
        Cache().statResult = result;
        CapturedLog log;
        EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 0);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(SpaceCacheTest, CacheThatIsBeingBuiltIsToldAtLevel2) {
    Cache().statResult = 0;
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"SpaceHasCache() [N]: Check Space (uuid-1) ret=0",
                        "SpaceHasCacheAndSupportPinByUUID() [N]: Failed to get status of "
                        "flashcache, ssd = /dev/ssd1. (Might be due to cache is not estabilied "
                        "yet)"}));
}

TEST_F(SpaceCacheTest, StatusResultAbove1IsSuccess) {
    CapturedLog log;
    Cache().statResult = 5;
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 1);
}

TEST_F(SpaceCacheTest, AnswersAreToldAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 1);
    EXPECT_EQ(log.Messages(),
              (Messages{"SpaceGetUUID() [N]: Get UUID = uuid-1",
                        "SpaceHasCache() [N]: Check Space (uuid-1) ret=0",
                        "SpaceHasCacheAndSupportPinByUUID() [N]: supportPin=1",
                        "SpaceHasCacheAndSupportPin() [N]: Volume (/volume1) support pin"}));
    Cache().supportPin = 0;
    CapturedLog no(2);
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 0);
    EXPECT_EQ(LastOf(no.Messages()), "SpaceHasCacheAndSupportPinByUUID() [N]: supportPin=0");
}

TEST_F(SpaceCacheTest, SpaceWithoutCacheHasNoPinSupport) {
    FakeAppliance::caches.clear();
    CapturedLog silent;
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 0);
    EXPECT_EQ(silent.Text(), "");
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 0);
    EXPECT_EQ(LastOf(log.Messages()), "SpaceHasCacheAndSupportPinByUUID() [N]: Space (UUID = "
                                      "uuid-1) doesn't has cache");
}

TEST_F(SpaceCacheTest, PathThatIsNoVolumeIsAnErrorAndHasNoPinSupport) {
    CapturedLog log(2);
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/home"), 0);
    EXPECT_EQ(LastOf(log.Messages()), "SpaceHasCacheAndSupportPin() [N] : ***** Can't get space "
                                      "uuid from mount path (/home)");
}

TEST_F(SpaceCacheTest, CacheThatVanishesWhileItIsAskedForIsAnErrorAndHasNoPinSupport) {
    int lookups = 0;
    FakeAppliance::onConfigLookup = [&lookups] {
        if (++lookups == 2) {
            FakeAppliance::caches.clear();
        }
    };
    CapturedLog log;
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1"), 0);
    EXPECT_EQ(log.Text(), "tool: Can't get cache's ssd path\n");
}

namespace {
SpaceCause CauseOfCachePath(const char *mountPath = "/volume1") {
    SpaceCause cause = SpaceCause::NoPinSupport;
    const bool found = Text(SpaceGetCachePathByMountPath(mountPath, &cause)) != "(none)";
    EXPECT_EQ(found, cause == SpaceCause::Found);
    return cause;
}

SpaceCause CauseOfPinSupport(const char *mountPath = "/volume1") {
    SpaceCause cause = SpaceCause::NoCachePath;
    const int supportPin = SpaceHasCacheAndSupportPin(mountPath, &cause);
    EXPECT_EQ(supportPin, cause == SpaceCause::Found ? 1 : 0);
    return cause;
}
} // namespace

TEST_F(SpaceCacheTest, LookUpsTellTheCauseOfTheStepThatDecided) {
    CapturedLog log;
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::Found);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::Found);
    EXPECT_EQ(CauseOfCachePath("/volume9"), SpaceCause::NoSpace);
    EXPECT_EQ(CauseOfPinSupport("/volume9"), SpaceCause::NoSpace);
    FakeAppliance::spaces[0].uuid = "";
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::NoUuid);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoUuid);
    FakeAppliance::enumResult = -1;
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::CannotEnumerate);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::CannotEnumerate);
}

TEST_F(SpaceCacheTest, LookUpsTellWhatTheCacheLacks) {
    CapturedLog log;
    Cache().cachePathResult = 0;
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::NoCachePath);
    Cache().supportPin = 0;
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoPinSupport);
    Cache().state = 0;
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::CacheNotUp);
    Cache().statResult = 0;
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoCacheStatus);
    Cache().noSsdPath = true;
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::NoSsdPath);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoSsdPath);
    FakeAppliance::configResult = -1;
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::NoCacheConfig);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoCacheConfig);
    FakeAppliance::configResult = 1;
    FakeAppliance::caches.clear();
    EXPECT_EQ(CauseOfCachePath(), SpaceCause::NoCache);
    EXPECT_EQ(CauseOfPinSupport(), SpaceCause::NoCache);
}

TEST_F(SpaceCacheTest, EveryLookUpByUuidTellsItsCause) {
    CapturedLog log;
    SpaceCause cause = SpaceCause::NoSpace;
    EXPECT_EQ(SpaceGetCacheConfig("uuid-9", &cause), nullptr);
    EXPECT_EQ(cause, SpaceCause::NoCache);
    EXPECT_EQ(SpaceHasCache("uuid-1", &cause), 1);
    EXPECT_EQ(cause, SpaceCause::Found);
    EXPECT_EQ(SpaceHasCache("uuid-9", &cause), 0);
    EXPECT_EQ(cause, SpaceCause::NoCache);
    EXPECT_EQ(Text(SpaceGetCacheSsdPath("uuid-1", &cause)), "/dev/ssd1");
    EXPECT_EQ(cause, SpaceCause::Found);
    EXPECT_EQ(Text(SpaceGetCachePath("uuid-9", &cause)), "(none)");
    EXPECT_EQ(cause, SpaceCause::NoCache);
    EXPECT_EQ(SpaceHasCacheAndSupportPinByUUID("uuid-1", &cause), 1);
    EXPECT_EQ(cause, SpaceCause::Found);
}
} // namespace vesk
