#include "text/progress.h"

#include "base/scoped_fd.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <array>
#include <string>

namespace vesk {
namespace {
// What the steps write, with a pause before the last 64 of them.
std::string Written(ProgressForm form, uint64_t total, useconds_t pause) {
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) {
        return "no pipe";
    }
    const ScopedFd output(ends[0]);
    {
        const ScopedFd input(ends[1]);
        Progress progress(form, total, input.Get());
        for (int i = 0; i < 128; ++i) {
            if (i == 64) {
                usleep(pause);
            }
            progress.Step();
        }
    }
    std::string text;
    char letter = 0;
    while (read(output.Get(), &letter, 1) == 1) {
        text += letter;
    }
    return text;
}
} // namespace

TEST(ProgressTest, ProgramsGetAnObjectALine) {
    const std::string text = Written(ProgressForm::Json, 0, 250000);
    EXPECT_EQ(text.rfind("{\"files\":128,\"total\":null,\"milliseconds\":", 0), 0U) << text;
    EXPECT_EQ(text.substr(text.size() - 2), "}\n");
    EXPECT_EQ(text.find('\n'), text.size() - 1) << text;
    EXPECT_NE(Written(ProgressForm::Json, 500, 250000).find(",\"total\":500,"), std::string::npos);
}

TEST(ProgressTest, ATerminalGetsALineAfterASecondWhichIsClearedAtTheEnd) {
    EXPECT_EQ(Written(ProgressForm::Line, 500, 1100000),
              "\r128 of 500 files looked at\033[K\r\033[K");
    EXPECT_EQ(Written(ProgressForm::Line, 0, 1100000), "\r128 files looked at\033[K\r\033[K");
    EXPECT_EQ(Written(ProgressForm::Line, 0, 250000), "");
}

TEST(ProgressTest, NothingIsWrittenWhereNobodyWantsIt) {
    EXPECT_EQ(Written(ProgressForm::None, 500, 250000), "");
}

TEST(ProgressTest, FormsGoByTheirNames) {
    EXPECT_EQ(ProgressFormOf("json"), ProgressForm::Json);
    EXPECT_EQ(ProgressFormOf("none"), ProgressForm::None);
}
} // namespace vesk
