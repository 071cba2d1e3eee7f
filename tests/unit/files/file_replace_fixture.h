// A folder with one file that holds `old`, to be replaced by `fresh`.
#pragma once

#include "files/file_replace.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/temp_dir.h"

#include <algorithm>
#include <cstdio>
#include <string>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

namespace vesk {
const uid_t kNobody = 65534;

class FileReplaceTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        savedMask_ = umask(022);
        WriteWhole(path, old);
    }
    void TearDown() override {
        umask(savedMask_);
        LeakCheckedTest::TearDown();
    }

    // The folder's names, sorted: a temporary file left behind would be among them.
    std::vector<std::string> Names() const {
        std::vector<std::string> names;
        for (const auto &entry : std::filesystem::directory_iterator(folder.Path())) {
            names.push_back(entry.path().filename());
        }
        std::sort(names.begin(), names.end());
        return names;
    }
    static struct stat Status(const std::string &file) {
        struct stat status {};
        EXPECT_EQ(lstat(file.c_str(), &status), 0) << file;
        return status;
    }

    // Takes the next `count` names that this process would give its temporary files, as whatever
    // had its number before may have left them.
    void TakeTemporaryNames(unsigned count) const {
        const int watch = inotify_init1(IN_NONBLOCK);
        inotify_add_watch(watch, folder.Path().c_str(), IN_CREATE);
        EXPECT_EQ(FileReplaceContent(path.c_str(), old), FileReplaceResult::Done);
        alignas(inotify_event) char buffer[1000] = {};
        EXPECT_GT(read(watch, buffer, sizeof(buffer)), 0);
        close(watch);
        int process = 0;
        unsigned last = 0;
        const char *name = reinterpret_cast<const inotify_event *>(buffer)->name;
        EXPECT_EQ(sscanf(name, ".veskcachepinfile.%d.%u.tmp", &process, &last), 2) << name;
        for (unsigned i = 1; i <= count; ++i) {
            WriteWhole(folder.Path(".veskcachepinfile." + std::to_string(process) + "." +
                                   std::to_string(last + i) + ".tmp"),
                       "left");
        }
    }

    // Replaces the file in a process of its own, as the user nobody.
    static FileReplaceResult ReplaceAsNobody(const std::string &file, const std::string &content) {
        fflush(stdout);
        const pid_t child = fork();
        if (child == 0) {
            if (setgid(kNobody) < 0 || setuid(kNobody) < 0) {
                _exit(99);
            }
            _exit(static_cast<int>(FileReplaceContent(file.c_str(), content)));
        }
        int status = -1; // of no process, where there is none
        waitpid(child, &status, 0);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) != 99);
        return static_cast<FileReplaceResult>(WEXITSTATUS(status));
    }

    TempDir folder;
    const std::string path = folder.Path("file");
    const std::string old = "the old content, which is longer than the fresh one";
    const std::string fresh = "the fresh content";
    const std::vector<std::string> onlyTheFile = {"file"};

private:
    mode_t savedMask_ = 0;
};
} // namespace vesk
