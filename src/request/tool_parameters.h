// What the command line asks for: filled by GetOptions, owned by main for the whole run.
//
// All texts point into the argument vector and are neither copied nor freed. Thread rule: written
// before any thread starts, only read afterwards.
#pragma once

#include <cstdint>

namespace vesk {
enum ToolCommand : int {
    kCommandInvalid = 0,
    kCommandPinFiles = 1,
    kCommandUnpinFiles = 2,
    kCommandSendBitmap = 3,
    kCommandStartService = 4,
    kCommandHandleMount = 5,
    kCommandHandleUmount = 6,
    kCommandSupportPin = 7,
    kCommandCheckBitmap = 8,
    kCommandAddPendingSpace = 9,
    kCommandRemovePendingSpace = 10,
    kCommandGetUUID = 11,
    kCommandDeleteBitmap = 12,
    kCommandCheckPin = 13,
    kCommandReloadPinBlocks = 14,
    kCommandUnpinAllBlocks = 15,
    kCommandIsAllUnpin = 16,
    kCommandSetBitmap = 17,
    kCommandUnsetBitmap = 18,
    kCommandUnpinRange = 19,
    kCommandGetBitmapSizeByte = 20,
};

const uint64_t kSectorNotSet = UINT64_MAX;

struct ToolParameters {
    uint64_t startSector = kSectorNotSet;   // 512-byte sectors; all ones: not given
    uint64_t numSectors = kSectorNotSet;    // 512-byte sectors; all ones: not given
    const char *checkPinFilePath = nullptr; // the file of --check-pin
    const char *files = nullptr;            // absolute paths joined by ";"
    const char *cachePath = nullptr;        // cache device
    const char *configPath = nullptr;       // the service's configuration file
    const char *spaceUuid = nullptr;
    const char *mountPath = nullptr; // without a trailing "/"
    int debug = 0;
    int verbose = 0;
    ToolCommand command = kCommandInvalid; // the last one on the command line
};
} // namespace vesk
