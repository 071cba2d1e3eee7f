// The one-shot commands; each has a source file of its name.
//
// Except where said otherwise they give 0, or -1 after an error message; volumes are named by their
// mount path.
//
// Thread rule: for one-shot processes; no lock is taken, also where the configuration is changed.
// Any number of requests may be sent to the pin service at once.
#pragma once

#include <cstdint>

namespace vesk {
struct ToolParameters;

// Queue a pin, unpin or reload request (RequestType) for the pin service, unless the volume's cache
// does not support pinning; nobody answers.
int HandleFilesByRequestType(const ToolParameters *parameters, int requestType);
int PinFilesRequest(const ToolParameters *parameters);
int UnpinFilesRequest(const ToolParameters *parameters);
int ReloadPinBlocksRequest(const ToolParameters *parameters);

// Would declare a volume pending or not, but the queue they open is not the one they send to: after
// three seconds they always fail. Senders that need it write to the queue themselves.
int SetSpaceStateRequest(const char *mountPath, int requestType);
int AddPendingSpaceRequest(const char *mountPath);
int RemovePendingSpaceRequest(const char *mountPath);

// What happens to a volume's pins when it is mounted: they are kept only while its cache supports
// pinning. A volume that comes up without such a cache loses its records and its bitmap file, so
// that stale pins never reach a cache made later. Records removed before a failure stay removed.
int HandleSpaceMount(const char *configPath, const char *mountPath);

// Changes nothing; always 0.
int HandleSpaceUmount(const char *mountPath);

enum class PinCheck : int {
    Pinned = 0,
    NotPinned = 1,
    Error = 2, // after an error message
};

// Whether the file's inode number is recorded for the volume of its top directory.
PinCheck CheckFileIsPin(const char *configPath, const char *filePath);

// The driver's bitmap-set state (non-zero: set); 0 also on any failure, after an error message.
int CheckBitmapSet(const char *mountPath);

// Hands the volume's bitmap file to the driver unless the driver holds a bitmap already or there is
// none. A bitmap whose size has changed is written back first.
int SendBitmap(const char *mountPath);

// Removes the bitmap file, if there is one. Records and driver keep what they have.
int DeleteBitmap(const char *mountPath);

// The bitmap size (bytes) that the volume's cache device needs.
int GetBitmapSizeByte(const char *mountPath, uint64_t *size);

// Development and repair: sets (op 1) or clears (op 0) a range (512-byte sectors) in the bitmap,
// past the service, writes the bitmap file and sends the bitmap to the driver. Nothing is read into
// the cache and no record changes; what came before a failure stays.
int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors, int op);
int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);
int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);

// Releases one range (512-byte sectors) of the volume's cache. Neither bitmap file nor
// configuration is changed.
int UnpinRange(const char *mountPath, uint64_t startSector, uint64_t numSectors);

// Releases every block of a cache, named by the volume's mount path or, without one, by the cache
// path. Neither bitmap file nor configuration is changed.
int UnpinAllBlocks(const ToolParameters *parameters);
int UnpinAllBlocksByMouhtPath(const char *mountPath);
int UnpinAllBlocksByCachePath(const char *cachePath);
} // namespace vesk
