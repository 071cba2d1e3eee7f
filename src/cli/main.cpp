// The program's entry: parses the command line, runs the one command it names, prints what scripts
// read and turns the outcome into the exit status.
#include "base/log.h"
#include "base/malloc_text.h"
#include "cli/options.h"
#include "cli/usage.h"
#include "commands/check_bitmap_set.h"
#include "commands/check_file_pin.h"
#include "commands/delete_bitmap.h"
#include "commands/files_request.h"
#include "commands/get_bitmap_size.h"
#include "commands/handle_mount.h"
#include "commands/handle_umount.h"
#include "commands/modify_bitmap.h"
#include "commands/pending_space.h"
#include "commands/send_bitmap.h"
#include "commands/unpin_all.h"
#include "commands/unpin_range.h"
#include "driver/bitmap_control.h"
#include "request/tool_parameters.h"
#include "service/start_service.h"
#include "space/space.h"
#include "space/space_cache.h"

#include <cstdio>
#include <json/value.h>
#include <libgen.h>
#include <new>

namespace {

const char buildStamp[] = "2018-06-08-15:24";

// Static: the service's worker reads it after the first thread may have ended.
ToolParameters parameters;

} // namespace

int main(int argc, char *argv[]) try {
    ProgramName = basename(argv[0]);
    LogVerbose("Process name = %s", ProgramName);
    if (GetOptions(argc, argv, &parameters) < 0) {
        Usage();
        return -1;
    }
    if (parameters.debug != 0) {
        LogLevel = 3;
    } else if (parameters.verbose != 0) {
        LogLevel = 2;
    }
    LogTraceEntry();

    const char *mountPath = parameters.mountPath;
    const unsigned long long startSector = parameters.startSector;
    const unsigned long long numSectors = parameters.numSectors;
    int exitValue = -1;

    switch (parameters.command) {
    case commandInvalid:
        LogError("Invalid input");
        Usage();
        exitValue = 0;
        break;

    case commandPinFiles:
        LogNotice("Send pin file request, files = %s", parameters.files);
        if (PinFilesRequest(&parameters) < 0) {
            LogError("Pin files failed");
            break;
        }
        LogNotice("Send pin file request OK");
        exitValue = 0;
        break;

    case commandUnpinFiles:
        LogNotice("Send unpin file request, files = %s", parameters.files);
        if (UnpinFilesRequest(&parameters) < 0) {
            LogError("Unpin files failed");
            break;
        }
        LogNotice("Send unpin files request OK");
        exitValue = 0;
        break;

    case commandSendBitmap:
        LogNotice("Start to send bitmap for volume (%s)", mountPath);
        if (SendBitmap(mountPath) < 0) {
            LogError("Send bitmap to space (%s) failed", mountPath);
            break;
        }
        LogNotice("Send bitmap OK");
        exitValue = 0;
        break;

    case commandStartService:
        LogNotice("Service starts (Build time: %s)", buildStamp);
        if (StartService(&parameters) < 0) {
            LogError("Can't start service");
            break;
        }
        exitValue = 0;
        break;

    case commandHandleMount:
        if (HandleSpaceMount(parameters.configPath, mountPath) < 0) {
            LogError("Handle space (%s) mount failed", mountPath);
            break;
        }
        LogVerbose("Handle space (%s) mount OK", mountPath);
        exitValue = 0;
        break;

    case commandHandleUmount:
        if (HandleSpaceUmount(mountPath) < 0) {
            LogError("Handle space (%s) umount failed", mountPath);
            break;
        }
        LogVerbose("Handle space (%s) umount OK", mountPath);
        exitValue = 0;
        break;

    case commandSupportPin:
        puts(SpaceHasCacheAndSupportPin(mountPath) ? "Yes" : "No");
        exitValue = 0;
        break;

    case commandCheckBitmap:
        puts(CheckBitmapSet(mountPath) ? "Yes" : "No");
        exitValue = 0;
        break;

    case commandAddPendingSpace:
        if (AddPendingSpaceRequest(mountPath) < 0) {
            LogError("Can't sent pending space");
            break;
        }
        LogNotice("Set pending space OK");
        exitValue = 0;
        break;

    case commandRemovePendingSpace:
        if (RemovePendingSpaceRequest(mountPath) < 0) {
            LogError("Can't sent pending space");
            break;
        }
        LogNotice("Set pending space OK");
        exitValue = 0;
        break;

    case commandGetUUID: {
        const MallocText uuid(SpaceGetUUID(mountPath));
        if (uuid) {
            puts(uuid.get());
        }
        exitValue = 0;
        break;
    }

    case commandDeleteBitmap:
        if (DeleteBitmap(mountPath) < 0) {
            LogError("Delete bitmap on volume (%s) failed", mountPath);
            break;
        }
        LogNotice("Delete bitmap on volume (%s) OK", mountPath);
        exitValue = 0;
        break;

    case commandCheckPin: {
        const int result = CheckFileIsPin(parameters.configPath, parameters.checkPinFilePath);
        if (result == checkPinPinned) {
            puts("Yes");
        } else if (result == checkPinNotPinned) {
            puts("No");
        } else if (result == checkPinError) {
            puts("Error");
        }
        exitValue = 0;
        break;
    }

    case commandReloadPinBlocks:
        LogNotice("Start to send reload block request");
        if (ReloadPinBlocksRequest(&parameters) < 0) {
            LogError("Reload blocks on volume (%s) failed", mountPath);
            break;
        }
        LogNotice("Send reload block request OK");
        exitValue = 0;
        break;

    case commandUnpinAllBlocks:
        if (UnpinAllBlocks(&parameters) == 0) {
            exitValue = 0;
        }
        break;

    case commandIsAllUnpin: {
        int allUnpinned = 0;
        if (isAllBlocksUnpin(parameters.cachePath, &allUnpinned) < 0) {
            puts("Get unpin information failed. (This cache doesn't support pin ?)");
            break;
        }
        puts(allUnpinned != 0 ? "Yes" : "No");
        exitValue = 0;
        break;
    }

    case commandSetBitmap:
        if (SetBitmap(mountPath, startSector, numSectors) < 0) {
            LogError("Set bitmap on volume (%s) failed (Start sector = %llu Num of sector = %llu)",
                     mountPath, startSector, numSectors);
            break;
        }
        LogNotice("Set bitmap on volume (%s) OK (Start sector = %llu Num of sector = %llu)",
                  mountPath, startSector, numSectors);
        exitValue = 0;
        break;

    case commandUnsetBitmap:
        if (UnsetBitmap(mountPath, startSector, numSectors) < 0) {
            LogError(
                "Unset bitmap on volume (%s) failed (Start sector = %llu Num of sector = %llu)",
                mountPath, startSector, numSectors);
            break;
        }
        LogNotice("Unset bitmap on volume (%s) OK (Start sector = %llu Num of sector = %llu)",
                  mountPath, startSector, numSectors);
        exitValue = 0;
        break;

    case commandUnpinRange:
        if (UnpinRange(mountPath, startSector, numSectors) < 0) {
            LogError(
                "Unpin range in cache (volume = %s) failed (Start sector = %llu Num of sector = %llu)",
                mountPath, startSector, numSectors);
            break;
        }
        LogNotice(
            "Unpin range in cache (volume = %s) OK (Start sector = %llu Num of sector = %llu)",
            mountPath, startSector, numSectors);
        exitValue = 0;
        break;

    case commandGetBitmapSizeByte: {
        uint64_t size = 0;
        if (GetBitmapSizeByte(mountPath, &size) < 0) {
            LogError("Get bitmap size for volume (%s) failed", mountPath);
            break;
        }
        printf("%llu\n", LogU64(size));
        exitValue = 0;
        break;
    }
    }

    LogTraceExit();
    return exitValue;
} catch (const std::bad_alloc &) {
    LogError("Out of memory");
    return -1;
} catch (const Json::Exception &) { // which the JSON library throws for want of memory, too
    LogError("Out of memory");
    return -1;
}
