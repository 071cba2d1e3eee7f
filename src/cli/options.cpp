#include "cli/options.h"

#include "base/log.h"
#include "cli/file_list.h"
#include "cli/usage.h"
#include "files/path.h"
#include "space/space_cache.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <getopt.h>

namespace {

// Options that exist only in their long form have small values, which no character can have.
enum : int {
    optionStartSector = 0,
    optionNumSectors = 1,
    optionUnsetBitmap = 2,
    optionUnpinRange = 3,
    optionGetBitmapSizeByte = 4,
    optionCachePath = 5,
};

const option longOptions[] = {
    {"pin-files", required_argument, nullptr, 'a'},
    {"unpin-files", required_argument, nullptr, 'b'},
    {"start-service", no_argument, nullptr, 'c'},
    {"config-path", required_argument, nullptr, 'f'},
    {"space-uuid", required_argument, nullptr, 'g'},
    {"send-bitmap", no_argument, nullptr, 'i'},
    {"mount-path", required_argument, nullptr, 'j'},
    {"support-pin", no_argument, nullptr, 'k'},
    {"stdout", no_argument, nullptr, 'l'},
    {"check-bitmap", no_argument, nullptr, 'm'},
    {"add-pending", no_argument, nullptr, 'n'},
    {"remove-pending", no_argument, nullptr, 'o'},
    {"handle-mount", no_argument, nullptr, 'p'},
    {"handle-umount", no_argument, nullptr, 'q'},
    {"get-uuid", no_argument, nullptr, 'r'},
    {"delete-bitmap", no_argument, nullptr, 's'},
    {"check-pin", required_argument, nullptr, 't'},
    {"reload-blocks", no_argument, nullptr, 'u'},
    {"unpin-all", no_argument, nullptr, 'v'},
    {"is-all-unpin", required_argument, nullptr, 'w'},
    {"set-bitmap", no_argument, nullptr, 'x'},
    {"start-sector", required_argument, nullptr, optionStartSector},
    {"num-sectors", required_argument, nullptr, optionNumSectors},
    {"unset-bitmap", no_argument, nullptr, optionUnsetBitmap},
    {"unpin-range", no_argument, nullptr, optionUnpinRange},
    {"get-bitmap-size-byte", no_argument, nullptr, optionGetBitmapSizeByte},
    {"cache-path", required_argument, nullptr, optionCachePath},
    {"help", no_argument, nullptr, 'h'},
    {"verbose", no_argument, nullptr, 'y'},
    {"debug", no_argument, nullptr, 'z'},
    {nullptr, 0, nullptr, 0},
};

// 'r' and 'x' are missing and 'd' and 'e' have no option: scripts rely on what each of them does
// now.
const char shortOptions[] = "a:b:cdef:g:hij:klmnopqst:uvw:yz";

// No entry for "is all unpin": the names behind it answer for one value less, and the first
// option's name for the last.
const char *const commandNames[] = {
    "invalid",      "pinFiles",        "unpinFiles",         "sendBitmap",
    "startService", "handleMount",     "handleUmount",       "supportPin",
    "checkBitmap",  "addPendingSpace", "removePendingSpace", "getUUID",
    "deleteBitmap", "checkPin",        "reloadPinBlocks",    "unpinAllBlocks",
    "setBitmap",    "unsetBitmap",     "unpinRange",         "get-bitmap-size-byte",
    "pin-files",
};

uint64_t ParseSector(const char *text) {
    return static_cast<uint64_t>(strtoll(text, nullptr, 10)); // NOLINT(cert-err34-c)
}

// A command that works on a sector range of a volume.
void RequireRange(RequiredParameters *required) {
    required->mountPath = 1;
    required->startSector = 1;
    required->numSectors = 1;
}

} // namespace

const char *ToolCommandToString(int command) {
    return commandNames[command];
}

void StripTrailingSlash(char *text) {
    if (text == nullptr) {
        return;
    }
    const size_t length = strlen(text);
    if (length > 1 && text[length - 1] == '/') {
        text[length - 1] = '\0';
    }
}

int CheckParameter(const RequiredParameters *required, const ToolParameters *parameters) {
    if (required->cachePath != 0) {
        if (parameters->cachePath == nullptr) {
            LogError("Error: Cache path is not set");
            return -1;
        }
        if (!PathExists(parameters->cachePath)) {
            LogError("Error: Cache path (%s) doesn't exist", parameters->cachePath);
            return -1;
        }
    }
    if (required->spaceUuid != 0 && parameters->spaceUuid == nullptr) {
        LogError("Space UUID must be set");
        return -1;
    }
    if (required->configPath != 0 && parameters->configPath == nullptr) {
        LogError("Config path must be set");
        return -1;
    }
    if (required->mountPath != 0 && parameters->mountPath == nullptr) {
        LogError("Mount path must be set");
        return -1;
    }
    if (required->files != 0 && CheckFilesExist(parameters->files) != 0) {
        LogError("Check file paths error");
        return -1;
    }
    if (required->startSector != 0 && parameters->startSector == sectorNotSet) {
        LogError("Start sector is not set");
        return -1;
    }
    if (required->numSectors != 0 && parameters->numSectors == sectorNotSet) {
        LogError("Num of sectors is not set");
        return -1;
    }
    return 0;
}

