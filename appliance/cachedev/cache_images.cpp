#include "cachedev/cache_images.h"

#include "cachedev/driver_requests.h"
#include "cachedev/image_access.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
using TransferCall = ssize_t (*)(int, const struct iovec *, int, off_t);

// preadv and pwritev may move less than was asked for; goes on until all is moved.
int TransferAll(TransferCall call, int fd, uint64_t offset, ImagePieces pieces) {
    struct iovec *part = pieces.parts;
    struct iovec *const end = pieces.parts + pieces.count;
    while (true) {
        while (part != end && part->iov_len == 0) {
            ++part;
        }
        if (part == end) {
            return 0;
        }
        const ssize_t moved =
            call(fd, part, static_cast<int>(end - part), static_cast<off_t>(offset));
        if (moved < 0 && errno == EINTR) {
            continue;
        }
        if (moved < 0) {
            return -errno;
        }
        if (moved == 0) {
            return -EIO;
        }
        offset += static_cast<uint64_t>(moved);
        for (auto left = static_cast<size_t>(moved); left > 0;) {
            const size_t step = std::min(left, part->iov_len);
            part->iov_base = static_cast<char *>(part->iov_base) + step;
            part->iov_len -= step;
            left -= step;
            if (part->iov_len == 0) {
                ++part;
            }
        }
    }
}

bool OpenImage(const std::string &path, const char *what, ScopedFd &image, struct stat &status,
               uint64_t &bytes, std::string &error) {
    const std::string name = std::string(what) + " image " + path;
    image = ScopedFd(open(path.c_str(), O_RDWR | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
    if (!image.IsOpen()) {
        error = "cannot open the " + name + ": " + strerror(errno);
        return false;
    }
    if (fstat(image.Get(), &status) != 0 ||
        (!S_ISREG(status.st_mode) && !S_ISBLK(status.st_mode))) {
        error = "the " + name + " is neither a regular file nor a block device";
        return false;
    }
    // Who may open a block device, and what locks it (udev now and then, while it probes), is the
    // machine's affair.
    if (S_ISREG(status.st_mode) && !ImageIsPrivate(status, path, name, error)) {
        return false;
    }
    // A second cache device on the same image would change it behind this one's back.
    const int locked = S_ISREG(status.st_mode) ? ImageLock(image.Get()) : 0;
    if (locked != 0) {
        error = locked == EAGAIN ? "the " + name + " is in use by another cache device"
                                 : "cannot lock the " + name + ": " + strerror(locked);
        return false;
    }
    const off_t end = lseek(image.Get(), 0, SEEK_END); // also right for a block device
    if (end < 0) {
        error = "cannot find the size of the " + name + ": " + strerror(errno);
        return false;
    }
    bytes = static_cast<uint64_t>(end);
    return true;
}

bool IsSameImage(const struct stat &one, const struct stat &other) {
    if (S_ISBLK(one.st_mode) && S_ISBLK(other.st_mode)) {
        return one.st_rdev == other.st_rdev;
    }
    return one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

bool MapSlots(CacheImages &images, std::string &error) {
    const uint64_t bytes = images.slots * kBlockBytes;
    void *start = MAP_FAILED;
    errno = EFBIG;
    if (bytes <= PTRDIFF_MAX) {
        start = mmap(nullptr, static_cast<size_t>(bytes), PROT_READ | PROT_WRITE, MAP_SHARED,
                     images.ssd.Get(), 0);
    }
    if (start == MAP_FAILED) {
        error = "cannot map the SSD image (" + std::to_string(bytes) +
                " bytes) into memory: " + strerror(errno);
        return false;
    }
    images.slotMap.start = start;
    images.slotMap.bytes = static_cast<size_t>(bytes);
    return true;
}
} // namespace

SlotMap::~SlotMap() {
    if (start != nullptr) {
        munmap(start, bytes);
    }
}

bool CacheImagesOpen(const std::string &backingPath, const std::string &ssdPath,
                     CacheImages &images, std::string &error) {
    struct stat backing = {};
    struct stat ssd = {};
    if (stat(backingPath.c_str(), &backing) == 0 && stat(ssdPath.c_str(), &ssd) == 0 &&
        IsSameImage(backing, ssd)) {
        error = "the backing image and the SSD image are the same file";
        return false;
    }
    uint64_t ssdBytes = 0;
    if (!OpenImage(backingPath, "backing", images.backing, backing, images.deviceBytes, error) ||
        !OpenImage(ssdPath, "SSD", images.ssd, ssd, ssdBytes, error)) {
        return false;
    }
    if (images.deviceBytes == 0 || images.deviceBytes % kSectorBytes != 0) {
        error = "the size of the backing image (" + std::to_string(images.deviceBytes) +
                " bytes) is not a multiple of 512 bytes above 0";
        return false;
    }
    if (ssdBytes < kBlockBytes) {
        error = "the SSD image (" + std::to_string(ssdBytes) +
                " bytes) is smaller than one cache block (65536 bytes)";
        return false;
    }
    images.slots =
        static_cast<uint32_t>(std::min<uint64_t>(ssdBytes / kBlockBytes, UINT32_MAX - 1));
    return MapSlots(images, error);
}

int CacheImagesReadBacking(const CacheImages &images, uint64_t offset, const ImagePieces &pieces) {
    return TransferAll(preadv, images.backing.Get(), offset, pieces);
}

int CacheImagesWriteBacking(const CacheImages &images, uint64_t offset, const ImagePieces &pieces) {
    return TransferAll(pwritev, images.backing.Get(), offset, pieces);
}

int CacheImagesReadSsd(const CacheImages &images, uint64_t offset, const ImagePieces &pieces) {
    return TransferAll(preadv, images.ssd.Get(), offset, pieces);
}

int CacheImagesWriteSsd(const CacheImages &images, uint64_t offset, const ImagePieces &pieces) {
    return TransferAll(pwritev, images.ssd.Get(), offset, pieces);
}

void ImagePiecesAdd(ImagePieces &pieces, void *start, size_t bytes) {
    pieces.parts[pieces.count++] = {start, bytes};
}

void *CacheImagesSlotAddress(const CacheImages &images, uint32_t slot, size_t within) {
    return static_cast<char *>(images.slotMap.start) +
           static_cast<size_t>(slot * kBlockBytes + within);
}

int CacheImagesSyncBacking(const CacheImages &images) {
    return fdatasync(images.backing.Get()) == 0 ? 0 : -errno;
}

int CacheImagesSyncAll(const CacheImages &images) {
    const int backing = CacheImagesSyncBacking(images);
    const int ssd = fdatasync(images.ssd.Get()) == 0 ? 0 : -errno;
    return backing != 0 ? backing : ssd;
}
} // namespace vesk
