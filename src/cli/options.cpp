#include "cli/options.h"

#include "base/log.h"
#include "cli/required_parameters.h"
#include "files/path.h"
#include "space/space_cache.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <getopt.h>
#include <iterator>

namespace vesk {
namespace {
// An option where it was met on the command line; messages about it name that place.
struct MetOption {
    char *argument;
    ToolParameters *parameters;
    LogPlace place;
};

// What an option does where it is met. False, after an error message, ends the parsing at once.
using OptionAction = bool (*)(const MetOption &met);

template <const char *ToolParameters::*field> bool Keep(const MetOption &met) {
    met.parameters->*field = met.argument;
    return true;
}

template <uint64_t ToolParameters::*field> bool KeepNumber(const MetOption &met) {
    const long long number = strtoll(met.argument, nullptr, 10); // NOLINT(cert-err34-c)
    met.parameters->*field = static_cast<uint64_t>(number);
    return true;
}

bool KeepMountPath(const MetOption &met) {
    StripTrailingSlash(met.argument);
    return Keep<&ToolParameters::mountPath>(met);
}

bool KeepSpaceUuid(const MetOption &met) {
    if (!SpaceHasCache(met.argument)) {
        LogErrorAt(met.place, "Space UUID %s doesn't has cache", met.argument);
        return false;
    }
    return Keep<&ToolParameters::spaceUuid>(met);
}

bool KeepCheckPinFile(const MetOption &met) {
    if (!PathExists(met.argument)) {
        LogErrorAt(met.place, "File (%s) doesn't exist", met.argument);
        return false;
    }
    return Keep<&ToolParameters::checkPinFilePath>(met);
}

bool LogToStandardOutput(const MetOption & /*met*/) {
    LogToSyslog = 0;
    return true;
}

bool EnableVerbose(const MetOption &met) {
    LogNoticeAt(met.place, "Verbose mode is enable");
    met.parameters->verbose = 1;
    return true;
}

bool EnableDebug(const MetOption &met) {
    LogNoticeAt(met.place, "Debug mode is enable");
    met.parameters->debug = 1;
    return true;
}

bool Help(const MetOption & /*met*/) {
    Usage();
    exit(0);
}

const OptionAction kKeepFiles = Keep<&ToolParameters::files>;
const OptionAction kKeepConfigPath = Keep<&ToolParameters::configPath>;
const OptionAction kKeepCachePath = Keep<&ToolParameters::cachePath>;
const OptionAction kKeepStartSector = KeepNumber<&ToolParameters::startSector>;
const OptionAction kKeepNumSectors = KeepNumber<&ToolParameters::numSectors>;

using Requirement = int RequiredParameters::*;
const Requirement kCache = &RequiredParameters::cachePath;
const Requirement kConfig = &RequiredParameters::configPath;
const Requirement kFiles = &RequiredParameters::files;
const Requirement kMount = &RequiredParameters::mountPath;
const Requirement kStart = &RequiredParameters::startSector;
const Requirement kCount = &RequiredParameters::numSectors;

struct OptionRow {
    const char *name;
    int argument;
    int value; // the short option; a value that no character has: there is none
    OptionAction act = nullptr;
    ToolCommand command = kCommandInvalid; // chooses none
    Requirement needs[3] = {};
};

const OptionRow kOptionRows[] = {
    {"pin-files", required_argument, 'a', kKeepFiles, kCommandPinFiles, {kFiles, kMount}},
    {"unpin-files", required_argument, 'b', kKeepFiles, kCommandUnpinFiles, {kFiles, kMount}},
    {"start-service", no_argument, 'c', nullptr, kCommandStartService, {kConfig}},
    {"config-path", required_argument, 'f', kKeepConfigPath},
    {"space-uuid", required_argument, 'g', KeepSpaceUuid},
    {"send-bitmap", no_argument, 'i', nullptr, kCommandSendBitmap, {kMount}},
    {"mount-path", required_argument, 'j', KeepMountPath},
    {"support-pin", no_argument, 'k', nullptr, kCommandSupportPin, {kMount}},
    {"stdout", no_argument, 'l', LogToStandardOutput},
    {"check-bitmap", no_argument, 'm', nullptr, kCommandCheckBitmap, {kMount}},
    {"add-pending", no_argument, 'n', nullptr, kCommandAddPendingSpace, {kMount}},
    {"remove-pending", no_argument, 'o', nullptr, kCommandRemovePendingSpace, {kMount}},
    {"handle-mount", no_argument, 'p', nullptr, kCommandHandleMount, {kMount, kConfig}},
    {"handle-umount", no_argument, 'q', nullptr, kCommandHandleUmount, {kMount}},
    {"get-uuid", no_argument, 'r', nullptr, kCommandGetUUID, {kMount}},
    {"delete-bitmap", no_argument, 's', nullptr, kCommandDeleteBitmap, {kMount}},
    {"check-pin", required_argument, 't', KeepCheckPinFile, kCommandCheckPin, {kConfig}},
    {"reload-blocks", no_argument, 'u', nullptr, kCommandReloadPinBlocks, {kMount}},
    {"unpin-all", no_argument, 'v', nullptr, kCommandUnpinAllBlocks},
    {"is-all-unpin", required_argument, 'w', kKeepCachePath, kCommandIsAllUnpin, {kCache}},
    {"set-bitmap", no_argument, 'x', nullptr, kCommandSetBitmap, {kMount, kStart, kCount}},
    {"start-sector", required_argument, 0, kKeepStartSector},
    {"num-sectors", required_argument, 1, kKeepNumSectors},
    {"unset-bitmap", no_argument, 2, nullptr, kCommandUnsetBitmap, {kMount, kStart, kCount}},
    {"unpin-range", no_argument, 3, nullptr, kCommandUnpinRange, {kMount, kStart, kCount}},
    {"get-bitmap-size-byte", no_argument, 4, nullptr, kCommandGetBitmapSizeByte, {kMount}},
    {"cache-path", required_argument, 5, kKeepCachePath},
    {"help", no_argument, 'h', Help},
    {"verbose", no_argument, 'y', EnableVerbose},
    {"debug", no_argument, 'z', EnableDebug},
};

// 'r' and 'x' are missing and 'd' and 'e' have no option: scripts rely on what each of them does
// now.
const char kShortOptions[] = "a:b:cdef:g:hij:klmnopqst:uvw:yz";

// No entry for "is all unpin": the names behind it answer for one value less, and the first
// option's name for the last.
const char *const kCommandNames[] = {
    "invalid",      "pinFiles",        "unpinFiles",         "sendBitmap",
    "startService", "handleMount",     "handleUmount",       "supportPin",
    "checkBitmap",  "addPendingSpace", "removePendingSpace", "getUUID",
    "deleteBitmap", "checkPin",        "reloadPinBlocks",    "unpinAllBlocks",
    "setBitmap",    "unsetBitmap",     "unpinRange",         "get-bitmap-size-byte",
    "pin-files",
};

bool ActOnOption(const OptionRow &row, RequiredParameters *required, const MetOption &met) {
    if (row.command != kCommandInvalid) {
        met.parameters->command = row.command;
    }
    for (const Requirement need : row.needs) {
        if (need != nullptr) {
            required->*need = 1;
        }
    }
    return row.act == nullptr || row.act(met);
}
} // namespace

const char *ToolCommandToString(int command) {
    return kCommandNames[command];
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

int GetOptions(int argc, char *argv[], ToolParameters *parameters) {
    option longOptions[std::size(kOptionRows) + 1] = {};
    std::transform(std::begin(kOptionRows), std::end(kOptionRows), longOptions,
                   [](const OptionRow &row) {
                       return option{row.name, row.argument, nullptr, row.value};
                   });
    RequiredParameters required;
    optind = 0; // begin anew, whoever has parsed before
    int value = 0;
    while ((value = getopt_long(argc, argv, kShortOptions, longOptions, nullptr)) != -1) {
        if (value == '?') {
            continue; // getopt_long has complained on standard error
        }
        const OptionRow *row =
            std::find_if(std::begin(kOptionRows), std::end(kOptionRows),
                         [value](const OptionRow &one) { return one.value == value; });
        if (row == std::end(kOptionRows)) {
            LogError("Get unhandled option = %c", value);
            fflush(stdout);
            abort();
        }
        if (!ActOnOption(*row, &required, {optarg, parameters, LogHere()})) {
            return -1;
        }
    }

    LogVerbose("operation = %s", ToolCommandToString(parameters->command));
    if (CheckParameter(&required, parameters) != 0) {
        LogError("Check parameter failed");
        return -1;
    }
    if (parameters->command == kCommandUnpinAllBlocks) {
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
} // namespace vesk
