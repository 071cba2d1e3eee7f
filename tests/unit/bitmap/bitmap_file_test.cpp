#include "bitmap/bitmap_file.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/private_mounts.h"
#include "tests/support/recorded_opens.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const bool kPrivateMounts = UsePrivateMounts();

using Messages = std::vector<std::string>;

// Bytes of which no two neighbours and no two chunks are alike.
std::string Pattern(size_t size) {
    std::string bytes(size, '\0');
    for (size_t i = 0; i < size; ++i) {
        bytes[i] = static_cast<char>(i * 7 + i / 4096 + 1);
    }
    return bytes;
}

class BitmapFileTest : public LeakCheckedTest {
protected:
    // Reads the file into a zeroed bitmap of this size, which must keep to it.
    int Read(uint32_t size) {
        memory = std::string(size, '\0') + "#";
        PinBitmap bitmap = {reinterpret_cast<unsigned char *>(&memory[0]), size};
        const int result = BitmapInitByFile(path.c_str(), &bitmap);
        EXPECT_EQ(memory.back(), '#');
        memory.pop_back();
        return result;
    }
    static int Write(std::string bytes, const std::string &target) {
        PinBitmap bitmap = {reinterpret_cast<unsigned char *>(&bytes[0]),
                            static_cast<uint32_t>(bytes.size())};
        return BitmapWriteToFile(&bitmap, target.c_str());
    }
    int Write(const std::string &bytes) { return Write(bytes, path); }

    TempDir folder;
    const std::string path = folder.Path("veskcachepinfile.bitmap");
    std::string memory; // what Read has read into
};

using BitmapInitByFileTest = BitmapFileTest;
using BitmapWriteToFileTest = BitmapFileTest;
} // namespace

