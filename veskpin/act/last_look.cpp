#include "act/last_look.h"

#include "files/path.h"
#include "model/file_look.h"
#include "model/look_errors.h"
#include "model/volume_look.h"
#include "space/space_cache.h"

namespace vesk {
namespace {
bool IsThere(const RequestBatch &batch, const BatchFile &file, const FileLook &look) {
    const std::string path = VolumePath(batch.mountPath, file.relativePath);
    uint32_t inode = 0;
    const bool isNamed = FileGetInodeNumber(path.c_str(), &inode) == 0 && inode == file.inode;
    LookLogTake("");
    return isNamed && look.error == 0 && look.hasExtents && !look.blocks.empty() &&
           static_cast<uint32_t>(look.status.inode) == inode;
}
} // namespace

uint64_t BlocksIn(const std::vector<BitRun> &runs) {
    uint64_t count = 0;
    for (const BitRun &run : runs) {
        count += run.count;
    }
    return count;
}

LastLook LastLookAt(const RequestBatch &batch) {
    LastLook last{{batch.mountPath, batch.type, {}, {}}, {}, {batch.mountPath, batch.type, {}, {}}};
    FileLooker looker(batch.mountPath);
    for (const BatchFile &file : batch.files) {
        const FileLook &look = looker.Look(file.relativePath);
        if (!IsThere(batch, file, look)) {
            BatchAdd(&last.gone, file);
            continue;
        }
        const BatchFile now{file.relativePath, file.inode, look.status.bytes,
                            BlocksIn(look.blocks)};
        if (now.bytes == file.bytes && now.blocks == file.blocks) {
            BatchAdd(&last.calm, now);
        } else {
            last.changed.push_back(now);
        }
    }
    return last;
}

bool VolumeCanPin(const std::string &mountPath) {
    const bool can = SpaceHasCacheAndSupportPin(mountPath.c_str()) == 1;
    LookLogTake("");
    return can;
}
} // namespace vesk
