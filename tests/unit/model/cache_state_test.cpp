#include "model/cache_state.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"

#include <cerrno>
#include <filesystem>
#include <sys/stat.h>

namespace vesk {
namespace {
class CacheStateTest : public LookTest {
protected:
    CacheState Read() { return CacheStateRead(device_, &errors_); }
    const TempDir folder_;
    const std::string device_ = folder_.Path("cachedev_0");
    const std::string json_ = device_ + ".json";
    const std::string cached_ = device_ + ".cached";
    LookErrors errors_;
};
} // namespace

TEST_F(CacheStateTest, ADeviceThatTellsNothingIsNoError) {
    const CacheState state = Read();
    EXPECT_EQ(state.ssdBlocks, std::nullopt);
    EXPECT_EQ(state.blocksHeld, std::nullopt);
    EXPECT_EQ(state.residentSet, std::nullopt);
    const CacheState ofNothing = CacheStateRead(folder_.FileMake("file", "") + "/dev", &errors_);
    EXPECT_EQ(ofNothing.residentSet, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(CacheStateTest, SizesComeFromTheStateAndBlocksFromTheBits) {
    WriteWhole(json_, R"({"slots": 2048, "pinnedBlocks": 17, "hits": 5})");
    WriteWhole(cached_, std::string("\x81\x00\xFF", 3));
    const CacheState state = Read();
    EXPECT_EQ(state.ssdBlocks, 2048U);
    EXPECT_EQ(state.blocksHeld, 17U);
    EXPECT_EQ(state.residentSet, (BlockSet{0x81, 0x00, 0xFF}));
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(CacheStateTest, EachIsThereWithoutTheOthers) {
    WriteWhole(json_, R"({"slots": 2048})");
    EXPECT_EQ(Read().ssdBlocks, 2048U);
    EXPECT_EQ(Read().blocksHeld, std::nullopt);
    EXPECT_EQ(Read().residentSet, std::nullopt);
    WriteWhole(json_, R"({"slots": -1, "pinnedBlocks": 3})");
    EXPECT_EQ(Read().ssdBlocks, std::nullopt);
    EXPECT_EQ(Read().blocksHeld, 3U);
    std::filesystem::remove(json_);
    WriteWhole(cached_, "");
    EXPECT_EQ(Read().residentSet, BlockSet{});
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(CacheStateTest, ADamagedStateIsAnErrorAndHidesNoBlocks) {
    for (const char *text : {"", "[1]", "{\"slots\": 20"}) {
        WriteWhole(json_, text);
        WriteWhole(cached_, "\x01");
        errors_ = {};
        const CacheState state = Read();
        EXPECT_EQ(state.ssdBlocks, std::nullopt);
        EXPECT_EQ(state.residentSet, BlockSet{0x01});
        EXPECT_EQ(TextsOf(errors_), Texts{json_ + ": not the state of a cache device"});
    }
}

TEST_F(CacheStateTest, WhatLiesInTheFilesPlaceIsNotWaitedFor) {
    ASSERT_EQ(mkfifo(json_.c_str(), 0600), 0);
    std::filesystem::create_directory(cached_);
    const CacheState state = Read();
    EXPECT_EQ(state.ssdBlocks, std::nullopt);
    EXPECT_EQ(state.residentSet, std::nullopt);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{json_ + ": Invalid argument", cached_ + ": Invalid argument"}));
}

TEST_F(CacheStateTest, FilesThatCannotBeReadAreErrors) {
    SKIP_WITHOUT_ROOT();
    WriteWhole(json_, "{}");
    WriteWhole(cached_, "\x01");
    chmod(folder_.Path().c_str(), 0755);
    chmod(json_.c_str(), 0600);
    {
        const OrdinaryUser user;
        EXPECT_EQ(Read().residentSet, BlockSet{0x01});
    }
    EXPECT_EQ(TextsOf(errors_), Texts{json_ + ": Permission denied"});
}

TEST_F(CacheStateTest, AFileThatIsTooLongIsNotTakenForTheState) {
    WriteWhole(json_, "{}");
    std::filesystem::resize_file(json_, (size_t{64} << 20) + 1);
    EXPECT_EQ(Read().ssdBlocks, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), Texts{json_ + ": File too large"});
}
} // namespace vesk
