#include "space/file_extents.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/private_mounts.h"
#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>
#include <memory>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;

const std::string kFile = "/volume1/photo/a.jpg";

class FileExtentsTest : public LeakCheckedTest {
protected:
    // Answers the n-th try with n-th's number of extents; later tries as the last.
    void AnswerWithExtents(std::vector<size_t> counts) {
        FakeAppliance::onLookup = [this, counts](const std::string &directory, uint64_t inode,
                                                 int attempt, FileMappingTable &answer) {
            events.push_back("lookup");
            askedDirectory = directory;
            askedInode = inode;
            const auto n = std::min(static_cast<size_t>(attempt), counts.size() - 1);
            for (size_t i = 0; i < counts[n]; ++i) {
                answer.entries.push_back(FakeExtent(i * 8, 8, 1000 + i * 8));
            }
            return 0;
        };
        FakeLibc::onSync = [this] { events.push_back("sync"); };
        FakeLibc::onSleep = [this] { events.push_back("sleep"); };
    }
    static void AnswerWith(int result, std::vector<FileMappingEntry> entries) {
        FakeAppliance::onLookup = [=](const std::string &, uint64_t, int,
                                      FileMappingTable &answer) {
            answer.entries = entries;
            return result;
        };
    }
    int Lookup(const std::string &path = kFile) {
        return GetMappingTableFromFile(&table, "/volume1", path, 4711);
    }

    FileMappingTable table;
    std::vector<std::string> events; // what the lookup did, in order
    std::string askedDirectory;
    uint64_t askedInode = 0;
};

using FileExtentsFaultTest = FileExtentsTest;
} // namespace

TEST_F(FileExtentsTest, AsksTheMountPathsDeviceForTheInodeInTheFilesFolder) {
    CapturedLog log;
    AnswerWithExtents({2});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(FakeAppliance::askedPath, "/volume1");
    EXPECT_EQ(askedDirectory, "/volume1/photo");
    EXPECT_EQ(askedInode, 4711U);
    ASSERT_EQ(table.entries.size(), 2U);
    EXPECT_EQ(table.entries[1].deviceStartSector, 1008U);
    EXPECT_EQ(events, Messages{"lookup"});
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileExtentsTest, LargestInodeIsNotExtended) {
    CapturedLog log(2);
    AnswerWithExtents({1});
    EXPECT_EQ(GetMappingTableFromFile(&table, "/volume1", kFile, 4294967295U), 0);
    EXPECT_EQ(askedInode, 4294967295U);
    EXPECT_EQ(FirstOf(log.Messages()), "GetMappingTableFromFile() [N]: Start for file "
                                       "(/volume1/photo/a.jpg), inode = 4294967295");
}

TEST_F(FileExtentsTest, FolderOfAPathIsThatOfDirname) {
    CapturedLog log;
    AnswerWithExtents({1});
    const struct {
        std::string path, folder;
    } cases[] = {
        {"/a", "/"},
        {"a", "."},
        {"", "."},
        {"/volume1/dir/", "/volume1"},
        {"/volume1/" + std::string(600, 'x'), "/volume1"},
        // Only the first 512 characters count.
        {"/" + std::string(509, 'd') + "/abc", "/" + std::string(509, 'd')},
        {"/" + std::string(510, 'd') + "/abc", "/"}, // cut behind the slash
        {"/v/" + std::string(509, 'd') + "/abc", "/v"},
    };
    for (const auto &one : cases) {
        EXPECT_EQ(Lookup(one.path), 0);
        EXPECT_EQ(askedDirectory, one.folder);
    }
}

TEST_F(FileExtentsTest, StartAndNumberOfExtentsAreToldAtLevel2) {
    CapturedLog log(2);
    AnswerWithExtents({3});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(log.Messages(), (Messages{"GetMappingTableFromFile() [N]: Start for file "
                                        "(/volume1/photo/a.jpg), inode = 4711",
                                        "GetMappingTableFromFile() [N]: Entry number = 3"}));
}

