#include "storage_core/file_extents.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <linux/falloc.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <map>
#include <memory>
#include <ostream>
#include <sstream>

// Found by the type that they are of, which is in no namespace.
bool operator==(const FileMappingEntry &a, const FileMappingEntry &b) {
    return a.fileStartSector == b.fileStartSector && a.numSectors == b.numSectors &&
           a.deviceStartSector == b.deviceStartSector && a.flag == b.flag;
}

std::ostream &operator<<(std::ostream &out, const FileMappingEntry &entry) {
    return out << "{file " << entry.fileStartSector << " + " << entry.numSectors << " device "
               << entry.deviceStartSector << " flag " << entry.flag << "}";
}

namespace vesk {
namespace {
using Entries = std::vector<FileMappingEntry>;

constexpr uint64_t kBlock = 4096;
constexpr uint64_t kBlockSectors = kBlock / 512;

fiemap_extent Extent(uint64_t logical, uint64_t physical, uint64_t length, uint32_t flags) {
    fiemap_extent extent = {};
    extent.fe_logical = logical;
    extent.fe_physical = physical;
    extent.fe_length = length;
    extent.fe_flags = flags;
    return extent;
}

TEST(FileExtentConvert, GivesSectors) {
    FileMappingEntry entry = {};
    ASSERT_TRUE(FileExtentConvert(Extent(4096, uint64_t{1} << 45, 8192, 0), entry));
    EXPECT_EQ(entry, (FileMappingEntry{8, 16, uint64_t{1} << 36, 0}));
    ASSERT_TRUE(FileExtentConvert(Extent(0, 512, 512, FIEMAP_EXTENT_UNWRITTEN | FIEMAP_EXTENT_LAST),
                                  entry));
    EXPECT_EQ(entry, (FileMappingEntry{0, 1, 1, 1}));
}

TEST(FileExtentConvert, KeepsWhatHasAPlace) {
    FileMappingEntry entry = {};
    for (const uint32_t flag :
         std::vector<uint32_t>{FIEMAP_EXTENT_LAST, FIEMAP_EXTENT_MERGED, FIEMAP_EXTENT_SHARED,
                               FIEMAP_EXTENT_UNWRITTEN}) {
        EXPECT_TRUE(FileExtentConvert(Extent(0, 4096, 4096, flag), entry)) << flag;
    }
}

TEST(FileExtentConvert, LeavesOutWhatHasNoPlace) {
    const FileMappingEntry old = {1, 2, 3, 4};
    for (const uint32_t flag : std::vector<uint32_t>{
             FIEMAP_EXTENT_UNKNOWN, FIEMAP_EXTENT_DELALLOC, FIEMAP_EXTENT_ENCODED,
             FIEMAP_EXTENT_NOT_ALIGNED, FIEMAP_EXTENT_DATA_INLINE, FIEMAP_EXTENT_DATA_TAIL}) {
        FileMappingEntry entry = old;
        EXPECT_FALSE(FileExtentConvert(Extent(0, 4096, 4096, flag), entry)) << flag;
        EXPECT_EQ(entry, old);
    }
    FileMappingEntry entry = old;
    EXPECT_FALSE(FileExtentConvert(Extent(0, 4096, 0, 0), entry));
    EXPECT_FALSE(FileExtentConvert(Extent(0, 4100, 512, 0), entry));
    EXPECT_FALSE(FileExtentConvert(Extent(1, 4096, 512, 0), entry));
    EXPECT_FALSE(FileExtentConvert(Extent(0, 4096, 100, 0), entry));
    EXPECT_EQ(entry, old);
}

TEST(FileExtentsRead, FailsWithoutTheKernelsAnswer) {
    Entries entries;
    EXPECT_FALSE(FileExtentsRead(-1, entries));
    const ScopedFd device(open("/dev/null", O_RDONLY | O_CLOEXEC));
    EXPECT_FALSE(FileExtentsRead(device.Get(), entries));
    EXPECT_TRUE(entries.empty());
}

// Tests with real files; the parameter is the filesystem.
class FileExtents : public testing::TestWithParam<const char *> {
protected:
    static void TearDownTestSuite() { volumes.clear(); }
    void SetUp() override {
        const std::string name = GetParam();
        std::unique_ptr<TestVolume> &made = volumes[name];
        if (made == nullptr) {
            const bool isXfs = name == "xfs";
            const std::string mkfs = name == "inline"
                                         ? std::string(kMakeExt4) + " -O inline_data -I 256"
                                     : isXfs ? kMakeXfs
                                             : kMakeExt4;
            made = std::make_unique<TestVolume>("extents-" + name, mkfs,
                                                isXfs ? kXfsBytes : kExt4Bytes);
        }
        if (!made->skipReason.empty()) {
            GTEST_SKIP() << made->skipReason;
        }
        volume = made.get();
        file = std::make_unique<TestFile>(volume->mountPath + "/file");
    }

