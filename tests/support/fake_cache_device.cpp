#include "tests/support/fake_cache_device.h"

#include "tests/support/fake_libc.h"
#include "tests/support/temp_dir.h"

#include "base/scoped_fd.h"
#include "bitmap/pin_bitmap.h"
#include "driver/pin_interface.h"

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <linux/fs.h>
#include <memory>
#include <unistd.h>

namespace vesk {
namespace {
std::string Number(uint64_t value) {
    return std::to_string(value);
}

std::string RangesText(const UnpinList &list) {
    std::string text = "ranges";
    for (const UnpinInfo &range : list.ranges) {
        if (range.startSector == 0 && range.numSectors == 0) {
            break;
        }
        text += " " + Number(range.startSector) + "+" + Number(range.numSectors);
    }
    return text;
}

// An empty file of a new name in the folder; its path, or nothing.
std::string MakeFile(const std::string &folder) {
    std::string path = folder + "/vesk-test-device-XXXXXX";
    const ScopedFd fd(mkstemp(&path[0]));
    return fd.IsOpen() ? path : "";
}

bool FolderTakesDirectReads(const std::string &folder) {
    const size_t bytes = 4096;
    const std::string path = MakeFile(folder);
    const ScopedFd fd(open(path.c_str(), O_RDWR | O_DIRECT | O_CLOEXEC));
    const std::unique_ptr<void, void (*)(void *)> buffer(aligned_alloc(bytes, bytes), free);
    const bool taken = fd.IsOpen() && ftruncate(fd.Get(), static_cast<off_t>(bytes)) == 0 &&
                       pread(fd.Get(), buffer.get(), bytes, 0) == static_cast<ssize_t>(bytes);
    unlink(path.c_str());
    return taken;
}

// The first that takes direct reads: the current folder, which a test run has in the build folder,
// and those for temporary files. A file system in memory need not take them, and a private /tmp
// hides a build folder below it. Empty: none does.
std::string FindDirectReadsFolder() {
    std::error_code ignored;
    const char *temporary = getenv("TMPDIR");
    for (const std::string &folder :
         {std::filesystem::current_path(ignored).string(),
          std::string(temporary == nullptr ? "" : temporary), std::string("/var/tmp"),
          std::string("/tmp"), std::string("/var/lib"), std::string("/dev/shm")}) {
        if (!folder.empty() && FolderTakesDirectReads(folder)) {
            return folder;
        }
    }
    return "";
}

const std::string &DirectReadsFolder() {
    static const std::string folder = FindDirectReadsFolder();
    return folder;
}
} // namespace

std::string Hex(const std::string &bytes) {
    static const char digits[] = "0123456789abcdef";
    std::string text;
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        text += digits[value >> 4];
        text += digits[value & 15];
    }
    return text;
}

FakeCacheDevice::FakeCacheDevice(uint64_t bytes)
    : path_(MakeFile(TakesDirectReads() ? DirectReadsFolder() : "/tmp")), bytes_(bytes) {
    char whole[PATH_MAX];
    if (truncate(path_.c_str(), static_cast<off_t>(bytes)) < 0 ||
        realpath(path_.c_str(), whole) == nullptr) {
        abort();
    }
    path_ = whole;
    FakeLibc::onIoctl = [this](unsigned long request, void *argument) {
        return Answer(request, argument);
    };
    FakeLibc::onRead = [this](int fd, long long offset, size_t size) {
        NoteRead(fd, offset, size);
    };
}

FakeCacheDevice::~FakeCacheDevice() {
    FakeLibc::onIoctl = nullptr;
    FakeLibc::onRead = nullptr;
    unlink(path_.c_str());
}

bool FakeCacheDevice::TakesDirectReads() {
    return !DirectReadsFolder().empty();
}

int FakeCacheDevice::Answer(unsigned long request, void *argument) {
    if (request == BLKGETSIZE64) {
        *static_cast<uint64_t *>(argument) = bytes_;
        return 0;
    }
    switch (request) {
    case kPinIoctlSetBitmap: {
        const auto *bitmap = static_cast<const PinBitmap *>(argument);
        const std::string content(reinterpret_cast<const char *>(bitmap->data), bitmap->size);
        events.push_back("bitmap " + Hex(content));
        if (!bitmapFile.empty()) {
            events.back() += " file " + Hex(ReadWhole(bitmapFile));
        }
        break;
    }
    case kPinIoctlQueryBitmapSet:
        events.emplace_back("query");
        if (onQuery) {
            onQuery();
        }
        *static_cast<int *>(argument) = bitmapSet;
        break;
    case kPinIoctlUnpinRanges:
        events.push_back(RangesText(*static_cast<const UnpinList *>(argument)));
        break;
    case kPinIoctlUnpinAll: events.emplace_back("unpin all"); break;
    default: events.push_back("request " + Number(request)); break;
    }
    if (request == failingRequest) {
        errno = EIO;
        return -1;
    }
    return 0;
}

void FakeCacheDevice::NoteRead(int fd, long long offset, size_t bytes) {
    char target[PATH_MAX] = {};
    const std::string link = "/proc/self/fd/" + std::to_string(fd);
    if (readlink(link.c_str(), target, sizeof(target) - 1) < 0 || path_ != target) {
        return;
    }
    events.push_back("read " + Number(static_cast<uint64_t>(offset)) + "+" + Number(bytes));
    if (onRead) {
        onRead();
    }
}
} // namespace vesk
