#include "cachedev/cache_images.h"

#include "cachedev/driver_requests.h"
#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/file.h>
#include <sys/stat.h>

namespace vesk {
namespace {
struct CacheImagesTest : testing::Test {
    const TempDir folder;
    CacheImages images;
    std::string error;

    std::string Path(const char *name) const { return folder.Path(name); }
    bool Open() { return CacheImagesOpen(Path("backing"), Path("ssd"), images, error); }
    bool ErrorHas(const char *text) const { return error.find(text) != std::string::npos; }
};

ImagePieces Piece(std::string &bytes) {
    ImagePieces pieces;
    ImagePiecesAdd(pieces, bytes.data(), bytes.size());
    return pieces;
}
} // namespace

TEST_F(CacheImagesTest, SizesAreTaken) {
    TestMakeFile(Path("backing"), kSectorBytes * 131);
    TestMakeFile(Path("ssd"), 3 * kBlockBytes - 1);
    ASSERT_TRUE(Open()) << error;
    EXPECT_EQ(images.deviceBytes, kSectorBytes * 131);
    EXPECT_EQ(images.slots, 2U);
}

TEST_F(CacheImagesTest, RefusesWhatCannotBeServed) {
    TestMakeFile(Path("ssd"), kBlockBytes);
    EXPECT_FALSE(Open());
    EXPECT_TRUE(ErrorHas("backing")) << error;
    EXPECT_TRUE(ErrorHas("No such file")) << error;
    for (const uint64_t bytes : {0U, 511U, 513U}) {
        TestMakeFile(Path("backing"), bytes);
        CacheImages fresh;
        EXPECT_FALSE(CacheImagesOpen(Path("backing"), Path("ssd"), fresh, error)) << bytes;
        EXPECT_TRUE(ErrorHas("512")) << error;
    }
}

TEST_F(CacheImagesTest, RefusesAnSsdSmallerThanOneBlock) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes - 1);
    EXPECT_FALSE(Open());
    EXPECT_TRUE(ErrorHas("smaller than one cache block")) << error;
}

TEST_F(CacheImagesTest, RefusesFoldersAndTheSameFileTwice) {
    TestMakeFile(Path("backing"), 512);
    std::filesystem::create_directory(Path("ssd"));
    EXPECT_FALSE(Open());
    std::filesystem::remove(Path("ssd"));
    TestMakeFile(Path("backing"), kBlockBytes);
    std::filesystem::create_hard_link(Path("backing"), Path("ssd"));
    CacheImages fresh;
    EXPECT_FALSE(CacheImagesOpen(Path("backing"), Path("ssd"), fresh, error));
    EXPECT_TRUE(ErrorHas("same file")) << error;
}

TEST_F(CacheImagesTest, ImagesBelongToOneDeviceAtATime) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes);
    TestMakeFile(Path("other"), kBlockBytes);
    ASSERT_TRUE(Open()) << error;
    CacheImages second;
    EXPECT_FALSE(CacheImagesOpen(Path("other"), Path("ssd"), second, error));
    EXPECT_TRUE(ErrorHas("in use")) << error;
}

TEST_F(CacheImagesTest, RefusesImagesThatOthersMayChange) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes);
    for (const char *name : {"backing", "ssd"}) {
        const std::string what = (*name == 'b' ? "backing image " : "SSD image ") + Path(name);
        for (const mode_t mode : {0620U, 0602U}) {
            ASSERT_EQ(chmod(Path(name).c_str(), mode), 0);
            CacheImages fresh;
            EXPECT_FALSE(CacheImagesOpen(Path("backing"), Path("ssd"), fresh, error)) << mode;
            EXPECT_EQ(error, "others could change what the volume holds: they may write the " +
                                 what + "; run: chmod 600 " + Path(name));
        }
        ASSERT_EQ(chmod(Path(name).c_str(), 0600), 0);
    }
    if (chown(Path("ssd").c_str(), 1234, 1234) == 0) { // as root
        EXPECT_FALSE(Open());
        EXPECT_EQ(error, "the SSD image " + Path("ssd") +
                             " belongs to user 1234, who could change what the volume holds; "
                             "run: chown root " +
                             Path("ssd"));
    }
}

