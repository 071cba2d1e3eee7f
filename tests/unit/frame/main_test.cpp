#include "base/scoped_fd.h"
#include "tests/support/private_world.h"
#include "tests/unit/model/volume_fixture.h"

#include <fcntl.h>
#include <unistd.h>

namespace vesk {
extern "C" int CompanionMain(int argc, char *argv[]); // the companion's main

namespace {
const bool kPrivateWorld = UsePrivateWorld();

class CompanionMainTest : public VolumeTest {
protected:
    // Runs it with standard output here.
    int RunInto(int output, const Texts &arguments) {
        std::vector<std::string> all{"veskpin"};
        all.insert(all.end(), arguments.begin(), arguments.end());
        std::vector<char *> pointers;
        for (std::string &argument : all) {
            pointers.push_back(&argument[0]);
        }
        const ScopedFd saved(dup(STDOUT_FILENO));
        EXPECT_NE(dup2(output, STDOUT_FILENO), -1);
        testing::internal::CaptureStderr();
        const int status = CompanionMain(static_cast<int>(all.size()), pointers.data());
        said_ = testing::internal::GetCapturedStderr();
        dup2(saved.Get(), STDOUT_FILENO);
        return status;
    }
    int Run(const Texts &arguments) {
        const std::string path = folder_.Path("out");
        const ScopedFd file(open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
        const int status = RunInto(file.Get(), arguments);
        printed_ = ReadWhole(path);
        return status;
    }
    const std::string config_ = folder_.Path("pins.json");
    std::string printed_;
    std::string said_;
};
} // namespace

TEST_F(CompanionMainTest, AnswersOnStandardOutputWithTheCommandsStatus) {
    WriteWhole(config_, R"({"volumes": {"/volume9": {"files": {"5": "a"}}}})");
    EXPECT_EQ(Run({"export", "--config", config_}), 0);
    EXPECT_EQ(printed_, "/volume9/a\n");
    EXPECT_EQ(Run({"export", "--config", config_, "/volume8"}), 3);
    EXPECT_EQ(printed_, "");
    EXPECT_EQ(said_, "veskpin: /volume8: is no volume\n");
}

TEST_F(CompanionMainTest, WrongUsageIsStatus2AndHelpStatus0) {
    EXPECT_EQ(Run({}), 2);
    EXPECT_EQ(printed_, "");
    EXPECT_EQ(Run({"plan"}), 2);
    EXPECT_EQ(said_, "veskpin: plan needs a PATH\n");
    EXPECT_EQ(Run({"--help"}), 0);
    EXPECT_NE(printed_.find("plan"), std::string::npos);
    EXPECT_EQ(said_, "");
}

TEST_F(CompanionMainTest, TheLibrariesWordsAreAnErrorOfTheAnswerAndGoNowhereElse) {
    WriteWhole(config_, "{");
    EXPECT_EQ(Run({"list", "--json", "--config", config_}), 3);
    EXPECT_EQ(printed_, R"({"command":"list","schema":1,"files":[],"folders":[],"errors":[)"
                        R"({"path":")" +
                            config_ + R"(","text":"Prase file )" + config_ + R"( error"}]})" +
                            "\n");
    EXPECT_EQ(said_, "");
}

TEST_F(CompanionMainTest, AnAnswerThatCannotBeWrittenIsNotDone) {
    const ScopedFd full(open("/dev/full", O_WRONLY | O_CLOEXEC));
    ASSERT_TRUE(full.IsOpen());
    EXPECT_EQ(RunInto(full.Get(), {"list", "--json", "--config", config_}), 1);
    EXPECT_EQ(said_, "veskpin: standard output: No space left on device\n");
    EXPECT_EQ(RunInto(full.Get(), {"--help"}), 1);
    WriteWhole(config_, "{"); // what weighs more stays
    EXPECT_EQ(RunInto(full.Get(), {"list", "--json", "--config", config_}), 3);
}

TEST_F(CompanionMainTest, ALackOfMemoryIsAnUnknownAnswer) {
    FakeLibc::Count("strdup");
    EXPECT_EQ(Run({"list", "--config", config_}), 0);
    const int copies = FakeLibc::Calls("strdup");
    int exceptions = 0;
    for (int i = 1; i <= copies; ++i) {
        FakeLibc::Fail("strdup", ENOMEM, i);
        const int status = Run({"list", "--config", config_});
        if (said_ == "veskpin: std::bad_alloc\n") {
            EXPECT_EQ(status, 3);
            ++exceptions;
        }
    }
    EXPECT_GE(exceptions, 1);
}
} // namespace vesk
