// Filling requests with files: how many paths one request takes, and which none takes.
//
// A request's files are limited twice: by the record that travels, which holds the absolute paths,
// and by the stored list, which holds relative paths with inode numbers.
//
// Thread rule: no state.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vesk {
// What stands in the way of a path in any request.
enum class RequestPathFault {
    None,
    Name,    // holds what separates or ends paths: ";", "#" or white space
    TooLong, // longer than record, list or mount path can hold
};

// `filePath` lies below `mountPath` and "/".
RequestPathFault RequestPathCheck(const std::string &mountPath, const std::string &filePath,
                                  uint32_t inode);

// How full a request is.
struct RequestFill {
    size_t files = 0;
    size_t pathBytes = 0; // absolute paths and separators
    size_t listBytes = 0; // file-inode list
};

// Adds a path that no fault stands in the way of. False, with nothing added, when the request has
// no room for it.
bool RequestFillAdd(RequestFill *fill, const std::string &mountPath, const std::string &filePath,
                    uint32_t inode);
} // namespace vesk
