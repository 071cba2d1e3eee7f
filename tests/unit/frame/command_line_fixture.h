// What the tests of the command line share: arguments to what is to be done.
#pragma once

#include "frame/command_line.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cstdlib>
#include <string>
#include <vector>

namespace vesk {
using Arguments = std::vector<std::string>;

class CommandLineTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        unsetenv("VESKPIN_CONFIG");
        unsetenv("NO_COLOR");
    }
    // Reads the line; false where nothing is to be done.
    bool Read(const Arguments &arguments) {
        std::vector<std::string> all{"veskpin"};
        all.insert(all.end(), arguments.begin(), arguments.end());
        std::vector<char *> pointers;
        for (std::string &argument : all) {
            pointers.push_back(&argument[0]);
        }
        TextSink sink;
        testing::internal::CaptureStderr();
        const auto line =
            CommandLineRead(static_cast<int>(all.size()), pointers.data(), sink, &status_);
        said_ = testing::internal::GetCapturedStderr();
        printed_ = sink.Kept();
        line_ = line.value_or(CommandLine());
        return line.has_value();
    }
    // The PATHs, or VOLUMEs, that these arguments name; what is said where they are wrong.
    Arguments Paths(const Arguments &arguments) {
        return Read(arguments) ? line_.settings.paths : Arguments{said_};
    }
    // Whether the line is wrong usage, with a message and nothing printed.
    bool IsRefused(const Arguments &arguments) {
        const bool isRead = Read(arguments);
        return !isRead && status_ == ExitStatus::Usage && printed_.empty() &&
               said_.compare(0, 9, "veskpin: ") == 0 && said_.back() == '\n';
    }

    CommandLine line_;
    ExitStatus status_ = ExitStatus::Done;
    std::string printed_;
    std::string said_;
};
} // namespace vesk
