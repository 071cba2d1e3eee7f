#include "act/last_look.h"

#include "files/path.h"
#include "model/file_look.h"
#include "model/look_errors.h"
#include "model/volume_look.h"
#include "space/space_cache.h"

#include <sys/stat.h>

namespace vesk {
namespace {
// By the path and not from the folder on, as the receiver asks; of a file that was seen to be one,
// since a link in its place may lead to a file system that never answers.
bool ReceiverSees(const RequestBatch &batch, const BatchFile &file) {
    const std::string path = VolumePath(batch.mountPath, file.relativePath);
    uint32_t inode = 0;
    const bool isSame = FileGetInodeNumber(path.c_str(), &inode) == 0 && inode == file.inode;
    LookLogTake("");
    return isSame;
}

RequestBatch *ListOf(LastLook *last, const RequestBatch &batch, const BatchFile &file,
                     const FileLook &look) {
    if (look.error != 0 || !S_ISREG(look.status.mode) ||
        static_cast<uint32_t>(look.status.inode) != file.inode || !ReceiverSees(batch, file)) {
        return &last->gone;
    }
    if (!look.hasExtents) {
        return &last->unreadable;
    }
    return look.blocks.empty() ? &last->empty : &last->calm;
}
} // namespace

LastLook LastLookAt(const RequestBatch &batch) {
    const RequestBatch none{batch.mountPath, batch.type, {}, {}};
    LastLook last{none, {}, none, none, none};
    FileLooker looker(batch.mountPath);
    for (const BatchFile &file : batch.files) {
        const FileLook &look = looker.Look(file.relativePath);
        RequestBatch *list = ListOf(&last, batch, file, look);
        const BatchFile now = BatchFileOf(file.relativePath, look);
        if (list != &last.calm) {
            BatchAdd(list, file);
        } else if (now.bytes == file.bytes && now.blocks == file.blocks) {
            BatchAdd(list, now);
        } else {
            last.changed.push_back(now);
        }
    }
    LookLogTake("");
    return last;
}

bool VolumeCanPin(const std::string &mountPath) {
    const bool can = SpaceHasCacheAndSupportPin(mountPath.c_str()) == 1;
    LookLogTake("");
    return can;
}
} // namespace vesk