TEST_F(FileExtentsTest, EmptyAnswerIsFollowedByOneSyncOneSleepAndAnotherTry) {
    CapturedLog log(2);
    AnswerWithExtents({0, 1});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(events, (Messages{"lookup", "sync", "sleep", "lookup"}));
    EXPECT_EQ(log.Messages().at(1), "GetMappingTableFromFile() [N]: Retry to get mapping of file "
                                    "(/volume1/photo/a.jpg) Ret = 0 size = 0");
}

TEST_F(FileExtentsTest, SystemIsSyncedTheFirstTimeOnly) {
    CapturedLog log;
    AnswerWithExtents({0, 0, 0, 1});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(events, (Messages{"lookup", "sync", "sleep", "lookup", "sleep", "lookup", "sleep",
                                "lookup"}));
    EXPECT_EQ(log.Text(), ""); // a retry is told at level 2 only
}

TEST_F(FileExtentsTest, TenthTryMaySucceed) {
    CapturedLog log;
    AnswerWithExtents({0, 0, 0, 0, 0, 0, 0, 0, 0, 1});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(FakeAppliance::lookups, 10);
    EXPECT_EQ(FakeLibc::sleeps, 9);
}

TEST_F(FileExtentsTest, FileWithoutExtentsTimesOutAfterTenTriesAndTenSleeps) {
    CapturedLog log;
    AnswerWithExtents({0});
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(FakeAppliance::lookups, 10);
    EXPECT_EQ(FakeLibc::sleeps, 10);
    EXPECT_EQ(FakeLibc::syncs, 1);
    EXPECT_EQ(log.Text(),
              "tool: Get mapping of file (/volume1/photo/a.jpg) timeout (10 seconds)\n");
}

TEST_F(FileExtentsTest, TimeoutIsAnErrorAndEveryRetryIsToldAtLevel2) {
    CapturedLog log(2);
    AnswerWithExtents({0});
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(log.Count("GetMappingTableFromFile() [N]: Retry to get mapping of file "
                        "(/volume1/photo/a.jpg) Ret = 0 size = 0"),
              10);
    EXPECT_EQ(LastOf(log.Messages()), "GetMappingTableFromFile() [N] : ***** Get mapping of file "
                                      "(/volume1/photo/a.jpg) timeout (10 seconds)");
}

TEST_F(FileExtentsTest, ResultAbove0WithoutExtentsIsTriedAgain) {
    CapturedLog log(2);
    AnswerWith(3, {});
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(FakeAppliance::lookups, 10);
    EXPECT_TRUE(log.Has("GetMappingTableFromFile() [N]: Retry to get mapping of file "
                        "(/volume1/photo/a.jpg) Ret = 3 size = 0"));
}

TEST_F(FileExtentsTest, FailedLookupIsNotTriedAgain) {
    for (const int result : {-1, -5}) {
        FakeAppliance::lookups = 0;
        AnswerWith(result, {});
        CapturedLog log(2);
        EXPECT_EQ(Lookup(), -1);
        EXPECT_EQ(FakeAppliance::lookups, 1);
        EXPECT_EQ(FakeLibc::sleeps, 0);
        EXPECT_EQ(FakeLibc::syncs, 0);
        EXPECT_EQ(LastOf(log.Messages()),
                  "GetMappingTableFromFile() [N] : ***** Get mapping result fail.");
        EXPECT_EQ(log.Lines().size(), 2U);
    }
}

TEST_F(FileExtentsTest, LookupThatFailsAfterARetryEndsTheTries) {
    CapturedLog log;
    FakeAppliance::onLookup = [](const std::string &, uint64_t, int attempt, FileMappingTable &) {
        return attempt == 0 ? 0 : -1;
    };
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(FakeAppliance::lookups, 2);
    EXPECT_EQ(log.Text(), "tool: Get mapping result fail.\n");
}

TEST_F(FileExtentsTest, SingleUninitialisedExtentIsToldAndAccepted) {
    AnswerWith(0, {FakeExtent(0, 8, 1000, 1)});
    CapturedLog log;
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(log.Text(), "tool: Only get 1 unitilized entry from file (/volume1/photo/a.jpg)\n");
    CapturedLog unmarked(2);
    EXPECT_EQ(Lookup(), 0);
    EXPECT_TRUE(unmarked.Has("GetMappingTableFromFile() [N] : Only get 1 unitilized entry from "
                             "file (/volume1/photo/a.jpg)"));
}

