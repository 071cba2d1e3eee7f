// A file-inode list of any bytes. What was read is written as the format says and read again: the
// same records come back.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "request/file_inode_list.h"

#include <cstring>
#include <vector>

namespace vesk {
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    LogToSyslog = 0;
    LogLevel = 0;
    const std::string text(reinterpret_cast<const char *>(data), size);
    std::vector<FileInfo> infos;
    RequestDataGetFileInfos(text.c_str(), &infos);
    std::string again;
    for (const FileInfo &info : infos) {
        FuzzExpect(memchr(info.szRelativePath, 0, sizeof(info.szRelativePath)) != nullptr,
                   "a path ends inside its field");
        FuzzExpect(info.inodeNum <= UINT32_MAX, "an inode number has 32 bits");
        again += std::string(info.szRelativePath) + "#" + std::to_string(info.inodeNum) + ";";
    }
    std::vector<FileInfo> read;
    // Numbers may grow by their leading sign or lose what followed them, so the text may be longer.
    if (again.size() <= 1023) {
        FuzzExpect(RequestDataGetFileInfos(again.c_str(), &read) == 0, "a written list is read");
        FuzzExpect(read.size() == infos.size(), "a written list has as many records");
        for (size_t i = 0; i < read.size(); ++i) {
            FuzzExpect(strcmp(read[i].szRelativePath, infos[i].szRelativePath) == 0 &&
                           read[i].inodeNum == infos[i].inodeNum,
                       "a record comes back as it was");
        }
    }
    std::vector<std::string> pieces;
    SplitString(text.c_str(), ";", &pieces);
    for (const std::string &piece : pieces) {
        FuzzExpect(!piece.empty() && piece.find(';') == std::string::npos, "a piece is one");
    }
    return 0;
}
} // namespace vesk
