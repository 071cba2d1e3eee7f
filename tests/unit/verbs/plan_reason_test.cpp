#include "verbs/plan_reason.h"

#include "tests/unit/verbs/records.h"

#include <gtest/gtest.h>

#include <cerrno>

namespace vesk {
namespace {
const FileLook kGood = MakeLook(7, {{0, 8}});

std::string Reason(const std::string &relativePath, const FileLook &look = kGood,
                   const std::string &mountPath = "/volume1") {
    const auto reason = SkipReasonOf(mountPath, relativePath, look);
    return reason ? SkipReasonText(*reason) : "none";
}
} // namespace

TEST(SkipReasonTest, AFileWithBlocksCanBePinned) {
    EXPECT_EQ(Reason("share/a.txt"), "none");
    EXPECT_EQ(Reason("share/gr\xC3\xB6\xC3\x9F"
                     "e.txt"),
              "none");
    EXPECT_EQ(Reason("share/veskcachepinfile.bitmap"), "none"); // not the volume's own
    EXPECT_EQ(Reason("a", kGood, "/my volume"), "none");
}

TEST(SkipReasonTest, EachThingThatStandsInTheWayHasItsWord) {
    FileLook folder = kGood;
    folder.status.mode = S_IFDIR | 0755;
    FileLook unread = kGood;
    unread.hasExtents = false;
    EXPECT_EQ(Reason("a", FailedLook(ENOENT)), "not-found");
    EXPECT_EQ(Reason("a", folder), "not-regular");
    EXPECT_EQ(Reason("veskcachepinfile.bitmap"), "bitmap-file");
    for (const char *name : {"a b", "a;b", "a#b", "a\tb", "a\nb", "a\vb", "a\fb", "a\rb"}) {
        EXPECT_EQ(Reason(name), "name") << name;
    }
    EXPECT_EQ(Reason(std::string(512, 'x')), "too-long");
    EXPECT_EQ(Reason("a\xFF"), "not-utf8");
    EXPECT_EQ(Reason("a", unread), "unreadable");
    EXPECT_EQ(Reason("a", MakeLook(7, {})), "no-blocks");
}

TEST(SkipReasonTest, TheFirstThatHoldsIsTold) {
    FileLook failed = FailedLook(EACCES);
    failed.status.mode = S_IFDIR;
    EXPECT_EQ(Reason("a b", failed), "no-permission");
    FileLook fifo = MakeLook(7, {});
    fifo.status.mode = S_IFIFO;
    fifo.hasExtents = false;
    EXPECT_EQ(Reason("veskcachepinfile.bitmap", fifo), "not-regular");
    FileLook nothing = MakeLook(7, {});
    nothing.hasExtents = false;
    EXPECT_EQ(Reason("veskcachepinfile.bitmap", nothing), "bitmap-file");
    EXPECT_EQ(Reason(" " + std::string(512, '\xFF'), nothing), "name");
    EXPECT_EQ(Reason(std::string(512, '\xFF'), nothing), "too-long");
    EXPECT_EQ(Reason("\xFF", nothing), "not-utf8");
    EXPECT_EQ(Reason("a", nothing), "unreadable"); // and no word of blocks
}

TEST(SkipReasonTest, TheInodesDigitsAreAsRecordsHoldThem) {
    const std::string mountPath = "/" + std::string(501, 'm');
    const std::string name(510, 'x'); // the path has 1013 bytes, the list's entry 512 and more
    EXPECT_EQ(Reason(name, MakeLook(UINT64_MAX, {{0, 8}}), mountPath), "none");
}

TEST(SkipReasonTest, OfAnErrnoThereIsOneReason) {
    const std::pair<int, const char *> errors[] = {
        {ENOENT, "not-found"},    {ENOTDIR, "not-found"},      {EACCES, "no-permission"},
        {EPERM, "no-permission"}, {EXDEV, "other-filesystem"}, {ENAMETOOLONG, "too-long"},
        {EIO, "unreadable"},      {ELOOP, "unreadable"},       {EBADF, "unreadable"},
    };
    for (const auto &[error, expected] : errors) {
        EXPECT_STREQ(SkipReasonText(SkipReasonOfError(error)), expected) << error;
    }
}

TEST(SkipReasonTest, EachReasonHasItsWord) {
    const std::pair<SkipReason, const char *> words[] = {
        {SkipReason::NotFound, "not-found"},
        {SkipReason::Name, "name"},
        {SkipReason::TooLong, "too-long"},
        {SkipReason::NotUtf8, "not-utf8"},
        {SkipReason::NotRegular, "not-regular"},
        {SkipReason::BitmapFile, "bitmap-file"},
        {SkipReason::OtherFileSystem, "other-filesystem"},
        {SkipReason::NoVolume, "no-volume"},
        {SkipReason::NoBlocks, "no-blocks"},
        {SkipReason::NoPermission, "no-permission"},
        {SkipReason::Unreadable, "unreadable"},
        {SkipReason::SameInode, "same-inode"},
        {SkipReason::NoRoom, "no-room"},
    };
    for (const auto &[reason, word] : words) {
        EXPECT_STREQ(SkipReasonText(reason), word);
    }
}
} // namespace vesk
