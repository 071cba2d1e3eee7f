#include "vesk/flash_cache.h"

#include "tests/support/fake_driver.h"
#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>

namespace vesk {
namespace {
// Configures one cache each for the spaces "u1" and "u2", with the SSDs "ssd1" and "ssd2".
class FlashCache : public testing::Test {
protected:
    void SetUp() override { Configure("/nonexistent/cache2"); }
    void TearDown() override { unsetenv("VESK_FLASHCACHE_CONFIG"); }

    void Configure(const std::string &secondCachePath) const {
        ConfigureText(R"({"caches":[)"
                      R"({"spaceUuid":"u1","ssdPath":"ssd1","cachePath":"/nonexistent/cache1"},)"
                      R"({"spaceUuid":"u2","ssdPath":"ssd2","cachePath":")" +
                      secondCachePath + R"("}]})");
    }
    void ConfigureText(const std::string &text) const {
        setenv("VESK_FLASHCACHE_CONFIG", folder.FileMake("config.json", text).c_str(), 1);
    }

    // The call's result and, behind a blank, what it found.
    static std::string ConfigGet(const char *spaceUuid) {
        VESKFlashCacheConfigQuery query = {};
        query.kind = 2;
        query.spaceUuid = spaceUuid;
        VESKFlashCacheConfig old = {};
        VESKFlashCacheConfig *config = &old;
        const int result = VESKFlashCacheConfigTmpGet(&query, &config);
        const std::string found = config == nullptr ? "null" : config->ssdPath;
        VESKFlashCacheConfigFree(config);
        return std::to_string(result) + " " + found;
    }
    static std::string StatGet(const char *ssdPath) {
        const VESKFlashCacheStatQuery query = {3, ssdPath};
        VESKFlashCacheStat old = {};
        VESKFlashCacheStat *stat = &old;
        const int result = VESKFlashCacheStatGet(&query, &stat);
        std::string found = "null";
        if (stat != nullptr) {
            found =
                "state " + std::to_string(stat->state) + " pin " + std::to_string(stat->supportPin);
        }
        VESKFlashCacheStatFree(&stat);
        EXPECT_EQ(stat, nullptr);
        return std::to_string(result) + " " + found;
    }
    static std::string CachePathGet(const char *ssdPath, size_t size) {
        std::array<char, 33> buffer = {};
        std::fill_n(buffer.begin(), 32, '#');
        const int result = VESKFlashcacheGetCachePath(ssdPath, buffer.data(), size);
        return std::to_string(result) + " " + buffer.data();
    }

    const TestFolder folder;
};

TEST_F(FlashCache, ConfigBySpaceUuid) {
    EXPECT_EQ(ConfigGet("u1"), "1 ssd1");
    EXPECT_EQ(ConfigGet("u2"), "1 ssd2");
    for (const char *uuid : {"u", "u11", "U1", "", "ssd1"}) {
        EXPECT_EQ(ConfigGet(uuid), "0 null") << uuid;
    }
}

TEST_F(FlashCache, ConfigArguments) {
    VESKFlashCacheConfigQuery query = {};
    query.kind = 2;
    query.spaceUuid = "u1";
    EXPECT_EQ(VESKFlashCacheConfigTmpGet(&query, nullptr), -1);
    VESKFlashCacheConfig old = {};
    VESKFlashCacheConfig *config = &old;
    EXPECT_EQ(VESKFlashCacheConfigTmpGet(nullptr, &config), -1);
    EXPECT_EQ(config, nullptr);
    EXPECT_EQ(ConfigGet(nullptr), "-1 null");
    for (const int32_t kind : {0, 1, 3, -2}) {
        query.kind = kind;
        config = &old;
        EXPECT_EQ(VESKFlashCacheConfigTmpGet(&query, &config), -1) << kind;
        EXPECT_EQ(config, nullptr);
    }
    VESKFlashCacheConfigFree(nullptr);
}

TEST_F(FlashCache, StatOfAnAbsentCacheDevice) {
    EXPECT_EQ(StatGet("ssd1"), "1 state 0 pin 0");
    EXPECT_EQ(StatGet("ssd"), "0 null");
    EXPECT_EQ(StatGet("u1"), "0 null");
}

