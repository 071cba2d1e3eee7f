#include "files/file_whole.h"

#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>

namespace vesk {
namespace {
class FileWholeTest : public LeakCheckedTest {
protected:
    const TempDir folder_;
};
} // namespace

TEST_F(FileWholeTest, AWholeFileIsReadUpToItsLimit) {
    const std::string path = folder_.FileMake("file", std::string(70000, 'x'));
    std::string content = "old";
    EXPECT_EQ(FileReadAll(path, 70000, &content), 0);
    EXPECT_EQ(content, std::string(70000, 'x'));
    EXPECT_EQ(FileReadAll(path, 69999, &content), EFBIG);
    EXPECT_EQ(FileReadAll(folder_.Path(), 70000, &content), EINVAL);
    EXPECT_EQ(FileReadAll(folder_.Path("missing"), 70000, &content), ENOENT);
    EXPECT_EQ(FileReadAll(folder_.FileMake("empty", ""), 0, &content), 0);
    EXPECT_EQ(content, "");
    FakeLibc::Fail("read", EIO, 2);
    EXPECT_EQ(FileReadAll(path, 70000, &content), EIO);
}
} // namespace vesk
