#include "act/request_batch.h"

namespace vesk {
bool BatchAdd(RequestBatch *batch, const BatchFile &file) {
    if (!RequestFillAdd(&batch->fill, batch->mountPath, batch->mountPath + "/" + file.relativePath,
                        file.inode)) {
        return false;
    }
    batch->files.push_back(file);
    return true;
}

std::string BatchPaths(const RequestBatch &batch) {
    std::string text;
    for (const BatchFile &file : batch.files) {
        text += (text.empty() ? "" : ";") + batch.mountPath + "/" + file.relativePath;
    }
    return text;
}

bool BatchIsStoredAs(const RequestBatch &batch, const std::string &data) {
    size_t at = 0;
    for (const BatchFile &file : batch.files) {
        const std::string &path = file.relativePath;
        if (data.compare(at, path.size(), path) != 0 || data[at + path.size()] != '#') {
            return false;
        }
        const size_t separator = data.find(';', at + path.size());
        at = separator == std::string::npos ? data.size() : separator + 1;
    }
    return at == data.size();
}

BatchFile BatchFileOf(const std::string &relativePath, const FileLook &look) {
    BatchFile file{relativePath, static_cast<uint32_t>(look.status.inode), look.status.bytes, 0, 0};
    for (const BitRun &run : look.blocks) {
        file.blocks += run.count;
    }
    for (const FileMappingEntry &entry : look.table.entries) {
        file.sectors += entry.numSectors;
    }
    return file;
}
} // namespace vesk