    Entries Read() const {
        Entries entries;
        EXPECT_TRUE(FileExtentsRead(file->fd.Get(), entries));
        return entries;
    }

    // The same extents as filefrag prints them.
    Entries Expected() const {
        std::string output;
        EXPECT_EQ(CommandRun({"filefrag", "-v", "-b512", file->path}, output), 0) << output;
        Entries entries;
        std::istringstream lines(output);
        for (std::string line; std::getline(lines, line);) {
            const bool hasPlace = line.find("delalloc") == std::string::npos &&
                                  line.find("unknown_loc") == std::string::npos &&
                                  line.find("inline") == std::string::npos;
            const uint32_t flag = line.find("unwritten") == std::string::npos ? 0 : 1;
            // "number: first.. last: device first.. device last: length: ..."; titles are no
            // numbers.
            std::replace_if(
                line.begin(), line.end(), [](char c) { return c == ':' || c == '.'; }, ' ');
            std::istringstream fields(line);
            uint64_t number = 0, first = 0, last = 0, deviceFirst = 0, deviceLast = 0, length = 0;
            if (hasPlace &&
                fields >> number >> first >> last >> deviceFirst >> deviceLast >> length) {
                entries.push_back({first, length, deviceFirst, flag});
            }
        }
        return entries;
    }