TEST_F(FileExtentsTest, OtherExtentsAreNotWorthAMessage) {
    CapturedLog log;
    AnswerWith(0, {FakeExtent(0, 8, 1000, 0)});
    EXPECT_EQ(Lookup(), 0);
    for (const uint32_t flag : {2U, 3U, UINT32_MAX}) {
        AnswerWith(0, {FakeExtent(0, 8, 1000, flag)});
        EXPECT_EQ(Lookup(), 0);
    }
    AnswerWith(0, {FakeExtent(0, 8, 1000, 1), FakeExtent(8, 8, 2000, 1)});
    EXPECT_EQ(Lookup(), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileExtentsTest, VolumeWithoutDeviceIsAnErrorWithTheFilesPath) {
    FakeAppliance::createFails = true;
    CapturedLog log;
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(log.Text(), "tool: Create file system device \"/dev/space1\" fail.\n"
                          "tool: Create file system device fail. Path:/volume1/photo/a.jpg\n");
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(FileExtentsFaultTest, SimulatedFailureFailsTheLookupThatSucceeded) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    WriteWhole("/tmp/veskcachepinfiletool.debug", kFile + "\n");
    AnswerWithExtents({2});
    CapturedLog log(2);
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{"GetMappingTableFromFile() [N]: Start for file (/volume1/photo/a.jpg), "
                        "inode = 4711",
                        "FileReadString() [N]: Get text = /volume1/photo/a.jpg\\x0a",
                        "GetMappingTableFromFile() [N] : ***** Simulate /volume1/photo/a.jpg get "
                        "mapping failed",
                        "GetMappingTableFromFile() [N] : ***** Get mapping result fail."}));
    EXPECT_EQ(events, Messages{"lookup"});

    EXPECT_EQ(Lookup("/volume1/photo/b.jpg"), 0); // only that file fails
    std::filesystem::remove("/tmp/veskcachepinfiletool.debug");
    EXPECT_EQ(Lookup(), 0);
}

TEST_F(FileExtentsFaultTest, SimulatedFailureIsLookedForAtEachTry) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    AnswerWithExtents({0, 0, 1});
    FakeLibc::onSleep = [] {
        if (FakeLibc::sleeps == 2) {
            WriteWhole("/tmp/veskcachepinfiletool.debug", kFile);
        }
    };
    CapturedLog log;
    EXPECT_EQ(Lookup(), -1);
    EXPECT_EQ(FakeAppliance::lookups, 3);
    EXPECT_EQ(log.Text(), "tool: Simulate /volume1/photo/a.jpg get mapping failed\n"
                          "tool: Get mapping result fail.\n");
    std::filesystem::remove("/tmp/veskcachepinfiletool.debug");
}

TEST_F(FileExtentsTest, AskingOnceWaitsForNothingAndLogsNothing) {
    CapturedLog log(3);
    AnswerWithExtents({0});
    const std::unique_ptr<FileSystemDevice> device(CreateFileSystemDeviceByFilePath("/volume1"));
    ASSERT_NE(device, nullptr);
    EXPECT_EQ(FileExtentsAsk(*device, kFile, 4294967295U, &table), 0);
    EXPECT_EQ(table.entries.size(), 0U);
    EXPECT_EQ(askedDirectory, "/volume1/photo");
    EXPECT_EQ(askedInode, 4294967295U);
    EXPECT_EQ(events, Messages{"lookup"});
    AnswerWithExtents({2});
    EXPECT_EQ(FileExtentsAsk(*device, kFile, 4711, &table), 0);
    EXPECT_EQ(table.entries.size(), 2U);
    AnswerWith(-1, {});
    EXPECT_EQ(FileExtentsAsk(*device, kFile, 4711, &table), -1);
    EXPECT_EQ(FakeLibc::sleeps + FakeLibc::syncs, 0);
    EXPECT_EQ(log.Messages(), Messages{});
}
} // namespace vesk
