#include "files/file_leftovers.h"

#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
class FileLeftoversTest : public LeakCheckedTest {
protected:
    // A process id that is nobody's, nor will be: the first that is too large.
    static std::string GonePid() {
        const std::string pid = ReadWhole("/proc/sys/kernel/pid_max");
        return pid.substr(0, pid.find('\n'));
    }
    void Make(const std::string &name, time_t age) {
        WriteWhole(folder.Path(name), "{}");
        const timespec then = {time(nullptr) - age, 0};
        const timespec times[] = {then, then};
        utimensat(AT_FDCWD, folder.Path(name).c_str(), times, 0);
    }
    bool IsThere(const std::string &name) const {
        struct stat status = {};
        return lstat(folder.Path(name).c_str(), &status) == 0;
    }

    TempDir folder;
    const std::string config = folder.Path("config.json");
};
} // namespace

TEST_F(FileLeftoversTest, OldFilesOfGoneProcessesGo) {
    const std::string name = ".veskcachepinfile." + GonePid() + ".12.tmp";
    Make(name, 3600);
    Make("config.json", 3600);
    FileRemoveLeftovers(config.c_str());
    EXPECT_FALSE(IsThere(name));
    EXPECT_TRUE(IsThere("config.json"));
}

TEST_F(FileLeftoversTest, BesideTheTargetOfALinkTheyGo) {
    const std::string name = ".veskcachepinfile." + GonePid() + ".12.tmp";
    Make(name, 3600);
    Make("config.json", 3600);
    const TempDir elsewhere;
    const std::string link = elsewhere.Path("link");
    ASSERT_EQ(symlink(config.c_str(), link.c_str()), 0);
    FileRemoveLeftovers(link.c_str());
    EXPECT_FALSE(IsThere(name));
    EXPECT_TRUE(IsThere("config.json"));
}

TEST_F(FileLeftoversTest, FilesOfLiveProcessesAndFreshOnesStay) {
    const std::string live = ".veskcachepinfile." + std::to_string(getpid()) + ".0.tmp";
    const std::string fresh = ".veskcachepinfile." + GonePid() + ".0.tmp";
    Make(live, 3600);
    Make(fresh, 5);
    FileRemoveLeftovers(config.c_str());
    EXPECT_TRUE(IsThere(live));
    EXPECT_TRUE(IsThere(fresh));
}

TEST_F(FileLeftoversTest, OtherNamesLinksAndFoldersStay) {
    const std::string pid = GonePid();
    const std::string names[] = {
        "veskcachepinfile." + pid + ".1.tmp",
        ".veskcachepinfile." + pid + ".1.tmp.save",
        ".veskcachepinfile." + pid + "..tmp",
        ".veskcachepinfile." + pid + "x.1.tmp",
        ".veskcachepinfile.-" + pid + ".1.tmp",
        ".veskcachepinfile..1.tmp",
        ".veskcachepinfile." + pid,
        ".veskcachepinfile.0.1.tmp",
    };
    for (const std::string &name : names) {
        Make(name, 3600);
    }
    const std::string link = ".veskcachepinfile." + pid + ".2.tmp";
    const std::string inner = ".veskcachepinfile." + pid + ".3.tmp";
    ASSERT_EQ(symlink("/dev/null", folder.Path(link).c_str()), 0);
    ASSERT_EQ(mkdir(folder.Path(inner).c_str(), 0700), 0);
    FileRemoveLeftovers(config.c_str());
    for (const std::string &name : names) {
        EXPECT_TRUE(IsThere(name)) << name;
    }
    EXPECT_TRUE(IsThere(link));
    EXPECT_TRUE(IsThere(inner));
}

TEST_F(FileLeftoversTest, AFolderThatIsNotThereIsNoMatter) {
    FileRemoveLeftovers("/no/such/config.json");
    FileRemoveLeftovers("");
}
} // namespace vesk
