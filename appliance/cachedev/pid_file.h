// The file that holds the daemon's process id.
#pragma once

#include <string>

namespace vesk {
// Removes the file with the record.
struct PidFile {
    std::string path; // empty: none
    PidFile() = default;
    ~PidFile();
    PidFile(const PidFile &) = delete;
    PidFile &operator=(const PidFile &) = delete;
};

// Writes this process's id. What somebody else may have put in the file's place, a link, a second
// name of another file, a FIFO or a file of his own, is left as it is. False: `error` is a message
// for the user.
bool PidFileWrite(const std::string &path, PidFile &file, std::string &error);
} // namespace vesk
