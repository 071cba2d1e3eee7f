#include "cli/options.h"

#include "base/log.h"

#include <cstdio>

namespace vesk {
namespace {
// Scripts and people compare this text, so its slips stay: "--check-bitmp", the parenthesis left
// open, the trailing blanks. Every %s is the program's name.
const char *const kUsageLines[] = {
    "Usage:\n",
    "\tStart service:\n",
    "\t\t%s --start-service --config-path conf_path\n",
    "\tPin files:\n",
    "\t\t%s --pin-files \"file_path1;file_path2\" --mount-path mount_path\n",
    "\tUnpin files:\n",
    "\t\t%s --unpin-files \"file_path1;file_path2\" --mount-path mount_path\n",
    "\tCheck if a volume support pin:\n",
    "\t\t%s --support-pin --mount-path mount_path\n",
    "\tRead bitmap file, set to cache driver (If cache's bitmap is set, it won't set again)\n",
    "\t\t%s --send-bitmap --mount-path mount_path\n",
    "\tCheck if the bitmap is set:\n",
    "\t\t%s --check-bitmp --mount-path mount_path\n",
    "\tHandle volume mount event:\n",
    "\t\t%s --handle-mount --mount-path mount_path --config-path config_path\n",
    "\tHandle volume umount event:\n",
    "\t\t%s --handle-umount --mount-path mount_path\n",
    "\tDelete volume's bitmap file: (it will check if volume support pin first)\n",
    "\t\t%s --delete-bitmap --mount-path mount_path\n",
    "\tCheck if a file is pinned to cache\n",
    "\t\t%s --check-pin file_path --config-path conf_path\n",
    "\tReload all pin files by bitmap\n",
    "\t\t%s --reload-blocks --mount-path mount_path\n",
    "\tCheck if all cache blocks are unpinned\n",
    "\t\t%s --is-all-unpin /dev/mapper/cachedev_0\n",
    "\tUnpin all cache blocks and clean the bitmap of cache driver (Only work for DPX, doesn't update the config file:\n",
    "\t\t%s --unpin-all --mount-path mount_path (e.g. /volume1), Or \n",
    "\t\t%s --unpin-all --cache-path cache_path (e.g. /dev/mapper/cachedev_0)\n",
    "\tGet bitmap size (in bytes)\n",
    "\t\t%s --get-bitmap-size-byte --mount-path mount_path\n",
    "\tMisc:\n",
    "\t\t--stdout: Output to standard out (instead of syslog) \n",
    "\t\t--verbose: Output verbose information\n",
    "\t\t--debug: Output debug information\n",
    "\t[For development only]\n",
    "\tSet the bitmap file in volume (You can set to driver by --send-bitmap later)\n",
    "\t\t%s --set-bitmap --mount-path mount_path --start-sector start_sector --num-sectors num_sectors\n",
};
} // namespace

void Usage() {
    for (const char *line : kUsageLines) {
        printf(line, ProgramName); // NOLINT: every line has one %s or none
    }
}
} // namespace vesk
