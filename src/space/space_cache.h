// A space's SSD cache: whether there is one, where its device is and whether it supports pinning.
//
// Spaces are named by UUID or by mount path. Nothing is kept between calls. A returned text is
// malloc'd for the caller; null means not found or, after an error message, failure. Whoever asks
// for a cause (space/space.h) is told why.
//
// Thread rule: no state; callable from any thread.
#pragma once

#include "space/space.h"

struct VESKFlashCacheConfig;

namespace vesk {
// The space's cache configuration (release it with VESKFlashCacheConfigFree), or null.
VESKFlashCacheConfig *SpaceGetCacheConfig(const char *uuid, SpaceCause *cause = nullptr);

// 1 if the space has a cache, else 0.
int SpaceHasCache(const char *uuid, SpaceCause *cause = nullptr);

// Path of the cache's SSD device.
char *SpaceGetCacheSsdPath(const char *uuid, SpaceCause *cause = nullptr);

// Path of the cache device itself, for instance /dev/mapper/cachedev_0.
char *SpaceGetCachePath(const char *uuid, SpaceCause *cause = nullptr);
char *SpaceGetCachePathByMountPath(const char *mountPath, SpaceCause *cause = nullptr);

// 1 if the volume has a cache that is up and supports pinning, else 0. A cache that is being
// created answers 0 without an error message.
int SpaceHasCacheAndSupportPin(const char *mountPath, SpaceCause *cause = nullptr);
int SpaceHasCacheAndSupportPinByUUID(const char *uuid, SpaceCause *cause = nullptr);
} // namespace vesk