TEST_F(CacheImagesTest, WarnsOfImagesThatOthersMayRead) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes);
    ASSERT_EQ(chmod(Path("backing").c_str(), 0600), 0);
    ASSERT_EQ(chmod(Path("ssd").c_str(), 0604), 0);
    testing::internal::CaptureStderr();
    EXPECT_TRUE(Open()) << error;
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "veskcachedev: warning: others could read what the volume holds: they may read the "
              "SSD image " +
                  Path("ssd") + "; run: chmod 600 " + Path("ssd") + "\n");
}

TEST_F(CacheImagesTest, ReadersLocksKeepNobodyOut) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes);
    const ScopedFd reader(open(Path("ssd").c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_EQ(flock(reader.Get(), LOCK_EX | LOCK_NB), 0);
    struct flock lock = {};
    lock.l_type = F_RDLCK;
    lock.l_whence = SEEK_SET;
    ASSERT_EQ(fcntl(reader.Get(), F_OFD_SETLK, &lock), 0);
    EXPECT_TRUE(Open()) << error;
}

TEST_F(CacheImagesTest, TransfersGatherAndScatter) {
    TestMakeFile(Path("backing"), 4096);
    TestMakeFile(Path("ssd"), kBlockBytes);
    ASSERT_TRUE(Open()) << error;
    std::string one = "one";
    std::string none;
    std::string two = "second";
    ImagePieces pieces;
    for (std::string *part : {&none, &one, &none, &two, &none}) {
        ImagePiecesAdd(pieces, part->data(), part->size());
    }
    ASSERT_EQ(CacheImagesWriteBacking(images, 100, pieces), 0);
    EXPECT_EQ(ReadWhole(Path("backing")).substr(99, 11), std::string("\0onesecond\0", 11));
    std::string all(9, ' ');
    ASSERT_EQ(CacheImagesReadBacking(images, 100, Piece(all)), 0);
    EXPECT_EQ(all, "onesecond");
    one = two = "";
    one.resize(2);
    two.resize(4);
    pieces = Piece(one);
    ImagePiecesAdd(pieces, two.data(), two.size());
    ASSERT_EQ(CacheImagesReadBacking(images, 103, pieces), 0);
    EXPECT_EQ(one + two, "second");
}

TEST_F(CacheImagesTest, AnImageThatEndsTooEarlyIsAnError) {
    TestMakeFile(Path("backing"), 4096);
    TestMakeFile(Path("ssd"), kBlockBytes);
    ASSERT_TRUE(Open()) << error;
    std::string bytes(1024, ' ');
    EXPECT_EQ(CacheImagesReadBacking(images, 4096 - 512, Piece(bytes)), -EIO);
    EXPECT_EQ(CacheImagesReadSsd(images, kBlockBytes - 1023, Piece(bytes)), -EIO);
    EXPECT_EQ(CacheImagesReadSsd(images, kBlockBytes - 1024, Piece(bytes)), 0);
}

TEST_F(CacheImagesTest, SlotsAreMappedAndSystemCallsFailOnLostOnes) {
    TestMakeFile(Path("backing"), kBlockBytes);
    TestMakeFile(Path("ssd"), 2 * kBlockBytes);
    ASSERT_TRUE(Open()) << error;
    std::string text = "in slot 1";
    ASSERT_EQ(CacheImagesWriteBacking(images, 0, Piece(text)), 0);
    ImagePieces slot;
    ImagePiecesAdd(slot, CacheImagesSlotAddress(images, 1, 5), text.size());
    ASSERT_EQ(CacheImagesReadBacking(images, 0, slot), 0);
    EXPECT_EQ(ReadWhole(Path("ssd")).substr(kBlockBytes + 5, text.size()), text);
    // Cut short: an error result, not a signal.
    std::filesystem::resize_file(Path("ssd"), 0);
    EXPECT_EQ(CacheImagesReadBacking(images, 0, slot), -EFAULT);
}

TEST_F(CacheImagesTest, SyncsSucceed) {
    TestMakeFile(Path("backing"), 512);
    TestMakeFile(Path("ssd"), kBlockBytes);
    ASSERT_TRUE(Open()) << error;
    EXPECT_EQ(CacheImagesSyncBacking(images), 0);
    EXPECT_EQ(CacheImagesSyncAll(images), 0);
}
} // namespace vesk
