// Files that are to be sent, kept in a nameless file: while a request is waited for, which may take
// hours, no folder of the volume stays open, and a tree of any size takes no memory.
//
// Thread rule: one owner.
#pragma once

#include "act/request_batch.h"
#include "base/deleter.h"

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>

namespace vesk {
struct SpooledFile {
    std::string mountPath;
    BatchFile file;
    uint16_t state = 0;  // the writer's own,
    uint16_t action = 0; // and so is this
};

class FileSpool {
public:
    // 0, or the errno with which the files cannot be kept, now or earlier.
    int Error() const { return error_; }
    void Put(const SpooledFile &file);
    // From here on they are taken, in their order.
    void Rewind();
    // False: no more, or Error().
    bool Take(SpooledFile *file);

private:
    std::unique_ptr<FILE, Deleter<fclose>> stream_;
    int error_ = 0;
};
} // namespace vesk
