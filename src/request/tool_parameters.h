// What the command line asks for: filled by GetOptions, owned by main for the whole run.
//
// All texts point into the argument vector and are neither copied nor freed. Thread rule: written
// before any thread starts, only read afterwards.
#ifndef REQUEST_TOOL_PARAMETERS_H
#define REQUEST_TOOL_PARAMETERS_H

#include <cstdint>

enum ToolCommand : int {
    commandInvalid = 0,
    commandPinFiles = 1,
    commandUnpinFiles = 2,
    commandSendBitmap = 3,
    commandStartService = 4,
    commandHandleMount = 5,
    commandHandleUmount = 6,
    commandSupportPin = 7,
    commandCheckBitmap = 8,
    commandAddPendingSpace = 9,
    commandRemovePendingSpace = 10,
    commandGetUUID = 11,
    commandDeleteBitmap = 12,
    commandCheckPin = 13,
    commandReloadPinBlocks = 14,
    commandUnpinAllBlocks = 15,
    commandIsAllUnpin = 16,
    commandSetBitmap = 17,
    commandUnsetBitmap = 18,
    commandUnpinRange = 19,
    commandGetBitmapSizeByte = 20,
};

const uint64_t sectorNotSet = UINT64_MAX;

struct ToolParameters {
    uint64_t startSector = sectorNotSet;    // 512-byte sectors; all ones: not given
    uint64_t numSectors = sectorNotSet;     // 512-byte sectors; all ones: not given
    const char *checkPinFilePath = nullptr; // the file of --check-pin
    const char *files = nullptr;            // absolute paths joined by ";"
    const char *cachePath = nullptr;        // cache device
    const char *configPath = nullptr;       // the service's configuration file
    const char *spaceUuid = nullptr;
    const char *mountPath = nullptr; // without a trailing "/"
    int debug = 0;
    int verbose = 0;
    ToolCommand command = commandInvalid; // the last one on the command line
};

#endif
