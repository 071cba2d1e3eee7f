// The two images behind the emulated cache device and the I/O on them.
//
// The backing image holds the whole device; the SSD image holds one cache block per slot, slot n at
// byte n * kBlockBytes. Nothing here knows which block is in which slot, and nothing is locked:
// any number of threads may call these functions, and the caller sees to it that nobody reads what
// somebody else is writing.
//
// The slots are mapped into memory as well, so that the kernel can move a block from the backing
// image into its slot, and from there to the reader, without a copy in between. The program itself
// never touches mapped memory but has system calls do it: should the SSD image be cut short or its
// disk be full, that is an error result (-EFAULT) instead of a SIGBUS.
#pragma once

#include "base/scoped_fd.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <sys/uio.h>

namespace vesk {
// The mapped slots; unmapped with the record.
struct SlotMap {
    void *start = nullptr; // null: not mapped
    size_t bytes = 0;
    SlotMap() = default;
    ~SlotMap();
    SlotMap(const SlotMap &) = delete;
    SlotMap &operator=(const SlotMap &) = delete;
};

struct CacheImages {
    ScopedFd backing;
    ScopedFd ssd;
    SlotMap slotMap;
    uint64_t deviceBytes = 0; // size of the backing image, a multiple of 512
    uint32_t slots = 0;       // whole cache blocks in the SSD image
};

// Memory pieces whose bytes follow each other in an image.
constexpr int kMostPieces = 18;
struct ImagePieces {
    struct iovec parts[kMostPieces]; // lengths in bytes, may be 0
    int count = 0;                   // pieces, at most kMostPieces
};

// Opens both images for reading and writing. Regular files, which are locked against a second cache
// device, and block devices are taken. False: `error` is a message for the user.
bool CacheImagesOpen(const std::string &backingPath, const std::string &ssdPath,
                     CacheImages &images, std::string &error);

// Transfers, all bytes or an error: 0, or a negative errno (-EIO when the image ends too early).
int CacheImagesReadBacking(const CacheImages &images, uint64_t offset, const ImagePieces &pieces);
int CacheImagesWriteBacking(const CacheImages &images, uint64_t offset, const ImagePieces &pieces);
int CacheImagesReadSsd(const CacheImages &images, uint64_t offset, const ImagePieces &pieces);
int CacheImagesWriteSsd(const CacheImages &images, uint64_t offset, const ImagePieces &pieces);

// Appends a piece.
void ImagePiecesAdd(ImagePieces &pieces, void *start, size_t bytes);

// Where the byte at `within` (below kBlockBytes) of a slot is mapped. Only to be handed to system
// calls.
void *CacheImagesSlotAddress(const CacheImages &images, uint32_t slot, size_t within);

// Makes what was written to the backing image durable. 0 or a negative errno.
int CacheImagesSyncBacking(const CacheImages &images);

// Makes both images durable. 0 or a negative errno.
int CacheImagesSyncAll(const CacheImages &images);
} // namespace vesk
