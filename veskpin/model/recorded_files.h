// The files of a volume that are known: recorded, in a stored request, or in one that waits in the
// queue to be stored.
//
// Thread rule: no state.
#pragma once

#include "config/config_records.h"
#include "request/request_record.h"

#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace vesk {
struct KnownFile {
    std::string relativePath;
    std::optional<uint32_t> inode; // the recorded one, absent where there is only a request
    int stored = kRequestUnknown;  // the last request for it: pin, unpin or none
    std::optional<uint32_t> storedInode = std::nullopt; // that a stored request names
};

// In ascending order of paths; a path stands there once for each inode recorded under it, since a
// file that was replaced and pinned again leaves its old record.
struct KnownFiles {
    std::vector<KnownFile> files;
    uint64_t recorded = 0; // records
    uint64_t requests = 0; // stored requests of the volume
    uint64_t sent = 0;     // its requests in the queue
    std::vector<std::pair<uint32_t, size_t>>
        byInode;                 // inode, recorded or in a request, and index in `files`; sorted
    bool isRecordedKnown = true; // false: how many records there are cannot be told
    bool isWhole = true;         // false: a file that is not here may be known all the same
    std::vector<std::string> problems;
};

// Takes the records out of `volume`, which may be null, and of the requests, stored and sent after
// them, those of `mountPath`.
KnownFiles KnownFilesOf(const std::string &mountPath, RecordedVolume *volume,
                        const std::vector<StoredRequest> &requests,
                        const std::vector<RequestRecord> &sent = {});

// The entries of this path, and those at and below this folder (empty: all), as a range of indexes.
std::pair<size_t, size_t> KnownFilesAt(const KnownFiles &known, const std::string &relativePath);
std::pair<size_t, size_t> KnownFilesBelow(const KnownFiles &known, const std::string &folder);

// What is known of the file whose inode has these low 32 bits, under whatever path: the first one
// that it is recorded under, or else stands in a request with. What is stored for that path and
// another inode is none of its own.
std::optional<KnownFile> KnownFileByInode(const KnownFiles &known, uint64_t inode);
} // namespace vesk