TEST_F(BitmapInitByFileTest, ReadsFilesOfEverySizeAroundAChunk) {
    CapturedLog log;
    for (const size_t size : {0U, 1U, 4095U, 4096U, 4097U, 8192U, 10000U}) {
        WriteWhole(path, Pattern(size));
        EXPECT_EQ(Read(static_cast<uint32_t>(size)), 0);
        EXPECT_TRUE(memory == Pattern(size)) << size;
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(BitmapInitByFileTest, ReadsChunksOf4096Bytes) {
    CapturedLog log(3);
    WriteWhole(path, Pattern(10000));
    FakeLibc::Count("read");
    EXPECT_EQ(Read(10000), 0);
    EXPECT_EQ(FakeLibc::Calls("read"), 3);
    EXPECT_EQ(log.Messages(),
              (Messages{"BitmapInitByFile() [N]: Start read to memory, size = 10000",
                        "BitmapInitByFile() [N]: Next read start = 0 bytes=4096",
                        "BitmapInitByFile() [N]: Next read start = 4096 bytes=4096",
                        "BitmapInitByFile() [N]: Next read start = 8192 bytes=1808",
                        "BitmapInitByFile() [N]: Read to memory finish"}));
}

// Whatever lies there: no link is followed and nothing is waited for.
TEST_F(BitmapInitByFileTest, OpensTheFileForReading) {
    WriteWhole(path, Pattern(10));
    const RecordedOpens opens;
    EXPECT_EQ(Read(10), 0);
    EXPECT_EQ(opens.FlagsOf(path),
              std::vector<int>{O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC});
}

TEST_F(BitmapInitByFileTest, ShorterFileFillsTheStart) {
    WriteWhole(path, Pattern(5000));
    CapturedLog log(2);
    EXPECT_EQ(Read(6000), 0);
    EXPECT_TRUE(memory == Pattern(5000) + std::string(1000, '\0'));
    EXPECT_EQ(log.Messages(), (Messages{"BitmapInitByFile() [N]: Start read to memory, size = 6000",
                                        "BitmapInitByFile() [N]: Read to memory finish"}));
}

TEST_F(BitmapInitByFileTest, LongerFileFillsTheWholeBitmapAndNoMore) {
    CapturedLog log;
    WriteWhole(path, Pattern(9000));
    EXPECT_EQ(Read(5000), 0);
    EXPECT_TRUE(memory == Pattern(5000));
}

TEST_F(BitmapInitByFileTest, ShortReadIsContinued) {
    CapturedLog log(3);
    WriteWhole(path, Pattern(5000));
    FakeLibc::Limit("read", 100);
    EXPECT_EQ(Read(5000), 0);
    EXPECT_TRUE(memory == Pattern(5000));
    EXPECT_TRUE(log.Has("BitmapInitByFile() [N]: Next read start = 100 bytes=4096"));
    EXPECT_TRUE(log.Has("BitmapInitByFile() [N]: Next read start = 4196 bytes=804"));
}

TEST_F(BitmapInitByFileTest, ReadThatGivesNothingIsRepeated) {
    CapturedLog log(3);
    WriteWhole(path, Pattern(10));
    FakeLibc::Limit("read", 0);
    EXPECT_EQ(Read(10), 0);
    EXPECT_TRUE(memory == Pattern(10));
    EXPECT_EQ(log.Count("BitmapInitByFile() [N]: Next read start = 0 bytes=10"), 2);
}

// Its size is asked for by its name first: by then another file may lie there.
TEST_F(BitmapInitByFileTest, FileThatHasBecomeShorterIsAnError) {
    WriteWhole(path, Pattern(10));
    FakeLibc::onStat = [](struct stat *status) { status->st_size = 11; };
    CapturedLog log;
    EXPECT_EQ(Read(20), -1);
    EXPECT_EQ(log.Text(), "tool: Read bitmap file (" + path + ") error\n\n");
}

TEST_F(BitmapInitByFileTest, FileThatIsCutWhileItIsReadIsAnError) {
    WriteWhole(path, Pattern(10000));
    int reads = 0;
    FakeLibc::onRead = [&](int, long long, size_t) {
        if (++reads == 2) {
            EXPECT_EQ(truncate(path.c_str(), 4096), 0);
        }
    };
    CapturedLog log;
    EXPECT_EQ(Read(10000), -1);
    EXPECT_EQ(log.Text(), "tool: Read bitmap file (" + path + ") error\n\n");
    EXPECT_EQ(reads, 2);
}

TEST_F(BitmapInitByFileTest, LinksAreNotFollowed) {
    WriteWhole(path, Pattern(10));
    const std::string target = path + ".target";
    std::filesystem::rename(path, target);
    for (const bool dangling : {false, true}) {
        if (dangling) {
            std::filesystem::remove(target);
        } else {
            ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
        }
        CapturedLog log;
        EXPECT_EQ(Read(10), -1);
        EXPECT_EQ(log.Text(), "tool: Can't open bitmap file (" + path + ")\n\n");
    }
}

TEST_F(BitmapInitByFileTest, FailedReadIsAnError) {
    WriteWhole(path, Pattern(10000));
    FakeLibc::Fail("read", EIO, 2);
    CapturedLog log;
    EXPECT_EQ(Read(10000), -1);
    EXPECT_EQ(log.Text(), "tool: Read bitmap file (" + path + ") error\n\n");
    EXPECT_EQ(FakeLibc::Calls("read"), 2);
}

TEST_F(BitmapInitByFileTest, MissingArgumentsAreAnError) {
    CapturedLog log(2);
    unsigned char byte = 0;
    PinBitmap bitmap = {&byte, 1};
    PinBitmap without = {nullptr, 1};
    EXPECT_EQ(BitmapInitByFile(nullptr, &bitmap), -1);
    EXPECT_EQ(BitmapInitByFile(path.c_str(), nullptr), -1);
    EXPECT_EQ(BitmapInitByFile(path.c_str(), &without), -1);
    EXPECT_EQ(log.Count("BitmapInitByFile() [N] : ***** Incorrect parameter"), 3);
    EXPECT_EQ(log.Lines().size(), 3U);
}

TEST_F(BitmapInitByFileTest, MissingFileIsAnError) {
    CapturedLog log;
    EXPECT_EQ(Read(10), -1);
    EXPECT_EQ(log.Text(), "tool: Can't get file (" + path + ") stat result\n" +
                              "tool: Get the size of file (" + path + ") error\n");
}

TEST_F(BitmapInitByFileTest, FileThatCannotBeOpenedIsAnError) {
    ASSERT_EQ(mknod(path.c_str(), S_IFSOCK | 0600, 0), 0); // nobody can open a socket
    CapturedLog log;
    EXPECT_EQ(Read(10), -1);
    EXPECT_EQ(log.Text(), "tool: Can't open bitmap file (" + path + ")\n\n");
}

TEST_F(BitmapInitByFileTest, FolderIsAnError) {
    ASSERT_EQ(mkdir(path.c_str(), 0700), 0);
    FakeLibc::onStat = [](struct stat *status) { status->st_size = 4096; };
    CapturedLog log;
    EXPECT_EQ(Read(4096), -1);
    EXPECT_EQ(log.Text(), "tool: Read bitmap file (" + path + ") error\n\n");
}

TEST_F(BitmapWriteToFileTest, WritesBitmapsOfEverySizeAroundAChunk) {
    CapturedLog log;
    for (const size_t size : {1U, 4095U, 4096U, 4097U, 8192U, 10000U}) {
        unlink(path.c_str());
        EXPECT_EQ(Write(Pattern(size)), 0);
        EXPECT_TRUE(ReadWhole(path) == Pattern(size)) << size;
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(BitmapWriteToFileTest, WritesChunksOf4096BytesAndDoesNotSync) {
    CapturedLog log;
    FakeLibc::Count("write");
    FakeLibc::Count("fsync");
    EXPECT_EQ(Write(Pattern(8193)), 0);
    EXPECT_EQ(FakeLibc::Calls("write"), 3);
    EXPECT_EQ(FakeLibc::Calls("fsync"), 0);
}

TEST_F(BitmapWriteToFileTest, OpensTheFileForReadingAndWriting) {
    const RecordedOpens opens;
    EXPECT_EQ(Write(Pattern(10)), 0);
    EXPECT_EQ(opens.FlagsOf(path),
              std::vector<int>{O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC});
}

TEST_F(BitmapWriteToFileTest, EmptyBitmapMakesAnEmptyFile) {
    CapturedLog log;
    FakeLibc::Count("write");
    EXPECT_EQ(Write(""), 0);
    EXPECT_EQ(FakeLibc::Calls("write"), 0);
    EXPECT_EQ(access(path.c_str(), F_OK), 0);
    EXPECT_EQ(ReadWhole(path), "");
}

TEST_F(BitmapWriteToFileTest, NewFileHasMode0644LessTheMask) {
    CapturedLog log;
    struct stat status {};
    const mode_t saved = umask(0);
    EXPECT_EQ(Write("a"), 0);
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0644U);
    unlink(path.c_str());
    umask(077);
    EXPECT_EQ(Write("a"), 0);
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0600U);
    umask(saved);
}

TEST_F(BitmapWriteToFileTest, LongerFileKeepsItsTailAndLength) {
    CapturedLog log;
    WriteWhole(path, std::string(5000, '#'));
    EXPECT_EQ(Write(Pattern(4100)), 0);
    EXPECT_TRUE(ReadWhole(path) == Pattern(4100) + std::string(900, '#'));
}

TEST_F(BitmapWriteToFileTest, ShortWriteIsContinued) {
    CapturedLog log;
    FakeLibc::Limit("write", 100);
    EXPECT_EQ(Write(Pattern(5000)), 0);
    EXPECT_TRUE(ReadWhole(path) == Pattern(5000));
    EXPECT_EQ(FakeLibc::Calls("write"), 3); // 100, 4096, 804
}

TEST_F(BitmapWriteToFileTest, SizeIsToldAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(Write(Pattern(5000)), 0);
    EXPECT_EQ(log.Messages(), (Messages{"BitmapWriteToFile() [N]: Bytes to write = 5000",
                                        "BitmapWriteToFile() [N]: Write to bitmap file (" + path +
                                            ") size (5000) Finish"}));
}

TEST_F(BitmapWriteToFileTest, FailedWriteIsAnErrorAndLeavesWhatWasWritten) {
    WriteWhole(path, std::string(6000, '#'));
    FakeLibc::Fail("write", ENOSPC, 2);
    CapturedLog log;
    EXPECT_EQ(Write(Pattern(6000)), -1);
    EXPECT_EQ(log.Text(), "tool: Write bitmap file (" + path + ") error\n\n");
    EXPECT_EQ(FakeLibc::Calls("write"), 2);
    EXPECT_TRUE(ReadWhole(path) == Pattern(4096) + std::string(1904, '#'));
}

TEST_F(BitmapWriteToFileTest, DevicesAreRefused) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    ASSERT_TRUE(MakeCharacterDevice(path, 1, 7));
    CapturedLog log;
    EXPECT_EQ(Write("a"), -1);
    EXPECT_EQ(log.Text(), "tool: Can't open bitmap file (" + path + ") \n\n");
}

TEST_F(BitmapWriteToFileTest, LinksAreNotFollowed) {
    const std::string target = folder.Path("target");
    WriteWhole(target, "old");
    ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
    CapturedLog log;
    EXPECT_EQ(Write("a"), -1);
    EXPECT_EQ(log.Text(), "tool: Can't open bitmap file (" + path + ") \n\n");
    EXPECT_EQ(ReadWhole(target), "old");
}

TEST_F(BitmapWriteToFileTest, FileThatCannotBeOpenedIsAnError) {
    CapturedLog log(2);
    EXPECT_EQ(Write("a", "/no/such/file"), -1);
    EXPECT_EQ(
        log.Messages(),
        (Messages{"BitmapWriteToFile() [N]: Bytes to write = 1",
                  "BitmapWriteToFile() [N] : ***** Can't open bitmap file (/no/such/file) ", ""}));
}
} // namespace vesk
