// Real filesystems for tests: a private place to mount them, and loop-mounted images.
//
// Everything lies on a tmpfs on /mnt that only the test's own process sees; the kernel takes it
// away, loop devices included, when the process ends in whatever way.
//
// Thread rule: to be used by the test's main thread.
#pragma once

#include "base/scoped_fd.h"
#include "tests/support/temp_dir.h"

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
// Where private filesystems are mounted.
constexpr char kWorldPath[] = "/mnt";

// Puts the process into a mount namespace of its own with a tmpfs on /mnt; once is enough for a
// process, further calls change nothing. Returns why it is not possible here; empty: done.
std::string PrivateWorldEnter();

// Runs a command: its name and its arguments. Returns its exit status, 127 where there is no such
// command, -1 when it did not end by itself, and what it wrote to both outputs.
int CommandRun(const std::vector<std::string> &command, std::string &output);

// A filesystem in a sparse image that is mounted through a loop device at /mnt/<name>, unmounted by
// the destructor.
class TestVolume {
public:
    // `mkfs` is the formatting command, words and blanks, without the image's path; "%UUID%" in it
    // stands for a UUID of the volume's own. A machine without what this takes gives a reason to
    // skip, anything else that goes wrong is a test failure.
    TestVolume(const std::string &name, const std::string &mkfs, uint64_t imageBytes);
    TestVolume(const TestVolume &) = delete;
    TestVolume &operator=(const TestVolume &) = delete;
    ~TestVolume();

    void Unmount();

    std::string skipReason; // why there is no volume; empty: it is mounted
    const std::string uuid;
    const std::string mountPath;
    const std::string imagePath;
    std::string device; // path of the loop device; empty: not mounted

private:
    void Mount(const std::string &mkfs);
};

// Kinds of volumes: the formatting command and an image size that it takes. The UUIDs are no
// constants: xfs refuses a second mount of the same one on the whole machine, and tests run side by
// side.
constexpr uint64_t kMegabyte = uint64_t{1} << 20;
constexpr char kMakeExt4[] = "mke2fs -q -t ext4 -b 4096 -U %UUID% -F";
constexpr char kMakeXfs[] = "mkfs.xfs -q -m uuid=%UUID%";
constexpr char kMakeBtrfs[] = "mkfs.btrfs -q -U %UUID%";
constexpr uint64_t kExt4Bytes = 64 * kMegabyte;
constexpr uint64_t kXfsBytes = 320 * kMegabyte;
constexpr uint64_t kBtrfsBytes = 160 * kMegabyte;

// A file that a test writes. Every failure is a test failure.
class TestFile {
public:
    // Creates the file, empty.
    explicit TestFile(const std::string &path);

    // Writes bytes of a pattern that differs from place to place.
    void Write(uint64_t offset, uint64_t length);
    void Fallocate(int mode, uint64_t offset, uint64_t length);
    void Sync();
    uint64_t Inode() const;

    const std::string path;
    const ScopedFd fd;
};

// The pattern that TestFile::Write puts at this place of a file.
std::vector<char> TestPattern(uint64_t offset, uint64_t length);

// An empty folder in the private world where there can be one.
class TestFolder : public TempDir {
public:
    TestFolder();
};
} // namespace vesk
