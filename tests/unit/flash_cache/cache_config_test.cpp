#include "flash_cache/cache_config.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>

namespace vesk {
namespace {
constexpr char kOne[] =
    R"({"caches":[{"spaceUuid":"u1","ssdPath":"/dev/ssd1","cachePath":"/dev/cache1"}]})";

// Whether a file with this text is read; an unreadable one must leave nothing.
bool Reads(const std::string &text, std::vector<CacheConfigEntry> &entries) {
    const TestFolder folder;
    entries.resize(1);
    const bool isRead = CacheConfigRead(folder.FileMake("config.json", text), entries);
    EXPECT_TRUE(isRead || entries.empty());
    return isRead;
}

bool Reads(const std::string &text) {
    std::vector<CacheConfigEntry> entries;
    return Reads(text, entries);
}

TEST(CacheConfigRead, GivesTheCachesInOrder) {
    std::vector<CacheConfigEntry> entries;
    ASSERT_TRUE(Reads(R"({"comment": [1, {}], "caches": [
        {"spaceUuid": "u1", "ssdPath": "/dev/ssd 1", "cachePath": "/dev/cache1", "note": 1},
        {"cachePath": "/run/c\u00e9", "ssdPath": "/dev/ssd2", "spaceUuid": "u2"}]})",
                      entries));
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0].spaceUuid, "u1");
    EXPECT_EQ(entries[0].ssdPath, "/dev/ssd 1");
    EXPECT_EQ(entries[0].cachePath, "/dev/cache1");
    EXPECT_EQ(entries[1].spaceUuid, "u2");
    EXPECT_EQ(entries[1].ssdPath, "/dev/ssd2");
    EXPECT_EQ(entries[1].cachePath, "/run/c\xc3\xa9");
}

TEST(CacheConfigRead, TakesAFileOfEveryDate) {
    const TestFolder folder;
    const std::string path = folder.FileMake("config.json", kOne);
    for (const int64_t date : kFarDates) {
        DateFile(path, date);
        std::vector<CacheConfigEntry> entries;
        EXPECT_TRUE(CacheConfigRead(path, entries)) << date;
        EXPECT_EQ(entries.size(), 1U);
    }
}

TEST(CacheConfigRead, NoCaches) {
    std::vector<CacheConfigEntry> entries;
    EXPECT_TRUE(Reads(R"({"caches":[]})", entries));
    EXPECT_TRUE(entries.empty());
    entries.resize(1);
    EXPECT_TRUE(CacheConfigRead("/nonexistent/config.json", entries));
    EXPECT_TRUE(entries.empty());
}

TEST(CacheConfigRead, RefusesWhatIsNoJson) {
    ASSERT_TRUE(Reads(kOne));
    const std::string whole = kOne;
    for (const std::string &text : {std::string(), std::string("\0", 1), std::string("\xff\xfe{"),
                                    std::string("{"), std::string(R"({"caches":[)"), whole + "x",
                                    std::string("caches"), whole.substr(0, whole.size() - 1)}) {
        EXPECT_FALSE(Reads(text)) << text;
    }
}

TEST(CacheConfigRead, RefusesAnotherForm) {
    for (const char *text :
         {"{}", "[]", "null", "1", "\"caches\"", R"({"caches":null})", R"({"caches":{}})",
          R"({"caches":"u1"})", R"({"caches":[1]})", R"({"caches":[null]})", R"({"caches":[[]]})",
          R"({"caches":[{}]})", R"({"caches":[{"spaceUuid":"u","ssdPath":"s"}]})",
          R"({"caches":[{"spaceUuid":"u","ssdPath":"s","cachePath":1}]})",
          R"({"caches":[{"spaceUuid":"u","ssdPath":"s","cachePath":""}]})",
          R"({"caches":[{"spaceUuid":{},"ssdPath":"s","cachePath":"c"}]})",
          R"({"caches":[{"spaceUuid":"u","ssdPath":"s\u0000t","cachePath":"c"}]})",
          R"({"caches":[{"spaceUuid":"u","ssdPath":"s","cachePath":"c"},7]})"}) {
        EXPECT_FALSE(Reads(text)) << text;
    }
}

TEST(CacheConfigRead, RefusesDeepNesting) {
    for (const size_t depth : {size_t{100}, size_t{400000}}) {
        EXPECT_FALSE(Reads(std::string(depth, '[')));
        EXPECT_FALSE(Reads(R"({"caches":[],"x":)" + std::string(depth, '[') +
                           std::string(depth, ']') + "}"));
    }
}

TEST(CacheConfigRead, RefusesMoreThanAMebibyte) {
    const std::string text = kOne;
    const size_t limit = size_t{1024} * 1024;
    EXPECT_TRUE(Reads(text + std::string(limit - text.size(), ' ')));
    EXPECT_FALSE(Reads(text + std::string(limit - text.size() + 1, ' ')));
    EXPECT_FALSE(Reads(std::string(8 * limit, ' ')));
}

TEST(CacheConfigRead, RefusesWhatIsNoFile) {
    const TestFolder folder;
    std::vector<CacheConfigEntry> entries;
    EXPECT_FALSE(CacheConfigRead(folder.Path(), entries)) << "a directory";
    const std::string fifo = folder.Path("fifo");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    EXPECT_FALSE(CacheConfigRead(fifo, entries));
    EXPECT_FALSE(CacheConfigRead("/dev/zero", entries));
    const std::string loop = folder.Path("loop");
    std::filesystem::create_symlink(loop, loop);
    EXPECT_FALSE(CacheConfigRead(loop, entries));
}

TEST(CacheConfigPath, FollowsTheEnvironment) {
    ASSERT_EQ(setenv("VESK_FLASHCACHE_CONFIG", "/some/config.json", 1), 0);
    EXPECT_EQ(CacheConfigPath(), "/some/config.json");
    ASSERT_EQ(setenv("VESK_FLASHCACHE_CONFIG", "", 1), 0);
    EXPECT_EQ(CacheConfigPath(), "/etc/veskflashcache.json");
    ASSERT_EQ(unsetenv("VESK_FLASHCACHE_CONFIG"), 0);
    EXPECT_EQ(CacheConfigPath(), "/etc/veskflashcache.json");
}
} // namespace
} // namespace vesk
