// Unpinning every block of a cache. Neither bitmap file nor configuration is changed.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

struct ToolParameters;

// By the volume's mount path or, without one, by the cache path. 0, or -1 after an error message.
int UnpinAllBlocks(const ToolParameters *parameters);

int UnpinAllBlocksByMouhtPath(const char *mountPath);
int UnpinAllBlocksByCachePath(const char *cachePath);

} // namespace vesk
