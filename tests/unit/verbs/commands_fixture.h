// Whole commands against the fakes: a volume, its cache device, a configuration file, and what is
// answered.
#pragma once

#include "tests/unit/model/volume_fixture.h"
#include "verbs/verbs.h"

#include <map>
#include <string>
#include <sys/stat.h>

namespace vesk {
class CommandsTest : public VolumeTest {
protected:
    void SetUp() override {
        VolumeTest::SetUp();
        settings_.configPath = config_;
        FakeAppliance::onLookup = [this](const std::string &, uint64_t inode, int,
                                         FileMappingTable &table) {
            const auto block = blockOf_.find(inode);
            if (block != blockOf_.end()) {
                table.entries.push_back(FakeExtent(0, 8, block->second * 128));
            }
            return 0;
        };
    }
    // Makes a file of the volume with this block; its inode number as text.
    std::string Make(const std::string &relativePath, uint64_t block) {
        const std::string path = mountPath_ + "/" + relativePath;
        WriteWhole(path, "x");
        struct stat status {};
        EXPECT_EQ(lstat(path.c_str(), &status), 0);
        const auto inode = static_cast<uint32_t>(status.st_ino);
        blockOf_[inode] = block;
        return std::to_string(inode);
    }
    // Records these members of "files".
    void Record(const std::string &files) const {
        WriteWhole(config_,
                   R"({"volumes": {")" + mountPath_ + R"(": {"files": {)" + files + "}}}}");
    }
    // Runs the command; its answer stays in answer_ and what it says to people in said_.
    int Run(ExitStatus (*command)(const Settings &, TextSink &)) {
        TextSink sink;
        testing::internal::CaptureStderr();
        const ExitStatus status = command(settings_, sink);
        said_ = testing::internal::GetCapturedStderr();
        answer_ = sink.Kept();
        return static_cast<int>(status);
    }
    bool Answers(const std::string &text) const { return answer_.find(text) != std::string::npos; }

    const std::string config_ = folder_.Path("pins.json");
    std::map<uint64_t, uint64_t> blockOf_; // by inode
    Settings settings_;
    std::string answer_;
    std::string said_;
};
} // namespace vesk
