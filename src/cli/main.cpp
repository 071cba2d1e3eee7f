// The program's entry: parses the command line, runs the one command it names, prints what scripts
// read and turns the outcome into the exit status.
#include "base/log.h"
#include "base/malloc_text.h"
#include "cli/options.h"
#include "commands/commands.h"
#include "driver/bitmap_control.h"
#include "request/tool_parameters.h"
#include "service/start_service.h"
#include "space/space.h"
#include "space/space_cache.h"

#include <cstdio>
#include <iterator>
#include <json/value.h>
#include <libgen.h>
#include <new>

using namespace vesk;

namespace {
const char kBuildStamp[] = "2018-06-08-15:24";

const int kSuccess = 0; // exit values
const int kFailure = -1;

// Readers of the log look for main, whichever of its handlers speaks.
#define AtMain() (LogPlace{"main", __LINE__})

// The exit value behind the message that tells of it.
#define Succeed(...) (LogNoticeAt(AtMain(), __VA_ARGS__), kSuccess)
#define Fail(...) (LogErrorAt(AtMain(), __VA_ARGS__), kFailure)

int PrintAnswer(bool yes) {
    puts(yes ? "Yes" : "No");
    return kSuccess;
}

int NoCommand(const ToolParameters & /*asked*/) {
    LogErrorAt(AtMain(), "Invalid input");
    Usage();
    return kSuccess;
}

int RunPinFiles(const ToolParameters &asked) {
    LogNoticeAt(AtMain(), "Send pin file request, files = %s", asked.files);
    return PinFilesRequest(&asked) < 0 ? Fail("Pin files failed")
                                       : Succeed("Send pin file request OK");
}

int RunUnpinFiles(const ToolParameters &asked) {
    LogNoticeAt(AtMain(), "Send unpin file request, files = %s", asked.files);
    return UnpinFilesRequest(&asked) < 0 ? Fail("Unpin files failed")
                                         : Succeed("Send unpin files request OK");
}

int RunSendBitmap(const ToolParameters &asked) {
    LogNoticeAt(AtMain(), "Start to send bitmap for volume (%s)", asked.mountPath);
    return SendBitmap(asked.mountPath) < 0
               ? Fail("Send bitmap to space (%s) failed", asked.mountPath)
               : Succeed("Send bitmap OK");
}

int RunStartService(const ToolParameters &asked) {
    LogNoticeAt(AtMain(), "Service starts (Build time: %s)", kBuildStamp);
    return StartService(&asked) < 0 ? Fail("Can't start service") : kSuccess;
}

int RunHandleMount(const ToolParameters &asked) {
    if (HandleSpaceMount(asked.configPath, asked.mountPath) < 0) {
        return Fail("Handle space (%s) mount failed", asked.mountPath);
    }
    LogVerboseAt(AtMain(), "Handle space (%s) mount OK", asked.mountPath);
    return kSuccess;
}

int RunHandleUmount(const ToolParameters &asked) {
    if (HandleSpaceUmount(asked.mountPath) < 0) {
        return Fail("Handle space (%s) umount failed", asked.mountPath);
    }
    LogVerboseAt(AtMain(), "Handle space (%s) umount OK", asked.mountPath);
    return kSuccess;
}

int RunSupportPin(const ToolParameters &asked) {
    return PrintAnswer(SpaceHasCacheAndSupportPin(asked.mountPath));
}

int RunCheckBitmap(const ToolParameters &asked) {
    return PrintAnswer(CheckBitmapSet(asked.mountPath) != 0);
}

int RunAddPending(const ToolParameters &asked) {
    return AddPendingSpaceRequest(asked.mountPath) < 0 ? Fail("Can't sent pending space")
                                                       : Succeed("Set pending space OK");
}

int RunRemovePending(const ToolParameters &asked) {
    return RemovePendingSpaceRequest(asked.mountPath) < 0 ? Fail("Can't sent pending space")
                                                          : Succeed("Set pending space OK");
}

int RunGetUuid(const ToolParameters &asked) {
    const MallocText uuid(SpaceGetUUID(asked.mountPath));
    if (uuid) {
        puts(uuid.get());
    }
    return kSuccess;
}

int RunDeleteBitmap(const ToolParameters &asked) {
    return DeleteBitmap(asked.mountPath) < 0
               ? Fail("Delete bitmap on volume (%s) failed", asked.mountPath)
               : Succeed("Delete bitmap on volume (%s) OK", asked.mountPath);
}

int RunCheckPin(const ToolParameters &asked) {
    switch (CheckFileIsPin(asked.configPath, asked.checkPinFilePath)) {
    case PinCheck::Pinned: return PrintAnswer(true);
    case PinCheck::NotPinned: return PrintAnswer(false);
    case PinCheck::Error: puts("Error"); break;
    }
    return kSuccess;
}

int RunReloadPinBlocks(const ToolParameters &asked) {
    LogNoticeAt(AtMain(), "Start to send reload block request");
    return ReloadPinBlocksRequest(&asked) < 0
               ? Fail("Reload blocks on volume (%s) failed", asked.mountPath)
               : Succeed("Send reload block request OK");
}

int RunUnpinAll(const ToolParameters &asked) {
    return UnpinAllBlocks(&asked) == 0 ? kSuccess : kFailure;
}

int RunIsAllUnpin(const ToolParameters &asked) {
    int allUnpinned = 0;
    if (isAllBlocksUnpin(asked.cachePath, &allUnpinned) < 0) {
        puts("Get unpin information failed. (This cache doesn't support pin ?)");
        return kFailure;
    }
    return PrintAnswer(allUnpinned != 0);
}

// `what` is the message's beginning, up to the mount path.
int ReportRange(int result, const char *what, const ToolParameters &asked) {
    LogWrite(result < 0 ? LogClass::Error : LogClass::Notice, AtMain(),
             "%s%s) %s (Start sector = %llu Num of sector = %llu)", what, asked.mountPath,
             result < 0 ? "failed" : "OK", LogU64(asked.startSector), LogU64(asked.numSectors));
    return result < 0 ? kFailure : kSuccess;
}

int RunSetBitmap(const ToolParameters &asked) {
    return ReportRange(SetBitmap(asked.mountPath, asked.startSector, asked.numSectors),
                       "Set bitmap on volume (", asked);
}

int RunUnsetBitmap(const ToolParameters &asked) {
    return ReportRange(UnsetBitmap(asked.mountPath, asked.startSector, asked.numSectors),
                       "Unset bitmap on volume (", asked);
}

int RunUnpinRange(const ToolParameters &asked) {
    return ReportRange(UnpinRange(asked.mountPath, asked.startSector, asked.numSectors),
                       "Unpin range in cache (volume = ", asked);
}

int RunGetBitmapSize(const ToolParameters &asked) {
    uint64_t size = 0;
    if (GetBitmapSizeByte(asked.mountPath, &size) < 0) {
        return Fail("Get bitmap size for volume (%s) failed", asked.mountPath);
    }
    printf("%llu\n", LogU64(size));
    return kSuccess;
}

// In value order of the commands; each gives the exit value.
int (*const kHandlers[])(const ToolParameters &asked) = {
    NoCommand,        RunPinFiles,     RunUnpinFiles,   RunSendBitmap,  RunStartService,
    RunHandleMount,   RunHandleUmount, RunSupportPin,   RunCheckBitmap, RunAddPending,
    RunRemovePending, RunGetUuid,      RunDeleteBitmap, RunCheckPin,    RunReloadPinBlocks,
    RunUnpinAll,      RunIsAllUnpin,   RunSetBitmap,    RunUnsetBitmap, RunUnpinRange,
    RunGetBitmapSize,
};
static_assert(std::size(kHandlers) == kCommandGetBitmapSizeByte + 1, "a handler for every command");

int OutOfMemory() {
    return Fail("Out of memory");
}

int RunCommand(const ToolParameters &asked) try {
    const auto command = static_cast<size_t>(asked.command);
    return command < std::size(kHandlers) ? kHandlers[command](asked) : kSuccess;
} catch (const std::bad_alloc &) {
    return OutOfMemory();
} catch (const Json::RuntimeError &) { // so the JSON library says that it gets no memory
    return OutOfMemory();
}

// Static: the service's worker reads it after the first thread may have ended.
ToolParameters parameters;
} // namespace

int main(int argc, char *argv[]) try {
    ProgramName = basename(argv[0]);
    LogVerbose("Process name = %s", ProgramName);
    if (GetOptions(argc, argv, &parameters) < 0) {
        Usage();
        return kFailure;
    }
    if (parameters.debug != 0) {
        LogLevel = 3;
    } else if (parameters.verbose != 0) {
        LogLevel = 2;
    }
    LogTraceEntry();
    const int exitValue = RunCommand(parameters);
    LogTraceExit();
    return exitValue;
} catch (const std::bad_alloc &) {
    return OutOfMemory();
}
