#include "text/text_sink.h"

#include "base/scoped_fd.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <climits>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <string>
#include <thread>
#include <unistd.h>

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

// A pipe that holds one page, full.
class FullPipeTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        int ends[2];
        EXPECT_EQ(pipe(ends), 0);
        reading_ = ScopedFd(ends[0]);
        writing_ = ScopedFd(ends[1]);
        EXPECT_EQ(fcntl(writing_.Get(), F_SETPIPE_SZ, PIPE_BUF), PIPE_BUF);
        EXPECT_EQ(write(writing_.Get(), std::string(PIPE_BUF, '-').data(), PIPE_BUF), PIPE_BUF);
    }
    void TearDown() override {
        reading_ = ScopedFd();
        writing_ = ScopedFd();
        LeakCheckedTest::TearDown();
    }

    ScopedFd reading_;
    ScopedFd writing_;
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

TEST_F(FullPipeTest, WhoIsToEndGivesAReaderUpWhoTakesNothing) {
    TextSink sink(writing_.Get());
    static int asked;
    asked = 0;
    sink.GiveUpWhen([] { return ++asked > 2; });
    sink.Put("abc");
    EXPECT_FALSE(sink.Flush());
    EXPECT_EQ(errno, EINTR);
    EXPECT_EQ(asked, 2 + 11); // ten looks more: a second
    EXPECT_FALSE(sink.Flush());
    EXPECT_EQ(asked, 2 + 11); // for good
}

TEST_F(FullPipeTest, AReaderWhoTakesAPieceNowAndThenGetsAll) {
    TextSink sink(writing_.Get());
    sink.GiveUpWhen([] { return true; });
    const std::string text(3 * PIPE_BUF + 7, 'x');
    sink.Put(text);
    std::string taken;
    std::thread reader([&] {
        char piece[PIPE_BUF];
        while (taken.size() < PIPE_BUF + text.size()) {
            const ssize_t bytes = read(reading_.Get(), piece, sizeof(piece));
            if (bytes <= 0) {
                return;
            }
            taken.append(piece, static_cast<size_t>(bytes));
        }
    });
    EXPECT_TRUE(sink.Flush());
    writing_ = ScopedFd();
    reader.join();
    EXPECT_EQ(taken, std::string(PIPE_BUF, '-') + text);
}
} // namespace vesk
