#include "tests/faults/walk_disk.h"

#include "base/scoped_fd.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <iterator>
#include <linux/fiemap.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
namespace fs = std::filesystem;

const uint64_t kBlockBytes = 65536;
const size_t kFilesLeast = 24;
const size_t kFilesMost = 44;
const char *const kFolders[] = {"one", "one/below", "two", "long"};
// So long that a request has room for five of them.
const size_t kLongName = 180;
const unsigned kExtentsMost = 512;

std::string Absolute(const std::string &path) {
    return std::string(kWalkVolume) + "/" + path;
}

[[noreturn]] void Give(const char *what, const std::string &path) {
    printf("%s: ", path.c_str());
    perror(what);
    exit(1);
}

Blocks BlocksOf(const ScopedFd &file, const std::string &path) {
    alignas(fiemap) char buffer[sizeof(fiemap) + kExtentsMost * sizeof(fiemap_extent)] = {};
    auto *answer = reinterpret_cast<fiemap *>(buffer);
    answer->fm_length = FIEMAP_MAX_OFFSET;
    answer->fm_flags = FIEMAP_FLAG_SYNC;
    answer->fm_extent_count = kExtentsMost;
    if (ioctl(file.Get(), FS_IOC_FIEMAP, answer) != 0 ||
        answer->fm_mapped_extents == kExtentsMost) {
        Give("its extents cannot be had", path);
    }
    Blocks blocks;
    for (unsigned i = 0; i < answer->fm_mapped_extents; ++i) {
        const fiemap_extent &extent = answer->fm_extents[i];
        const uint64_t last = (extent.fe_physical + extent.fe_length - 1) / kBlockBytes;
        for (uint64_t block = extent.fe_physical / kBlockBytes; block <= last; ++block) {
            blocks.insert(block);
        }
    }
    return blocks;
}

void Append(const std::string &path, size_t bytes, int flags) {
    const ScopedFd file(open(Absolute(path).c_str(), O_WRONLY | O_CREAT | O_APPEND | flags, 0600));
    const std::vector<char> data(bytes, 'w');
    if (!file.IsOpen() || write(file.Get(), data.data(), bytes) != static_cast<ssize_t>(bytes)) {
        Give("it cannot be written", path);
    }
}

// Most share their blocks with others, few fill many.
size_t RandomBytes(std::mt19937 &random) {
    switch (Pick(random, 20)) {
    case 0: return 2000000 + Pick(random, 3000000);
    case 1:
    case 2: return 1 + Pick(random, 400000);
    default: return 1 + Pick(random, 16000);
    }
}

// A path where there is nothing.
std::string NewPath(std::mt19937 &random) {
    const std::string folder = kFolders[Pick(random, std::size(kFolders))];
    std::string path;
    do {
        path = folder + "/f" + std::to_string(Pick(random, 60));
        if (folder == "long") {
            path.append(kLongName - path.size(), 'n');
        }
    } while (fs::exists(Absolute(path)));
    return path;
}

std::string AnyPath(const Disk &disk, std::mt19937 &random) {
    std::string path;
    do {
        path = std::next(disk.begin(), static_cast<long>(Pick(random, disk.size())))->first;
    } while (path == kWalkBitmapFile);
    return path;
}

std::string Make(std::mt19937 &random) {
    const std::string path = NewPath(random);
    Append(path, RandomBytes(random), 0);
    return "make " + path;
}

std::string Rename(const std::string &path, const std::string &target) {
    fs::rename(Absolute(path), Absolute(target));
    return "rename " + path + " " + target;
}

// By a new file that takes its name.
std::string Replace(const std::string &path, std::mt19937 &random) {
    Append("new", RandomBytes(random), 0);
    fs::rename(Absolute("new"), Absolute(path));
    return "replace " + path;
}
} // namespace

Disk DiskLook() {
    Disk disk;
    for (const auto &entry : fs::recursive_directory_iterator(kWalkVolume)) {
        if (!entry.is_regular_file()) {
            continue;
        }
        const std::string path = entry.path().lexically_relative(kWalkVolume);
        const ScopedFd file(open(entry.path().c_str(), O_RDONLY | O_CLOEXEC));
        struct stat status = {};
        if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
            Give("it cannot be looked at", path);
        }
        disk[path] = {static_cast<uint32_t>(status.st_ino), BlocksOf(file, path)};
    }
    return disk;
}

void DiskMake(std::mt19937 &random) {
    for (const char *folder : kFolders) {
        fs::create_directory(Absolute(folder));
    }
    for (size_t i = 0; i < kFilesMost; ++i) {
        Make(random);
    }
}

std::string DiskChange(std::mt19937 &random) {
    const Disk disk = DiskLook();
    if (disk.size() < kFilesLeast) {
        return Make(random);
    }
    const std::string path = AnyPath(disk, random);
    switch (Pick(random, 12)) {
    case 0:
    case 1: return disk.size() < kFilesMost ? Make(random) : "";
    case 2:
    case 3:
    case 4: Append(path, RandomBytes(random), 0); return "grow " + path;
    case 5: Append(path, 0, O_TRUNC); return "empty " + path;
    case 6: return Replace(path, random);
    case 7: return Rename(path, AnyPath(disk, random));
    case 8: return Rename(path, NewPath(random));
    case 9: {
        // In its own folder, where requests that name it by its inode find it still.
        const std::string target =
            path.back() == 'r' ? path.substr(0, path.size() - 1) : path + "r";
        return fs::exists(Absolute(target)) ? "" : Rename(path, target);
    }
    default: fs::remove(Absolute(path)); return "remove " + path;
    }
}

std::string DiskFolder(std::mt19937 &random) {
    const size_t number = Pick(random, std::size(kFolders) + 1);
    return number == std::size(kFolders) ? "" : kFolders[number];
}

bool DiskHasFolder(const std::string &path) {
    return path.empty() ||
           std::find(std::begin(kFolders), std::end(kFolders), path) != std::end(kFolders);
}
} // namespace vesk
