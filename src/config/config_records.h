// The configuration document as plain records, for those who only look: what it holds of the
// documented shape, and what it holds beside that told as problems.
//
// Thread rule: no state; nothing is locked or changed. The service replaces the file whole, so what
// is read is one moment's document.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
struct RecordedFile {
    uint32_t inode;           // the low 32 bits of the file's inode number
    std::string relativePath; // below the volume's mount path
};

struct RecordedVolume {
    std::string mountPath;
    std::vector<RecordedFile> files; // in ascending order of their paths
    bool areFilesKnown = true;       // false: it has no list of files, but something else
    bool isWhole = true;             // false: some of its records cannot be used
};

struct StoredRequest {
    std::string number;
    int type = 0; // RequestType
    std::string mountPath;
    std::string data; // file-inode list
};

struct ConfigRecords {
    bool isMissing = false;              // no file: an empty document
    std::vector<RecordedVolume> volumes; // in ascending order of their mount paths
    std::vector<StoredRequest> requests; // in the order of service
    bool areVolumesKnown = true;         // false: in their place is something else
    bool areRequestsKnown = true;        // the same
    std::vector<std::string> problems;   // what cannot be used, a text each
};

// Replaces `*records` by what the file holds. 0, or -1 after an error message when it cannot be
// read or is no JSON object; then there are no records.
int ConfigReadRecords(const char *configPath, ConfigRecords *records);
} // namespace vesk
