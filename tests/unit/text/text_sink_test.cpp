#include "text/text_sink.h"

#include "base/scoped_fd.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <fcntl.h>
#include <gtest/gtest.h>

namespace vesk {
namespace {
class TextSinkTest : public LeakCheckedTest {
protected:
    ScopedFd OpenFile() const {
        return ScopedFd(open(path_.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    }
    std::string Written() const { return ReadWhole(path_); }
    const TempDir folder_;
    const std::string path_ = folder_.Path("out");
};
} // namespace

TEST_F(TextSinkTest, WithoutADescriptorAllIsKept) {
    TextSink sink;
    const std::string much(200000, 'x');
    sink.Put("a");
    sink.Put(much);
    EXPECT_TRUE(sink.Flush());
    EXPECT_EQ(sink.Kept(), "a" + much);
}

TEST_F(TextSinkTest, WritesWhenEnoughIsThereAndTheRestWhenAsked) {
    const ScopedFd file = OpenFile();
    TextSink sink(file.Get());
    sink.Put(std::string(65535, 'x'));
    EXPECT_EQ(Written(), "");
    sink.Put("yz");
    EXPECT_EQ(Written(), std::string(65535, 'x') + "yz");
    EXPECT_EQ(sink.Kept(), "");
    sink.Put("end");
    EXPECT_TRUE(sink.Flush());
    EXPECT_EQ(Written(), std::string(65535, 'x') + "yzend");
}

TEST_F(TextSinkTest, AWriteThatTakesOnlyPartOrIsInterruptedIsGoneOnWith) {
    const ScopedFd file = OpenFile();
    TextSink sink(file.Get());
    sink.Put("abcdef");
    FakeLibc::Limit("write", 2, 1);
    FakeLibc::Fail("write", EINTR, 2);
    EXPECT_TRUE(sink.Flush());
    EXPECT_EQ(Written(), "abcdef");
}

TEST_F(TextSinkTest, WhatIsNotTakenIsAFailure) {
    const ScopedFd file = OpenFile();
    TextSink sink(file.Get());
    sink.Put("abc");
    FakeLibc::Limit("write", 0, 1);
    EXPECT_FALSE(sink.Flush());
    EXPECT_EQ(FakeLibc::Calls("write"), 1);
}

TEST_F(TextSinkTest, AFailureIsForGoodAndTellsItsCauseAlsoLater) {
    const ScopedFd file = OpenFile();
    TextSink sink(file.Get());
    FakeLibc::Fail("write", ENOSPC, 1);
    sink.Put(std::string(65536, 'x'));
    sink.Put("more");
    errno = ENOENT; // of something else meanwhile
    EXPECT_FALSE(sink.Flush());
    EXPECT_EQ(errno, ENOSPC);
    EXPECT_EQ(FakeLibc::Calls("write"), 1);
    EXPECT_EQ(Written(), ""); // nothing behind a hole
}
} // namespace vesk
