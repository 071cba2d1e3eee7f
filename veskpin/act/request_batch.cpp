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

std::string BatchStored(const RequestBatch &batch) {
    std::string text;
    for (const BatchFile &file : batch.files) {
        text += (text.empty() ? "" : ";") + file.relativePath + "#" + std::to_string(file.inode);
    }
    return text;
}
} // namespace vesk
