#include "warming/fake_cache_device.h"

#include "support/fake_libc.h"
#include "support/temp_dir.h"

#include "bitmap/pin_bitmap.h"
#include "driver/pin_interface.h"

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <fcntl.h>
#include <linux/fs.h>
#include <unistd.h>

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

// In the current folder, which a test run has in the build folder: a file system in memory, as
// /tmp may be, need not take direct reads.
FakeCacheDevice::FakeCacheDevice(uint64_t bytes) : bytes_(bytes) {
    char name[] = "./vesk-test-device-XXXXXX";
    const int fd = mkstemp(name);
    char whole[PATH_MAX];
    if (fd < 0 || ftruncate(fd, static_cast<off_t>(bytes)) < 0 ||
        realpath(name, whole) == nullptr) {
        abort();
    }
    close(fd);
    path_ = whole;
    FakeLibc::onIoctl = [this](unsigned long request, void *argument) {
        return Answer(request, argument);
    };
    FakeLibc::onRead = [this](int fd_, long long offset, size_t size) {
        NoteRead(fd_, offset, size);
    };
}

FakeCacheDevice::~FakeCacheDevice() {
    FakeLibc::onIoctl = nullptr;
    FakeLibc::onRead = nullptr;
    unlink(path_.c_str());
}

bool FakeCacheDevice::TakesDirectReads() const {
    const int fd = open(path_.c_str(), O_RDONLY | O_DIRECT);
    if (fd < 0) {
        return false;
    }
    close(fd);
    return true;
}

int FakeCacheDevice::Answer(unsigned long request, void *argument) {
    if (request == BLKGETSIZE64) {
        *static_cast<uint64_t *>(argument) = bytes_;
        return 0;
    }
    switch (request) {
    case pinIoctlSetBitmap: {
        const auto *bitmap = static_cast<const PinBitmap *>(argument);
        const std::string content(reinterpret_cast<const char *>(bitmap->data), bitmap->size);
        events.push_back("bitmap " + Hex(content));
        if (!bitmapFile.empty()) {
            events.back() += " file " + Hex(ReadWhole(bitmapFile));
        }
        break;
    }
    case pinIoctlQueryBitmapSet:
        events.emplace_back("query");
        if (onQuery) {
            onQuery();
        }
        *static_cast<int *>(argument) = bitmapSet;
        break;
    case pinIoctlUnpinRanges:
        events.push_back(RangesText(*static_cast<const UnpinList *>(argument)));
        break;
    case pinIoctlUnpinAll: events.emplace_back("unpin all"); break;
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
