#include "text/work_progress.h"

#include "base/scoped_fd.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <array>
#include <cstdlib>
#include <functional>
#include <string>

namespace vesk {
namespace {
std::string Written(ProgressForm form, const Work &work,
                    const std::function<void(WorkProgress &)> &steps) {
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) {
        return "no pipe";
    }
    const ScopedFd output(ends[0]);
    {
        const ScopedFd input(ends[1]);
        WorkProgress progress(form, work, input.Get());
        steps(progress);
    }
    std::string text;
    char letter = 0;
    while (read(output.Get(), &letter, 1) == 1) {
        text += letter;
    }
    return text;
}

// The number behind the name.
long Member(const std::string &text, const std::string &name) {
    const size_t at = text.find("\"" + name + "\":");
    return at == std::string::npos ? -1 : strtol(text.c_str() + at + name.size() + 3, nullptr, 10);
}
} // namespace

TEST(WorkProgressTest, BeforeAnythingIsDoneTheEstimateIsToldLessTheTime) {
    const std::string text =
        Written(ProgressForm::Json, {10, 640 * 128, 200}, [](WorkProgress &progress) {
            usleep(600000);
            progress.Tick();
        });
    EXPECT_EQ(text.rfind("{\"files\":0,\"total\":10,\"blocks\":0,\"blocksTotal\":640,"
                         "\"blocksPerSecond\":0,\"secondsLeft\":",
                         0),
              0U)
        << text;
    EXPECT_EQ(text.substr(text.size() - 2), "}\n");
    EXPECT_EQ(Member(text, "secondsLeft"), (200500 - Member(text, "milliseconds")) / 1000);
}

TEST(WorkProgressTest, TheRestTakesAsLongAsThePartThatIsDone) {
    const auto text = [](uint64_t files, uint64_t blocks) {
        return Written(ProgressForm::Json, {10, 128000, 500}, [&](WorkProgress &progress) {
            usleep(600000);
            progress.Done(files, blocks * 128);
        });
    };
    // A tenth is done, of the files or of the blocks: whatever is further behind counts.
    for (const std::string &behind : {text(5, 100), text(1, 500)}) {
        EXPECT_LE(labs(Member(behind, "secondsLeft") - 9 * Member(behind, "milliseconds") / 1000),
                  1)
            << behind;
    }
    EXPECT_EQ(Member(text(10, 1000), "secondsLeft"), 0);
    const std::string rate = text(1, 100);
    EXPECT_EQ(Member(rate, "blocksPerSecond"), 100000 / Member(rate, "milliseconds"));
}

TEST(WorkProgressTest, ProgramsThatWereToldAreToldTheEnd) {
    const std::string text = Written(ProgressForm::Json, {2, 256, 9}, [](WorkProgress &progress) {
        usleep(250000);
        progress.Done(1, 128);
        progress.More(1);
        progress.Done(2, 128);
        progress.End();
    });
    const size_t second = text.find('\n') + 1;
    EXPECT_EQ(text.rfind("{\"files\":1,\"total\":2,\"blocks\":1,", 0), 0U) << text;
    EXPECT_EQ(text.find("{\"files\":3,\"total\":3,\"blocks\":2,"), second) << text;
    EXPECT_EQ(Written(ProgressForm::Json, {1, 1, 1},
                      [](WorkProgress &progress) {
                          progress.Done(1, 1);
                          progress.End();
                      }),
              "");
}

TEST(WorkProgressTest, WhatIsNotKnownIsNull) {
    const std::string text = Written(ProgressForm::Json, {10, {}, {}}, [](WorkProgress &progress) {
        usleep(250000);
        progress.Tick();
    });
    EXPECT_NE(text.find("\"blocksTotal\":null,"), std::string::npos) << text;
    EXPECT_NE(text.find("\"secondsLeft\":null,"), std::string::npos) << text;
}

TEST(WorkProgressTest, ATerminalGetsALineThatIsClearedAtTheEnd) {
    const std::string text =
        Written(ProgressForm::Line, {4, 64 * 128, 10}, [](WorkProgress &progress) {
            usleep(1100000);
            progress.Done(4, 64 * 128);
        });
    EXPECT_EQ(text.rfind("\r4 of 4 files, 4.0 MiB of 4.0 MiB, ", 0), 0U) << text;
    const std::string end = "/s, 0 s left\033[K\r\033[K";
    EXPECT_EQ(text.substr(text.size() - end.size()), end) << text;
    const std::string few = Written(ProgressForm::Line, {1, {}, {}}, [](WorkProgress &progress) {
        usleep(1100000);
        progress.Tick();
    });
    EXPECT_EQ(few, "\r0 of 1 file, 0 B, 0 B/s\033[K\r\033[K");
}

TEST(WorkProgressTest, NothingIsWrittenWhereNobodyWantsIt) {
    EXPECT_EQ(Written(ProgressForm::None, {1, 1, 1},
                      [](WorkProgress &progress) {
                          usleep(250000);
                          progress.Done(1, 1);
                      }),
              "");
}
} // namespace vesk