TEST_F(FlashCache, StatOfACacheWithoutPinInterface) {
    Configure(folder.FileMake("cachedev", "text"));
    EXPECT_EQ(StatGet("ssd2"), "1 state 1 pin 0");
}

TEST_F(FlashCache, StatOfACacheWithPinInterface) {
    const FakeDriver driver("flashcache", true);
    if (!driver.skipReason.empty()) {
        GTEST_SKIP() << driver.skipReason;
    }
    Configure(driver.devicePath);
    EXPECT_EQ(StatGet("ssd2"), "1 state 1 pin 1");
    EXPECT_EQ(StatGet("ssd1"), "1 state 0 pin 0");
}

// The words that are read at fixed places of the record.
TEST_F(FlashCache, StatWords) {
    Configure(folder.FileMake("cachedev", "text"));
    const VESKFlashCacheStatQuery query = {3, "ssd2"};
    VESKFlashCacheStat *stat = nullptr;
    ASSERT_EQ(VESKFlashCacheStatGet(&query, &stat), 1);
    std::array<int32_t, 23> words = {};
    std::memcpy(words.data(), stat, sizeof(words));
    VESKFlashCacheStatFree(&stat);
    std::array<int32_t, 23> expected = {};
    expected[2] = 1;
    EXPECT_EQ(words, expected);
}

TEST_F(FlashCache, StatArguments) {
    VESKFlashCacheStatQuery query = {3, "ssd1"};
    EXPECT_LT(VESKFlashCacheStatGet(&query, nullptr), 1);
    VESKFlashCacheStat old = {};
    VESKFlashCacheStat *stat = &old;
    EXPECT_LT(VESKFlashCacheStatGet(nullptr, &stat), 1);
    EXPECT_EQ(stat, nullptr);
    EXPECT_EQ(StatGet(nullptr), "-1 null");
    for (const int32_t kind : {0, 2, 4}) {
        query.kind = kind;
        stat = &old;
        EXPECT_LT(VESKFlashCacheStatGet(&query, &stat), 1) << kind;
        EXPECT_EQ(stat, nullptr);
    }
    VESKFlashCacheStatFree(nullptr);
    VESKFlashCacheStatFree(&stat);
}

TEST_F(FlashCache, CachePath) {
    EXPECT_EQ(CachePathGet("ssd1", 32), "1 /nonexistent/cache1");
    const size_t length = std::strlen("/nonexistent/cache1");
    EXPECT_EQ(CachePathGet("ssd1", length + 1), "1 /nonexistent/cache1");
    const std::string untouched(32, '#');
    EXPECT_EQ(CachePathGet("ssd1", length), "0 " + untouched) << "no room for the NUL";
    EXPECT_EQ(CachePathGet("ssd1", 0), "0 " + untouched);
    EXPECT_EQ(CachePathGet("ssd", 32), "0 " + untouched);
    EXPECT_EQ(CachePathGet(nullptr, 32), "0 " + untouched);
    EXPECT_EQ(VESKFlashcacheGetCachePath("ssd1", nullptr, 32), 0);
}

TEST_F(FlashCache, MissingConfigurationHasNoCaches) {
    setenv("VESK_FLASHCACHE_CONFIG", "/nonexistent/config.json", 1);
    EXPECT_EQ(ConfigGet("u1"), "0 null");
    EXPECT_EQ(StatGet("ssd1"), "0 null");
    EXPECT_EQ(CachePathGet("ssd1", 32), "0 " + std::string(32, '#'));
}

TEST_F(FlashCache, BrokenConfigurationIsAnError) {
    for (const std::string &text :
         {std::string("{"), std::string(R"({"caches":[7]})"), std::string(300000, '[')}) {
        ConfigureText(text);
        EXPECT_EQ(ConfigGet("u1"), "-1 null");
        EXPECT_EQ(StatGet("ssd1"), "-1 null");
        EXPECT_EQ(CachePathGet("ssd1", 32), "0 " + std::string(32, '#'));
    }
}

TEST_F(FlashCache, FirstOfTwoEntriesCounts) {
    ConfigureText(R"({"caches":[{"spaceUuid":"u","ssdPath":"a","cachePath":"c"},)"
                  R"({"spaceUuid":"u","ssdPath":"b","cachePath":"d"}]})");
    EXPECT_EQ(ConfigGet("u"), "1 a");
}
} // namespace
} // namespace vesk
