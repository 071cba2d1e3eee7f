#include "act/file_spool.h"

#include <cerrno>

namespace vesk {
namespace {
// What has a fixed size of one file; behind it stand both texts.
struct Head {
    uint64_t bytes;
    uint64_t blocks;
    uint64_t sectors;
    uint32_t inode;
    uint16_t state;
    uint16_t action;
    uint32_t mountPathBytes;
    uint32_t relativePathBytes;
};

bool ReadText(FILE *stream, size_t bytes, std::string *text) {
    text->resize(bytes);
    return fread(&(*text)[0], 1, bytes, stream) == bytes;
}
} // namespace

void FileSpool::Put(const SpooledFile &file) {
    if (!stream_ && error_ == 0) {
        stream_.reset(tmpfile());
        error_ = stream_ ? 0 : errno;
    }
    if (error_ != 0) {
        return;
    }
    const Head head{file.file.bytes,
                    file.file.blocks,
                    file.file.sectors,
                    file.file.inode,
                    file.state,
                    file.action,
                    static_cast<uint32_t>(file.mountPath.size()),
                    static_cast<uint32_t>(file.file.relativePath.size())};
    const std::string texts = file.mountPath + file.file.relativePath;
    if (fwrite(&head, sizeof(head), 1, stream_.get()) != 1 ||
        fwrite(texts.data(), 1, texts.size(), stream_.get()) != texts.size()) {
        error_ = errno != 0 ? errno : EIO;
    }
}

void FileSpool::Rewind() {
    if (stream_ && error_ == 0 &&
        (fflush(stream_.get()) != 0 || fseek(stream_.get(), 0, SEEK_SET) != 0)) {
        error_ = errno;
    }
}

bool FileSpool::Take(SpooledFile *file) {
    Head head{};
    if (!stream_ || error_ != 0) {
        return false;
    }
    const size_t heads = fread(&head, sizeof(head), 1, stream_.get());
    if (heads == 0 && feof(stream_.get()) != 0) {
        return false;
    }
    if (heads == 0 || !ReadText(stream_.get(), head.mountPathBytes, &file->mountPath) ||
        !ReadText(stream_.get(), head.relativePathBytes, &file->file.relativePath)) {
        error_ = errno != 0 ? errno : EIO;
        return false;
    }
    file->file.bytes = head.bytes;
    file->file.blocks = head.blocks;
    file->file.sectors = head.sectors;
    file->file.inode = head.inode;
    file->state = head.state;
    file->action = head.action;
    return true;
}
} // namespace vesk
