// A folder of processes as the kernel shows them, made of plain files, for tests of those who read
// it.
#pragma once

#include "tests/support/temp_dir.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <string>
#include <sys/syscall.h>
#include <unistd.h>
#include <vector>

namespace vesk {
struct FakeThread {
    pid_t id = 0;
    std::string name = "veskcachepinfil";
    char state = 'S';
    std::string wchan = "do_msgrcv";
    std::string syscall = "0 0x0"; // a read
    uint64_t startTicks = 100;
    uint64_t sleeps = 7; // of its own accord
};

using Arguments = std::vector<std::string>;

class FakeProc {
public:
    FakeProc() {
        Link("self/ns/ipc", "ipc:[1]");
        Link("self/ns/mnt", "mnt:[1]");
        Write("uptime", "1000.00 5.00\n");
    }

    const std::string &Path() const { return folder_.Path(); }
    std::string Path(const std::string &name) const { return folder_.Path(name); }

    void Write(const std::string &name, const std::string &content) const {
        std::filesystem::create_directories(std::filesystem::path(Path(name)).parent_path());
        WriteWhole(Path(name), content);
    }
    void Link(const std::string &name, const std::string &target) const {
        std::filesystem::create_directories(std::filesystem::path(Path(name)).parent_path());
        unlink(Path(name).c_str());
        EXPECT_EQ(symlink(target.c_str(), Path(name).c_str()), 0);
    }

    // What belongs to the process as a whole.
    void AddProcess(pid_t pid, uid_t user = 0) const {
        const std::string id = std::to_string(user);
        const std::string folder = std::to_string(pid) + "/";
        Write(folder + "comm", "veskcachepinfil\n");
        Write(folder + "status", "Name:\tveskcachepinfil\nUmask:\t0022\nUid:\t4711\t" + id +
                                     "\t4711\t4711\nGid:\t0\t0\t0\t0\n");
    }

    void AddThread(pid_t pid, const FakeThread &thread, const Arguments &arguments) const {
        const std::string folder = std::to_string(pid) + "/task/" + std::to_string(thread.id) + "/";
        std::string fields; // of stat, from the 4th to the 21st
        for (int i = 4; i <= 21; ++i) {
            fields += " " + std::to_string(i);
        }
        Write(folder + "stat", std::to_string(thread.id) + " (" + thread.name + ") " +
                                   thread.state + fields + " " + std::to_string(thread.startTicks) +
                                   " 23 24\n");
        std::string line;
        for (const std::string &argument : arguments) {
            line += argument + std::string(1, '\0');
        }
        Write(folder + "cmdline", line);
        Write(folder + "wchan", thread.wchan);
        Write(folder + "status", "Name:\t" + thread.name + "\nvoluntary_ctxt_switches:\t" +
                                     std::to_string(thread.sleeps) +
                                     "\nnonvoluntary_ctxt_switches:\t3\n");
        Write(folder + "syscall", thread.syscall + "\n");
        Link(folder + "cwd", "/srv");
        Link(folder + "ns/ipc", "ipc:[1]");
        Link(folder + "ns/mnt", "mnt:[1]");
    }

    // A service with its three threads, all at rest.
    void AddService(pid_t pid, const Arguments &arguments) const {
        AddProcess(pid);
        AddThread(pid, {pid}, arguments);
        AddThread(pid, {pid + 1, "worker", 'S', "futex_wait_queue"}, arguments);
        AddThread(pid, {pid + 2, "signals", 'S', "do_sigtimedwait"}, arguments);
    }

private:
    const TempDir folder_;
};
} // namespace vesk
