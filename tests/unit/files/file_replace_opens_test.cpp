// How FileReplaceContent opens what it writes.
#include "files/file_replace.h"

#include "tests/support/recorded_opens.h"
#include "tests/unit/files/file_replace_fixture.h"

#include <cerrno>

namespace vesk {
namespace {
class FileReplaceOpensTest : public FileReplaceTest {
protected:
    // Of the temporary file, and of the folder.
    static void ExpectNewFile(const RecordedOpens &opens, unsigned mode) {
        int found = 0;
        for (const RecordedOpen &one : opens.all) {
            if (one.path.rfind(".veskcachepinfile.", 0) == 0) {
                EXPECT_EQ(one.flags, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC);
                EXPECT_EQ(one.mode, mode);
                ++found;
            }
        }
        EXPECT_EQ(found, 1);
    }
    // Every time: to write at once or not at all, and for no program that may be started.
    static void ExpectWritten(const RecordedOpens &opens, const std::string &file) {
        const std::vector<int> flags = opens.FlagsOf(file);
        EXPECT_FALSE(flags.empty());
        for (const int one : flags) {
            EXPECT_EQ(one & (O_ACCMODE | O_NONBLOCK | O_CLOEXEC | O_APPEND | O_EXCL),
                      O_WRONLY | O_NONBLOCK | O_CLOEXEC);
        }
    }
};
} // namespace

TEST_F(FileReplaceOpensTest, AFileThatIsReplaced) {
    const RecordedOpens opens;
    ASSERT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    ExpectWritten(opens, path);
    ExpectNewFile(opens, 0600); // its mode is given to it when it has its owner
    EXPECT_EQ(opens.FlagsOf(folder.Path() + "/"),
              std::vector<int>{O_RDONLY | O_DIRECTORY | O_CLOEXEC});
}

TEST_F(FileReplaceOpensTest, AFileThatIsMissing) {
    const RecordedOpens opens;
    ASSERT_EQ(FileReplaceContent(folder.Path("new").c_str(), fresh), FileReplaceResult::Done);
    ExpectNewFile(opens, 0666);
}

TEST_F(FileReplaceOpensTest, AFileThatIsWrittenInPlace) {
    const std::string created = folder.Path("new");
    for (const std::string &file : {path, created}) {
        const RecordedOpens opens;
        FakeLibc::Fail("rename", EXDEV);
        ASSERT_EQ(FileReplaceContent(file.c_str(), fresh), FileReplaceResult::Done);
        ExpectWritten(opens, file);
    }
    EXPECT_EQ(Status(created).st_mode & 07777, 0644U);
}
} // namespace vesk
