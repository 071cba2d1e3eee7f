// What is remembered of a folder between two questions, seen from how often it is read.
#include "storage_core/directory_entry.h"

#include "tests/support/ordinary_user.h"
#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>

#include <dirent.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <ctime>
#include <filesystem>

namespace {
int foldersRead = 0;
time_t secondsAhead = 0; // of the machine's clock
} // namespace

DIR *fdopendir(int fd) {
    static const auto real = reinterpret_cast<DIR *(*)(int)>(dlsym(RTLD_NEXT, "fdopendir"));
    ++foldersRead;
    return real(fd);
}

time_t time(time_t *result) noexcept {
    timespec now = {};
    clock_gettime(CLOCK_REALTIME, &now);
    const time_t seconds = now.tv_sec + secondsAhead;
    if (result != nullptr) {
        *result = seconds;
    }
    return seconds;
}

namespace vesk {
namespace {
class FolderMemoryTest : public testing::Test {
protected:
    void SetUp() override {
        secondsAhead = -1000; // no folder has rested then, however slow the machine
        // A folder may have the number of one that was removed, and its files those of its files.
        const ScopedFd another(open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        DirectoryOpenFile(another.Get(), FolderIdentityOf(another.Get()), 0);
        first_ = Make("first");
        second_ = Make("second");
        EXPECT_EQ(Reads(first_), "opened, read 1");
    }
    void TearDown() override { secondsAhead = 0; }

    uint64_t Make(const std::string &name) {
        struct stat status = {};
        EXPECT_EQ(stat(folder_.FileMake(name, name).c_str(), &status), 0);
        return status.st_ino;
    }
    // Until it shows in the folder's times.
    void ChangeAfterATick() {
        struct stat before = {};
        struct stat after = {};
        ASSERT_EQ(stat(folder_.Path().c_str(), &before), 0);
        do {
            std::filesystem::remove(folder_.Path("third"));
            Make("third");
            ASSERT_EQ(stat(folder_.Path().c_str(), &after), 0);
        } while (after.st_mtim.tv_sec == before.st_mtim.tv_sec &&
                 after.st_mtim.tv_nsec == before.st_mtim.tv_nsec);
    }
    // What opening this file comes to, and how often the folder was read for it.
    std::string Reads(uint64_t inode) {
        const ScopedFd folder(open(folder_.Path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        const FolderIdentity identity = FolderIdentityOf(folder.Get());
        const int before = foldersRead;
        const bool isOpen = DirectoryOpenFile(folder.Get(), identity, inode).IsOpen();
        return (isOpen ? "opened, read " : "not opened, read ") +
               std::to_string(foldersRead - before);
    }

    const TempDir folder_;
    uint64_t first_ = 0;
    uint64_t second_ = 0;
};
} // namespace

TEST_F(FolderMemoryTest, AFolderIsReadOnceForAllOfItsFiles) {
    EXPECT_EQ(Reads(second_), "opened, read 0");
    EXPECT_EQ(Reads(first_), "opened, read 0");
}

// Whoever goes on changing it would otherwise have it read for each of its files.
TEST_F(FolderMemoryTest, AChangedFolderIsNotReadForAFileThatIsStillThere) {
    const uint64_t third = Make("third");
    EXPECT_EQ(Reads(second_), "opened, read 0");
    EXPECT_EQ(Reads(third), "opened, read 1");
    EXPECT_EQ(Reads(second_), "opened, read 0");
}

TEST_F(FolderMemoryTest, ANameThatHasBecomeAnotherFilesIsLookedForAnew) {
    std::filesystem::rename(folder_.Path("second"), folder_.Path("third"));
    const uint64_t other = Make("second");
    EXPECT_EQ(Reads(second_), "opened, read 1");
    EXPECT_EQ(Reads(other), "opened, read 0");
}

TEST_F(FolderMemoryTest, AnotherFolderTakesItsPlace) {
    const TempDir other;
    struct stat status = {};
    ASSERT_EQ(stat(other.FileMake("file", "text").c_str(), &status), 0);
    const ScopedFd folder(open(other.Path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    const FolderIdentity identity = FolderIdentityOf(folder.Get());
    EXPECT_TRUE(DirectoryOpenFile(folder.Get(), identity, status.st_ino).IsOpen());
    EXPECT_EQ(Reads(first_), "opened, read 1");
}

// A change in the same tick of the file system's clock does not show in the folder's times.
TEST_F(FolderMemoryTest, WhatIsNotThereIsLookedForAnewUntilTheFolderHasRested) {
    const uint64_t none = first_ + second_ + 1000000;
    EXPECT_EQ(Reads(none), "not opened, read 1");
    EXPECT_EQ(Reads(none), "not opened, read 1");
    secondsAhead = 1000;
    EXPECT_EQ(Reads(none), "not opened, read 1");
    EXPECT_EQ(Reads(none), "not opened, read 0");
    EXPECT_EQ(Reads(first_), "opened, read 0");
    ChangeAfterATick();
    EXPECT_EQ(Reads(none), "not opened, read 1");
}

// Whoever may read the folder and none of its files would otherwise have it read for each.
TEST_F(FolderMemoryTest, AFileThatMayNotBeOpenedIsNotLookedForAnewInAFolderThatHasRested) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chmod(folder_.Path().c_str(), 0755), 0);
    ASSERT_EQ(chmod(folder_.Path("second").c_str(), 0), 0);
    secondsAhead = 1000;
    EXPECT_EQ(Reads(1), "not opened, read 1");
    const OrdinaryUser user;
    EXPECT_EQ(Reads(second_), "not opened, read 0");
    EXPECT_EQ(Reads(first_), "opened, read 0");
}
} // namespace vesk