    // The device holds the file's bytes where the extents say. The image is what the loop device
    // stores to.
    void ExpectDataInPlace(const Entries &entries) const {
        const ScopedFd image(open(volume->imagePath.c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_TRUE(image.IsOpen());
        for (const FileMappingEntry &entry : entries) {
            if (entry.flag == 1) {
                continue;
            }
            std::vector<char> found(static_cast<size_t>(entry.numSectors * 512));
            EXPECT_EQ(pread(image.Get(), found.data(), found.size(),
                            static_cast<off_t>(entry.deviceStartSector * 512)),
                      static_cast<ssize_t>(found.size()));
            EXPECT_TRUE(found == TestPattern(entry.fileStartSector * 512, found.size()))
                << "other bytes at " << entry;
        }
    }

    // Without what xfs sets aside behind the end of a file that was appended to.
    static Entries Written(const Entries &entries) {
        Entries written;
        std::copy_if(entries.begin(), entries.end(), std::back_inserter(written),
                     [](const FileMappingEntry &entry) { return entry.flag == 0; });
        return written;
    }

    static uint64_t Sectors(const Entries &entries) {
        uint64_t sectors = 0;
        for (const FileMappingEntry &entry : entries) {
            sectors += entry.numSectors;
        }
        return sectors;
    }

    static std::map<std::string, std::unique_ptr<TestVolume>> volumes;
    TestVolume *volume = nullptr;
    std::unique_ptr<TestFile> file;
};

std::map<std::string, std::unique_ptr<TestVolume>> FileExtents::volumes;

TEST_P(FileExtents, Contiguous) {
    file->Write(0, 256 * kBlock);
    file->Sync();
    const Entries entries = Read();
    EXPECT_EQ(entries, Expected());
    EXPECT_EQ(Sectors(entries), 256 * kBlockSectors);
    ExpectDataInPlace(entries);
}

// Taking blocks out of the middle leaves neighbours in the file that are none on the device.
TEST_P(FileExtents, Fragmented) {
    file->Write(0, 64 * kBlock);
    file->Sync();
    for (uint64_t block = 1; block < 32; ++block) {
        file->Fallocate(FALLOC_FL_COLLAPSE_RANGE, block * kBlock, kBlock);
    }
    file->Write(0, 33 * kBlock);
    file->Sync();
    const Entries entries = Read();
    EXPECT_EQ(entries, Expected());
    EXPECT_GE(entries.size(), 32U);
    EXPECT_EQ(Sectors(entries), 33 * kBlockSectors);
    ExpectDataInPlace(entries);
}

TEST_P(FileExtents, Sparse) {
    for (const uint64_t block : {uint64_t{0}, uint64_t{256}, uint64_t{1} << 20}) {
        file->Write(block * kBlock, 2 * kBlock);
        file->Sync();
    }
    const Entries all = Read();
    EXPECT_EQ(all, Expected());
    const Entries entries = Written(all);
    ASSERT_EQ(entries.size(), 3U);
    EXPECT_EQ(entries[1].fileStartSector, 256 * kBlockSectors);
    EXPECT_EQ(entries[2].fileStartSector, kBlockSectors << 20) << "past 4 GiB";
    ExpectDataInPlace(entries);
}

// More extents than the kernel is asked for at a time.
TEST_P(FileExtents, ManyBatches) {
    constexpr uint64_t kCount = 600;
    file->Write(0, 2 * kCount * kBlock);
    file->Sync();
    for (uint64_t i = 0; i < kCount; ++i) {
        file->Fallocate(FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE, (2 * i + 1) * kBlock, kBlock);
    }
    file->Sync();
    const Entries all = Read();
    EXPECT_EQ(all, Expected());
    EXPECT_EQ(all.capacity(), all.size()) << "counted before";
    const Entries entries = Written(all);
    EXPECT_EQ(entries.size(), kCount);
    ExpectDataInPlace(entries);
}

TEST_P(FileExtents, Unwritten) {
    file->Fallocate(0, 0, 256 * kBlock);
    const Entries entries = Read();
    EXPECT_EQ(entries, Expected());
    EXPECT_EQ(Sectors(entries), 256 * kBlockSectors);
    for (const FileMappingEntry &entry : entries) {
        EXPECT_EQ(entry.flag, 1U);
    }
}

TEST_P(FileExtents, PartlyWritten) {
    file->Fallocate(0, 0, 256 * kBlock);
    file->Write(64 * kBlock, 32 * kBlock);
    file->Sync();
    const Entries entries = Read();
    EXPECT_EQ(entries, Expected());
    ASSERT_EQ(entries.size(), 3U);
    EXPECT_EQ(entries[0].flag, 1U);
    EXPECT_EQ(entries[1].flag, 0U);
    EXPECT_EQ(entries[2].flag, 1U);
    ExpectDataInPlace(entries);
}

// What the kernel would give a place some seconds later has one when it is asked for.
TEST_P(FileExtents, FreshlyWritten) {
    file->Write(0, 16 * kBlock);
    const Entries entries = Read();
    EXPECT_EQ(Sectors(entries), 16 * kBlockSectors);
    ExpectDataInPlace(entries);
}

TEST_P(FileExtents, GrownAMomentAgo) {
    file->Write(0, 16 * kBlock);
    file->Sync();
    file->Write(1024 * kBlock, 16 * kBlock);
    const Entries entries = Written(Read());
    EXPECT_EQ(Sectors(entries), 32 * kBlockSectors);
    ExpectDataInPlace(entries);
}

// A copy shares the extents of its original until one of them is written to.
TEST_P(FileExtents, OverwrittenCopy) {
    file->Write(0, 16 * kBlock);
    file->Sync();
    const Entries shared = Read();
    TestFile copy(volume->mountPath + "/copy");
    if (ioctl(copy.fd.Get(), FICLONE, file->fd.Get()) != 0) {
        GTEST_SKIP() << "files share nothing here: " << std::strerror(errno);
    }
    copy.Write(0, 16 * kBlock);
    Entries entries;
    EXPECT_TRUE(FileExtentsRead(copy.fd.Get(), entries));
    EXPECT_EQ(Sectors(entries), 16 * kBlockSectors);
    ASSERT_FALSE(entries.empty());
    EXPECT_NE(entries[0].deviceStartSector, shared[0].deviceStartSector);
}

TEST_P(FileExtents, Empty) {
    EXPECT_EQ(Read(), Entries{});
    ASSERT_EQ(ftruncate(file->fd.Get(), 1 << 20), 0);
    EXPECT_EQ(Read(), Entries{}) << "one hole";
}

TEST_P(FileExtents, AppendsToTheEntries) {
    file->Write(0, kBlock);
    file->Sync();
    Entries entries = {{1, 2, 3, 4}};
    EXPECT_TRUE(FileExtentsRead(file->fd.Get(), entries));
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0], (FileMappingEntry{1, 2, 3, 4}));
}

INSTANTIATE_TEST_SUITE_P(Real, FileExtents, testing::Values("ext4", "xfs"),
                         [](const auto &test) { return std::string(test.param); });

class FileExtentsInline : public FileExtents {};

TEST_P(FileExtentsInline, HasNoPlace) {
    file->Write(0, 40);
    file->Sync();
    EXPECT_EQ(Read(), Entries{});
    std::string output;
    EXPECT_EQ(CommandRun({"filefrag", "-v", file->path}, output), 0);
    EXPECT_NE(output.find("inline"), std::string::npos) << "not kept in the inode: " << output;
}

INSTANTIATE_TEST_SUITE_P(Real, FileExtentsInline, testing::Values("inline"),
                         [](const auto &test) { return std::string(test.param); });
} // namespace
} // namespace vesk
