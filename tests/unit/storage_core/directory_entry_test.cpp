#include "storage_core/directory_entry.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <utility>
#include <vector>

namespace vesk {
namespace {
using Listing = std::vector<std::pair<uint64_t, const char *>>;

// The name that a search over these entries ends with, "(none)" where it finds no single file.
std::string SearchIn(const Listing &entries, uint64_t wanted) {
    InodeSearch search;
    search.wanted = wanted;
    for (const auto &[inode, name] : entries) {
        InodeSearchOffer(search, inode, name);
    }
    return InodeSearchFound(search) ? search.name : "(none)";
}

constexpr uint64_t k4G = uint64_t{1} << 32;

TEST(InodeSearch, ExactNumberWins) {
    EXPECT_EQ(SearchIn({{11, "a"}, {12, "b"}, {13, "c"}}, 12), "b");
    EXPECT_EQ(SearchIn({{k4G + 12, "high"}, {12, "low"}}, 12), "low");
    EXPECT_EQ(SearchIn({{12, "low"}, {k4G + 12, "high"}}, 12), "low");
    EXPECT_EQ(SearchIn({{12, "low"}, {k4G + 12, "high"}}, k4G + 12), "high");
    EXPECT_EQ(SearchIn({{k4G + 12, "a"}, {2 * k4G + 12, "b"}, {12, "c"}}, 12), "c");
}

TEST(InodeSearch, LowBitsFindAFileOfAHighNumber) {
    EXPECT_EQ(SearchIn({{11, "a"}, {k4G + 12, "b"}}, 12), "b");
    EXPECT_EQ(SearchIn({{5 * k4G + 0xFFFFFFFF, "b"}}, 0xFFFFFFFF), "b");
    EXPECT_EQ(SearchIn({{k4G + 12, "b"}, {k4G + 12, "link"}}, 12), "b") << "a hard link";
}

TEST(InodeSearch, LowBitsOfTwoFilesFindNone) {
    EXPECT_EQ(SearchIn({{k4G + 12, "a"}, {2 * k4G + 12, "b"}}, 12), "(none)");
}

TEST(InodeSearch, FullNumberIsNotTakenForLowBits) {
    EXPECT_EQ(SearchIn({{12, "a"}, {2 * k4G + 12, "b"}}, k4G + 12), "(none)");
}

TEST(InodeSearch, NoneInAnEmptyDirectory) {
    EXPECT_EQ(SearchIn({}, 12), "(none)");
}

uint64_t InodeOfPath(const std::string &path) {
    struct stat status = {};
    EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
    return status.st_ino;
}

ScopedFd OpenIn(const std::string &directory, uint64_t inode) {
    const ScopedFd folder(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return DirectoryOpenFile(folder.Get(), FolderIdentityOf(folder.Get()), inode);
}

TEST(DirectoryOpenFile, OpensJustThatFile) {
    const TestFolder folder;
    const std::string path = folder.FileMake("wanted", "text");
    folder.FileMake("other", "text");
    const ScopedFd file = OpenIn(folder.Path(), InodeOfPath(path));
    ASSERT_TRUE(file.IsOpen());
    struct stat status = {};
    ASSERT_EQ(fstat(file.Get(), &status), 0);
    EXPECT_EQ(status.st_ino, InodeOfPath(path));
    EXPECT_EQ(fcntl(file.Get(), F_GETFL) & O_ACCMODE, O_RDONLY);
    EXPECT_NE(fcntl(file.Get(), F_GETFD) & FD_CLOEXEC, 0);
}

TEST(DirectoryOpenFile, OpensNothingButRegularFilesOfThisDirectory) {
    const TestFolder folder;
    const std::string link = folder.Path("link");
    const std::string fifo = folder.Path("fifo");
    const std::string below = folder.Path("below");
    std::filesystem::create_directory(below);
    const std::string inner = folder.FileMake("below/inner", "text");
    std::filesystem::create_symlink(inner, link);
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    for (const std::string &path : {link, fifo, below, inner}) {
        EXPECT_FALSE(OpenIn(folder.Path(), InodeOfPath(path)).IsOpen()) << path;
    }
    EXPECT_TRUE(OpenIn(below, InodeOfPath(inner)).IsOpen());
}

// The folder's files are remembered; what happens to them at once, within one tick of its clock,
// must not be hidden by that.
TEST(DirectoryOpenFile, SeesWhatHappensBetweenItsCalls) {
    const TestFolder folder;
    const uint64_t first = InodeOfPath(folder.FileMake("first", "text"));
    ASSERT_TRUE(OpenIn(folder.Path(), first).IsOpen());
    for (int i = 0; i < 100; ++i) {
        const std::string path = folder.FileMake("another", "text");
        const uint64_t another = InodeOfPath(path);
        ASSERT_TRUE(OpenIn(folder.Path(), another).IsOpen()) << i;
        std::filesystem::rename(path, folder.Path("renamed"));
        ASSERT_TRUE(OpenIn(folder.Path(), another).IsOpen()) << i;
        ASSERT_TRUE(OpenIn(folder.Path(), first).IsOpen()) << i;
        std::filesystem::remove(folder.Path("renamed"));
        ASSERT_FALSE(OpenIn(folder.Path(), another).IsOpen()) << i;
    }
}

TEST(DirectoryOpenFile, FailsOnWhatIsNoDirectory) {
    const TestFolder folder;
    const std::string path = folder.FileMake("file", "text");
    const uint64_t inode = InodeOfPath(path);
    EXPECT_FALSE(OpenIn(path, inode).IsOpen());
    EXPECT_FALSE(OpenIn(folder.Path("missing"), inode).IsOpen());
    EXPECT_FALSE(OpenIn("", inode).IsOpen());
}

TEST(DirectoryOpenFile, LeavesNoDescriptorOpen) {
    const TestFolder folder;
    const uint64_t inode = InodeOfPath(folder.FileMake("file", "text"));
    const auto lowestFree = [] {
        const ScopedFd probe(open("/dev/null", O_RDONLY | O_CLOEXEC));
        return probe.Get();
    };
    const int before = lowestFree();
    EXPECT_TRUE(OpenIn(folder.Path(), inode).IsOpen());
    EXPECT_FALSE(OpenIn(folder.Path(), inode + 1000000).IsOpen());
    EXPECT_EQ(lowestFree(), before);
}

// A filesystem so large that its later groups have inode numbers above 32 bits.
TEST(DirectoryOpenFile, FindsRealFilesByTheLow32Bits) {
    const TestVolume volume("huge", "mkfs.xfs -q -K -d agcount=6 -l size=64m",
                            uint64_t{5} * 1024 * 1024 * kMegabyte);
    if (!volume.skipReason.empty()) {
        GTEST_SKIP() << volume.skipReason;
    }
    // The filesystem spreads directories over its groups, and files keep to their directory's.
    std::vector<std::string> high; // directories whose file is numbered above 32 bits
    for (const char *name : {"/a", "/b", "/c", "/d", "/e", "/f"}) {
        const std::string directory = volume.mountPath + name;
        std::filesystem::create_directory(directory);
        if (TestFile(directory + "/file").Inode() >= k4G) {
            high.push_back(directory);
        }
    }
    ASSERT_GE(high.size(), 2U);
    const uint64_t inode = InodeOfPath(high[0] + "/file");
    const uint64_t low = static_cast<uint32_t>(inode);
    EXPECT_TRUE(OpenIn(high[0], inode).IsOpen());
    EXPECT_TRUE(OpenIn(high[0], low).IsOpen());
    EXPECT_FALSE(OpenIn(high[0], inode + k4G).IsOpen());

    // A hard link brings a file with the same low bits into the directory.
    for (const std::string &other : high) {
        const uint64_t twin = InodeOfPath(other + "/file");
        if (twin != inode && static_cast<uint32_t>(twin) == low) {
            std::filesystem::create_hard_link(other + "/file", high[0] + "/twin");
            EXPECT_FALSE(OpenIn(high[0], low).IsOpen());
            EXPECT_TRUE(OpenIn(high[0], inode).IsOpen());
            return;
        }
    }
    FAIL() << "no two files with the same low bits";
}
} // namespace
} // namespace vesk
