// What happens to a volume's pins when it is mounted.
//
// Pins are kept only while the volume's cache supports pinning: a volume that comes up without such
// a cache loses its records and its bitmap file, so that stale pins never reach a cache made later.
//
// Thread rule: for one-shot processes. The configuration is changed without the service's lock.
#pragma once

namespace vesk {

// 0, or -1 after an error message; records already removed stay removed.
int HandleSpaceMount(const char *configPath, const char *mountPath);

} // namespace vesk
