#include "cli/options.h"

#include "base/log.h"
#include "tests/support/captured_log.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const char kExpectedUsage[] =
    "Usage:\n"
    "\tStart service:\n"
    "\t\ttool --start-service --config-path conf_path\n"
    "\tPin files:\n"
    "\t\ttool --pin-files \"file_path1;file_path2\" --mount-path mount_path\n"
    "\tUnpin files:\n"
    "\t\ttool --unpin-files \"file_path1;file_path2\" --mount-path mount_path\n"
    "\tCheck if a volume support pin:\n"
    "\t\ttool --support-pin --mount-path mount_path\n"
    "\tRead bitmap file, set to cache driver (If cache's bitmap is set, it won't set again)\n"
    "\t\ttool --send-bitmap --mount-path mount_path\n"
    "\tCheck if the bitmap is set:\n"
    "\t\ttool --check-bitmp --mount-path mount_path\n"
    "\tHandle volume mount event:\n"
    "\t\ttool --handle-mount --mount-path mount_path --config-path config_path\n"
    "\tHandle volume umount event:\n"
    "\t\ttool --handle-umount --mount-path mount_path\n"
    "\tDelete volume's bitmap file: (it will check if volume support pin first)\n"
    "\t\ttool --delete-bitmap --mount-path mount_path\n"
    "\tCheck if a file is pinned to cache\n"
    "\t\ttool --check-pin file_path --config-path conf_path\n"
    "\tReload all pin files by bitmap\n"
    "\t\ttool --reload-blocks --mount-path mount_path\n"
    "\tCheck if all cache blocks are unpinned\n"
    "\t\ttool --is-all-unpin /dev/mapper/cachedev_0\n"
    "\tUnpin all cache blocks and clean the bitmap of cache driver (Only work for DPX, doesn't "
    "update the config file:\n"
    "\t\ttool --unpin-all --mount-path mount_path (e.g. /volume1), Or \n"
    "\t\ttool --unpin-all --cache-path cache_path (e.g. /dev/mapper/cachedev_0)\n"
    "\tGet bitmap size (in bytes)\n"
    "\t\ttool --get-bitmap-size-byte --mount-path mount_path\n"
    "\tMisc:\n"
    "\t\t--stdout: Output to standard out (instead of syslog) \n"
    "\t\t--verbose: Output verbose information\n"
    "\t\t--debug: Output debug information\n"
    "\t[For development only]\n"
    "\tSet the bitmap file in volume (You can set to driver by --send-bitmap later)\n"
    "\t\ttool --set-bitmap --mount-path mount_path --start-sector start_sector --num-sectors "
    "num_sectors\n";
} // namespace

TEST(Usage, IsThisTextWithTheProgramNameInItsExamples) {
    CapturedLog output;
    Usage();
    EXPECT_EQ(output.Text(), kExpectedUsage);
}

TEST(Usage, GoesToStandardOutputAlsoWhenMessagesGoToTheSystemLog) {
    CapturedLog output;
    LogToSyslog = 1;
    Usage();
    LogToSyslog = 0;
    EXPECT_EQ(output.Text(), kExpectedUsage);
}

TEST(Usage, IsTheSameAtEveryLogLevel) {
    CapturedLog output(3);
    Usage();
    EXPECT_EQ(output.Text(), kExpectedUsage);
}

TEST(Usage, PercentSignsInTheProgramNameAreText) {
    CapturedLog output;
    ProgramName = "%s%n";
    Usage();
    EXPECT_NE(output.Text().find("\t\t%s%n --start-service --config-path conf_path\n"),
              std::string::npos);
}
} // namespace vesk
