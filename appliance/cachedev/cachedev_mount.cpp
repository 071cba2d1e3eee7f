#include "cachedev/cachedev_mount.h"

#include "base/deleter.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <sys/stat.h>
#include <system_error>

namespace vesk {
namespace {
using SessionPtr = std::unique_ptr<struct fuse_session, Deleter<fuse_session_destroy>>;
using MountPtr = std::unique_ptr<struct fuse_session, Deleter<fuse_session_unmount>>;
using HandlersPtr = std::unique_ptr<struct fuse_session, Deleter<fuse_remove_signal_handlers>>;
using LoopConfigPtr = std::unique_ptr<struct fuse_loop_config, Deleter<fuse_loop_cfg_destroy>>;
using ArgumentsPtr = std::unique_ptr<struct fuse_args, Deleter<fuse_opt_free_args>>;

SessionPtr MakeSession(ServedDevice &served) {
    struct fuse_args arguments = FUSE_ARGS_INIT(0, nullptr);
    const ArgumentsPtr freeArguments(&arguments);
    for (const char *argument :
         {"veskcachedev", "-o", "fsname=veskcachedev,subtype=veskcachedev,default_permissions"}) {
        if (fuse_opt_add_arg(&arguments, argument) != 0) {
            return nullptr;
        }
    }
    const struct fuse_lowlevel_ops operations = CachedevFuseOperations();
    return SessionPtr(fuse_session_new(&arguments, &operations, sizeof operations, &served));
}

bool IsMountPoint(const std::string &folder) {
    struct statx status = {};
    return statx(AT_FDCWD, folder.c_str(), AT_NO_AUTOMOUNT, 0, &status) == 0 &&
           (status.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
}
} // namespace

bool CachedevPrepareFolder(const std::string &folder, std::string &error) {
    std::error_code code;
    std::filesystem::create_directories(folder, code);
    // What a killed daemon leaves mounted answers everything with this error.
    if (code == std::errc::not_connected) {
        error = folder +
                " is still the mount point of a cache device that has ended; run: umount " + folder;
        return false;
    }
    if (code) {
        error = "cannot make the folder " + folder + ": " + code.message();
        return false;
    }
    if (IsMountPoint(folder)) {
        error = folder + " is a mount point already";
        return false;
    }
    const bool isEmpty = std::filesystem::is_empty(folder, code);
    if (code || !isEmpty) {
        error = "the folder " + folder +
                (code ? " cannot be read: " + code.message()
                      : " is not empty: what it holds would be hidden behind the device");
        return false;
    }
    return true;
}

bool CachedevServe(ServedDevice &served, const std::string &folder) {
    const SessionPtr session = MakeSession(served);
    if (!session) {
        fprintf(stderr, "veskcachedev: libfuse cannot be started\n");
        return false;
    }
    if (fuse_set_signal_handlers(session.get()) != 0) {
        fprintf(stderr, "veskcachedev: cannot set the signal handlers\n");
        return false;
    }
    const HandlersPtr removeHandlers(session.get());
    // libfuse names the cause itself: no /dev/fuse, no right to mount.
    if (fuse_session_mount(session.get(), folder.c_str()) != 0) {
        fprintf(stderr, "veskcachedev: cannot mount a FUSE filesystem on %s\n", folder.c_str());
        return false;
    }
    const MountPtr unmount(session.get());
    const LoopConfigPtr config(fuse_loop_cfg_create());
    if (!config) {
        fprintf(stderr, "veskcachedev: out of memory\n");
        return false;
    }
    // One descriptor per thread keeps the threads out of each other's queues.
    fuse_loop_cfg_set_clone_fd(config.get(), 1);
    const int result = fuse_session_loop_mt(session.get(), config.get());
    if (result < 0) { // above 0: the signal that ended it
        fprintf(stderr, "veskcachedev: serving ended with an error: %s\n", strerror(-result));
        return false;
    }
    return true;
}
} // namespace vesk
