#include "verbs/file_state.h"

#include "tests/unit/verbs/records.h"

#include <gtest/gtest.h>

#include <cerrno>

namespace vesk {
namespace {
class FileStateTest : public ::testing::Test {
protected:
    // The state's name, "null" for none.
    std::string State(const FileLook &look) const { return StateOf(&known_, look); }
    std::string StateOf(const KnownFile *known, const FileLook &look) const {
        const auto state =
            FileStateOf(known, look, FileFiguresOf(look, volume_.volume), volume_.volume);
        return state ? FileStateText(*state) : "null";
    }
    void Mark(uint64_t first, uint64_t count) {
        BlockSetAdd(&*volume_.volume.marked, {first, count});
    }

    WorldVolume volume_ = MakeVolume();
    KnownFile known_{"a", 7, kRequestUnknown};
    const FileLook file_ = MakeLook(7, {{0, 256}, {1280, 8}}); // blocks 0, 1 and 10
};
} // namespace

TEST_F(FileStateTest, MarkedWholeItIsPinnedWhereTheDriverHasABitmap) {
    Mark(0, 2);
    Mark(10, 1);
    EXPECT_EQ(State(file_), "pinned");
    volume_.volume.driverHasBitmap = false;
    EXPECT_EQ(State(file_), "marked");
    volume_.volume.driverHasBitmap = std::nullopt;
    EXPECT_EQ(State(file_), "null");
}

TEST_F(FileStateTest, MarkedInPartItIsPartialAndNotAtAllUnmarkedWhateverTheDriverHas) {
    for (const std::optional<bool> hasBitmap :
         {std::optional(true), std::optional(false), std::optional<bool>()}) {
        volume_.volume.marked = BlockSetOf(64);
        volume_.volume.driverHasBitmap = hasBitmap;
        EXPECT_EQ(State(file_), "unmarked");
        Mark(2, 8); // neighbours
        EXPECT_EQ(State(file_), "unmarked");
        Mark(10, 1);
        EXPECT_EQ(State(file_), "partial");
        Mark(0, 1);
        EXPECT_EQ(State(file_), "partial");
    }
}

TEST_F(FileStateTest, AFileWithoutBlocksIsPinnedWithoutMarks) {
    const FileLook empty = MakeLook(7, {});
    EXPECT_EQ(State(empty), "pinned");
    volume_.volume.driverHasBitmap = false;
    EXPECT_EQ(State(empty), "marked");
    volume_.volume.marked = std::nullopt;
    EXPECT_EQ(State(empty), "marked");
    volume_.volume.driverHasBitmap = std::nullopt;
    EXPECT_EQ(State(empty), "null");
}

TEST_F(FileStateTest, WithoutABitmapThatCanBeReadItIsUnknown) {
    volume_.volume.marked = std::nullopt;
    EXPECT_EQ(State(file_), "null");
}

TEST_F(FileStateTest, BlocksPastTheBitmapsEndAreNotMarked) {
    Mark(0, 64);
    EXPECT_EQ(State(MakeLook(7, {{63 * 128, 256}})), "partial");
    EXPECT_EQ(State(MakeLook(7, {{64 * 128, 128}})), "unmarked");
}

TEST_F(FileStateTest, AnotherInodeIsAReplacedFile) {
    Mark(0, 64);
    EXPECT_EQ(State(MakeLook(8, {{0, 8}})), "replaced");
    EXPECT_EQ(State(MakeLook(0x100000007, {{0, 8}})), "pinned"); // the same low 32 bits
    FileLook folder = MakeLook(8, {});
    folder.status.mode = S_IFDIR | 0755;
    folder.hasExtents = false;
    EXPECT_EQ(State(folder), "replaced");
}

TEST_F(FileStateTest, APathThatLeadsNowhereIsMissingAndOneThatCannotBeLookedAtUnreadable) {
    for (const int error : {ENOENT, ENOTDIR, ENAMETOOLONG}) {
        EXPECT_EQ(State(FailedLook(error)), "missing") << error;
    }
    for (const int error : {EACCES, EPERM, EIO, ELOOP, EXDEV, ENODEV}) {
        EXPECT_EQ(State(FailedLook(error)), "unreadable") << error;
    }
    FileLook look = MakeLook(7, {});
    look.hasExtents = false;
    EXPECT_EQ(State(look), "unreadable");
}

TEST_F(FileStateTest, AStoredRequestWins) {
    Mark(0, 64);
    known_.stored = kRequestPinFiles;
    for (const FileLook &look : {file_, MakeLook(8, {}), FailedLook(ENOENT), FailedLook(EIO)}) {
        known_.stored = kRequestPinFiles;
        EXPECT_EQ(State(look), "pinning");
        known_.stored = kRequestUnpinFiles;
        EXPECT_EQ(State(look), "unpinning");
    }
    known_.inode = std::nullopt;
    EXPECT_EQ(State(file_), "unpinning");
}

TEST_F(FileStateTest, WithoutARecordItIsUnpinnedHoweverMuchIsMarked) {
    Mark(0, 64);
    EXPECT_EQ(StateOf(nullptr, file_), "unpinned");
    EXPECT_EQ(StateOf(nullptr, FailedLook(ENOENT)), "unpinned");
    known_.inode = std::nullopt;
    EXPECT_EQ(State(file_), "unpinned");
}

TEST_F(FileStateTest, EachStateHasItsWord) {
    const char *const words[] = {"pinned",   "marked",    "partial", "unmarked",
                                 "replaced", "renamed",   "missing", "unreadable",
                                 "pinning",  "unpinning", "unpinned"};
    const FileState states[] = {FileState::Pinned,    FileState::Marked,     FileState::Partial,
                                FileState::Unmarked,  FileState::Replaced,   FileState::Renamed,
                                FileState::Missing,   FileState::Unreadable, FileState::Pinning,
                                FileState::Unpinning, FileState::Unpinned};
    ASSERT_EQ(kFileStates, 11U);
    for (size_t i = 0; i < kFileStates; ++i) {
        EXPECT_STREQ(FileStateText(states[i]), words[i]);
        EXPECT_EQ(static_cast<size_t>(states[i]), i);
    }
}

TEST_F(FileStateTest, FiguresAreThoseOfTheFilesBlocks) {
    Mark(1, 1);
    volume_.volume.resident = BlockSet{0x03};
    const FileFigures figures =
        FileFiguresOf(MakeLook(7, {{0, 256}, {1280, 8}, {1300, 8}}, 4711), volume_.volume);
    EXPECT_EQ(figures.bytes, 4711U);
    EXPECT_EQ(figures.extents, 3U);
    EXPECT_EQ(figures.blocks, 3U);
    EXPECT_EQ(figures.marked, 1U);
    EXPECT_EQ(figures.resident, 2U);
}

TEST_F(FileStateTest, FiguresThatCannotBeHadAreAbsent) {
    const FileFigures gone = FileFiguresOf(FailedLook(ENOENT), volume_.volume);
    EXPECT_EQ(gone.bytes, std::nullopt);
    EXPECT_EQ(gone.extents, std::nullopt);
    EXPECT_EQ(gone.blocks, std::nullopt);
    FileLook look = MakeLook(7, {{0, 8}}, 5);
    look.hasExtents = false;
    const FileFigures unread = FileFiguresOf(look, volume_.volume);
    EXPECT_EQ(unread.bytes, 5U);
    EXPECT_EQ(unread.extents, std::nullopt);
    EXPECT_EQ(unread.blocks, std::nullopt);
    EXPECT_EQ(unread.marked, std::nullopt);
    EXPECT_EQ(unread.resident, std::nullopt);
    volume_.volume.marked = std::nullopt;
    const FileFigures unmarked = FileFiguresOf(file_, volume_.volume);
    EXPECT_EQ(unmarked.blocks, 3U);
    EXPECT_EQ(unmarked.marked, std::nullopt);
    EXPECT_EQ(unmarked.resident, std::nullopt);
}
} // namespace vesk
