#include "model/volume_look.h"

#include "bitmap/bitmap_file.h"
#include "bitmap/pin_bitmap.h"
#include "bitmap/space_bitmap.h"
#include "driver/bitmap_control.h"
#include "driver/device.h"
#include "files/path.h"
#include "model/cache_state.h"
#include "space/space_cache.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

namespace vesk {
namespace {
std::optional<std::string> TextOf(const MallocText &text) {
    return text ? std::optional<std::string>(text.get()) : std::nullopt;
}

// An answer of the driver: 0, and then the word says yes or no.
std::optional<bool> DriverAnswer(int (*ask)(const char *, int *), Volume *volume,
                                 LookErrors *errors) {
    int answer = 0;
    if (ask(volume->cacheDevice->c_str(), &answer) == 0) {
        return answer != 0;
    }
    LookUnknownAdd(errors, *volume->cacheDevice, LookLogTake("the driver does not answer"));
    return std::nullopt;
}

// Who may not open the device learns nothing from questions that begin with opening it.
bool MayAsk(const std::string &device, LookErrors *errors) {
    if (access(device.c_str(), R_OK | W_OK) == 0 || (errno != EACCES && errno != EPERM)) {
        return true;
    }
    LookUnknownAdd(errors, device, strerror(EACCES));
    return false;
}

std::optional<uint64_t> SsdBlocks(const std::string &ssd) {
    struct stat status {};
    uint64_t bytes = 0;
    if (stat(ssd.c_str(), &status) != 0) {
        return std::nullopt;
    }
    if (S_ISREG(status.st_mode)) {
        bytes = static_cast<uint64_t>(status.st_size);
    } else if (DeviceGetSizeByte(ssd.c_str(), &bytes) < 0) {
        LookLogTake("");
        return std::nullopt;
    }
    return bytes >> kBitmapByteShift;
}

// A "no" is one only where nothing else could be meant by it: not a cache that is down, and not a
// question that failed within the library.
std::optional<bool> AskPinSupport(const Volume &volume, LookErrors *errors) {
    SpaceCause cause = SpaceCause::Found;
    if (SpaceHasCacheAndSupportPinByUUID(volume.uuid->c_str(), &cause) == 1) {
        return true;
    }
    int answer = 0;
    if (cause == SpaceCause::NoPinSupport &&
        isAllBlocksUnpin(volume.cacheDevice->c_str(), &answer) < 0) {
        LookLogTake("");
        return false;
    }
    LookUnknownAdd(errors, *volume.cacheDevice, LookLogTake("the cache does not tell its state"));
    return std::nullopt;
}

void LookAtDriver(Volume *volume, LookErrors *errors) {
    volume->supportsPin = AskPinSupport(*volume, errors);
    uint64_t bytes = 0;
    if (DeviceGetSizeByte(volume->cacheDevice->c_str(), &bytes) == 0) {
        volume->deviceBytes = bytes;
        volume->bitmapBytesNeeded = bytes >> kBitmapSizeShift;
    } else {
        LookUnknownAdd(errors, *volume->cacheDevice, LookLogTake("no size"));
    }
    if (volume->supportsPin.value_or(false)) {
        volume->driverHasBitmap = DriverAnswer(BitmapIsSet, volume, errors);
        volume->allUnpinned = DriverAnswer(isAllBlocksUnpin, volume, errors);
    }
}

void LookAtCache(Volume *volume, LookErrors *errors) {
    SpaceCause cause = SpaceCause::Found;
    volume->ssd = TextOf(MallocText(SpaceGetCacheSsdPath(volume->uuid->c_str(), &cause)));
    volume->hasCache = cause != SpaceCause::NoCache;
    if (cause == SpaceCause::NoCacheConfig) {
        LookUnknownAdd(errors, volume->mountPath, LookLogTake("the list of caches cannot be read"));
    }
    if (!volume->ssd) {
        if (cause == SpaceCause::Found || cause == SpaceCause::NoSsdPath) {
            LookUnknownAdd(errors, volume->mountPath,
                           "the list of caches names no SSD of its cache");
        }
        return;
    }
    volume->cacheDevice = TextOf(MallocText(SpaceGetCachePath(volume->uuid->c_str())));
    if (!volume->cacheDevice) {
        LookUnknownAdd(errors, volume->mountPath, LookLogTake("the cache device is not there"));
        return;
    }
    if (MayAsk(*volume->cacheDevice, errors)) {
        LookAtDriver(volume, errors);
    }
    CacheState state = CacheStateRead(*volume->cacheDevice, errors);
    volume->ssdBlocks = state.ssdBlocks ? state.ssdBlocks : SsdBlocks(*volume->ssd);
    volume->blocksHeld = state.blocksHeld;
    volume->resident = std::move(state.residentSet);
}

// The bitmap file's bytes in a bitmap of the needed size. Without a file nothing is marked.
void LookAtBitmap(Volume *volume, LookErrors *errors) {
    const MallocText path(BitmapGetPathByReferencePath(volume->mountPath.c_str()));
    if (!path) {
        throw std::bad_alloc();
    }
    uint64_t fileBytes = 0;
    const bool isMissing = PathIsMissing(path.get(), LastLink::Itself) == 1;
    if (!isMissing && FileGetSizeByte(path.get(), &fileBytes, LastLink::Itself) == 0) {
        volume->bitmapBytes = fileBytes;
    } else if (!isMissing) {
        LookErrorAdd(errors, path.get(), LookLogTake("has no size"));
    }
    if (!volume->bitmapBytesNeeded) {
        return;
    }
    BlockSet bits(static_cast<size_t>(*volume->bitmapBytesNeeded));
    PinBitmap bitmap{bits.data(), static_cast<uint32_t>(bits.size())};
    if (!isMissing && !bits.empty() && BitmapInitByFile(path.get(), &bitmap) < 0) {
        LookUnknownAdd(errors, path.get(), LookLogTake("cannot be read"));
        return;
    }
    if (fileBytes > bits.size()) {
        LookErrorAdd(errors, path.get(),
                     "longer than the cache device's bitmap: nothing can be pinned or unpinned");
    }
    volume->marked = std::move(bits);
}

std::optional<bool> IsHeld(const std::string &uuid, LookErrors *errors) {
    const std::string note = VolumeHoldNote(uuid);
    struct stat status {};
    if (lstat(note.c_str(), &status) == 0) {
        return true;
    }
    if (errno == ENOENT || errno == ENOTDIR) {
        return false;
    }
    LookUnknownAdd(errors, note, strerror(errno));
    return std::nullopt;
}
} // namespace

Volume VolumeLook(const SpaceEntry &space, LookErrors *errors) {
    Volume volume;
    volume.mountPath = space.referencePath;
    volume.isMounted = true;
    LookLogTake("");
    if (space.uuid.empty()) {
        // A device's superblock is for root's eyes.
        volume.hasCache = access(space.devicePath.c_str(), R_OK) != 0 && errno == EACCES;
        const std::string text = "its UUID cannot be read from " + space.devicePath;
        volume.hasCache ? LookUnknownAdd(errors, volume.mountPath, text)
                        : LookErrorAdd(errors, volume.mountPath, text);
        return volume;
    }
    volume.uuid = space.uuid;
    LookAtCache(&volume, errors);
    if (volume.hasCache) {
        LookAtBitmap(&volume, errors);
        volume.held = IsHeld(space.uuid, errors);
    }
    LookLogTake("");
    return volume;
}

std::string VolumePath(const std::string &mountPath, const std::string &relativePath) {
    const bool needsSlash = mountPath.empty() || mountPath.back() != '/';
    return relativePath.empty() ? mountPath : mountPath + (needsSlash ? "/" : "") + relativePath;
}

std::string VolumeHoldNote(const std::string &uuid) {
    return "/run/veskpin/" + uuid + ".hold";
}
} // namespace vesk