int GetOptions(int argc, char *argv[], ToolParameters *parameters) {
    RequiredParameters required;
    optind = 0; // begin anew, whoever has parsed before
    int value = 0;
    while ((value = getopt_long(argc, argv, shortOptions, longOptions, nullptr)) != -1) {
        switch (value) {
        case 'a':
            parameters->command = commandPinFiles;
            parameters->files = optarg;
            required.files = 1;
            required.mountPath = 1;
            break;
        case 'b':
            parameters->command = commandUnpinFiles;
            parameters->files = optarg;
            required.files = 1;
            required.mountPath = 1;
            break;
        case 'c':
            parameters->command = commandStartService;
            required.configPath = 1;
            break;
        case 'f': parameters->configPath = optarg; break;
        case 'g':
            if (!SpaceHasCache(optarg)) {
                LogError("Space UUID %s doesn't has cache", optarg);
                return -1;
            }
            parameters->spaceUuid = optarg;
            break;
        case 'h': Usage(); exit(0);
        case 'i':
            parameters->command = commandSendBitmap;
            required.mountPath = 1;
            break;
        case 'j':
            StripTrailingSlash(optarg);
            parameters->mountPath = optarg;
            break;
        case 'k':
            parameters->command = commandSupportPin;
            required.mountPath = 1;
            break;
        case 'l': LogToSyslog = 0; break;
        case 'm':
            parameters->command = commandCheckBitmap;
            required.mountPath = 1;
            break;
        case 'n':
            parameters->command = commandAddPendingSpace;
            required.mountPath = 1;
            break;
        case 'o':
            parameters->command = commandRemovePendingSpace;
            required.mountPath = 1;
            break;
        case 'p':
            parameters->command = commandHandleMount;
            required.mountPath = 1;
            required.configPath = 1;
            break;
        case 'q':
            parameters->command = commandHandleUmount;
            required.mountPath = 1;
            break;
        case 'r':
            parameters->command = commandGetUUID;
            required.mountPath = 1;
            break;
        case 's':
            parameters->command = commandDeleteBitmap;
            required.mountPath = 1;
            break;
        case 't':
            parameters->command = commandCheckPin;
            if (!PathExists(optarg)) {
                LogError("File (%s) doesn't exist", optarg);
                return -1;
            }
            parameters->checkPinFilePath = optarg;
            required.configPath = 1;
            break;
        case 'u':
            parameters->command = commandReloadPinBlocks;
            required.mountPath = 1;
            break;
        case 'v': parameters->command = commandUnpinAllBlocks; break;
        case 'w':
            parameters->command = commandIsAllUnpin;
            parameters->cachePath = optarg;
            required.cachePath = 1;
            break;
        case 'x':
            parameters->command = commandSetBitmap;
            RequireRange(&required);
            break;
        case optionStartSector: parameters->startSector = ParseSector(optarg); break;
        case optionNumSectors: parameters->numSectors = ParseSector(optarg); break;
        case optionUnsetBitmap:
            parameters->command = commandUnsetBitmap;
            RequireRange(&required);
            break;
        case optionUnpinRange:
            parameters->command = commandUnpinRange;
            RequireRange(&required);
            break;
        case optionGetBitmapSizeByte:
            parameters->command = commandGetBitmapSizeByte;
            required.mountPath = 1;
            break;
        case optionCachePath: parameters->cachePath = optarg; break;
        case 'y':
            LogNotice("Verbose mode is enable");
            parameters->verbose = 1;
            break;
        case 'z':
            LogNotice("Debug mode is enable");
            parameters->debug = 1;
            break;
        case '?': break; // getopt_long has complained on standard error
        default:
            LogError("Get unhandled option = %c", value);
            fflush(stdout);
            abort();
        }
    }

    LogVerbose("operation = %s", ToolCommandToString(parameters->command));
    if (CheckParameter(&required, parameters) != 0) {
        LogError("Check parameter failed");
        return -1;
    }
    if (parameters->command == commandUnpinAllBlocks) {
        if (parameters->mountPath == nullptr && parameters->cachePath == nullptr) {
            LogError("You must use --mount-path or --cache-path option!");
            return -1;
        }
        if (parameters->mountPath != nullptr && parameters->cachePath != nullptr) {
            LogError("Only one of --mount-path or --cache-path can be set!");
            return -1;
        }
    }
    return 0;
}
