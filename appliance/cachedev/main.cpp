// veskcachedev: serves an emulated cache device through FUSE.
#include "cachedev/background.h"
#include "cachedev/cache_device.h"
#include "cachedev/cachedev_mount.h"
#include "cachedev/cachedev_options.h"
#include "cachedev/pid_file.h"
#include "cachedev/state_json.h"

#include <cstdio>
#include <cstring>
#include <ctime>
#include <exception>
#include <unistd.h>

using namespace vesk;

namespace {
int Fail(const std::string &message) {
    fprintf(stderr, "veskcachedev: %s\n", message.c_str());
    return 1;
}

int Run(int argc, char **argv) {
    CachedevOptions options;
    std::string error;
    if (!CachedevOptionsParse(argc, argv, options, error)) {
        return Fail(error + "\nTry 'veskcachedev --help'.");
    }
    if (options.help) {
        fputs(CachedevUsage(), stdout);
        return fflush(stdout) == 0 ? 0 : 1;
    }
    Background background;
    if (!options.foreground && !BackgroundStart(background)) {
        return 1;
    }

    CacheDevice device;
    device.settings = options.settings;
    if (!CacheImagesOpen(options.backingPath, options.ssdPath, device.images, error)) {
        return Fail(error);
    }
    CacheDeviceStart(device);
    if (!CachedevPrepareFolder(options.folder, error)) {
        return Fail(error);
    }
    PidFile pidFile;
    if (!options.pidFile.empty() && !PidFileWrite(options.pidFile, pidFile, error)) {
        return Fail(error);
    }

    ServedDevice served = {device,
                           options.deviceName,
                           {{{options.deviceName + ".json", {StateJsonOf}},
                             {options.deviceName + ".cached", {CacheDeviceCachedBits}}}},
                           time(nullptr),
                           [&background] { BackgroundReady(background); }};
    const bool isServed = CachedevServe(served, options.folder);
    const int synced = CacheImagesSyncAll(device.images);
    if (synced != 0) {
        return Fail(std::string("cannot sync the images: ") + strerror(-synced));
    }
    return isServed ? 0 : 1;
}
} // namespace

int main(int argc, char **argv) {
    try {
        return Run(argc, argv);
    } catch (const std::exception &failure) {
        return Fail(failure.what());
    }
}
