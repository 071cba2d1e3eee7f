// Mounting the cache device's folder and serving it until it is unmounted or a signal comes.
#pragma once

#include "cachedev/cachedev_fuse.h"

#include <string>

namespace vesk {
// Makes `folder` (absolute path) ready to be a mount point: creates it with its parents if missing,
// and refuses a folder that is a mount point already or is not empty. False: `error` is a message
// for the user.
bool CachedevPrepareFolder(const std::string &folder, std::string &error);

// Mounts, serves in several threads, and unmounts again when SIGTERM, SIGINT or SIGHUP comes or the
// folder was unmounted. Call it from the first thread; it returns when all requests are answered.
// False after a message on standard error.
bool CachedevServe(ServedDevice &served, const std::string &folder);
} // namespace vesk
