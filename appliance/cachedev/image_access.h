// Who may open an image that is a regular file, and that only one device serves it.
#pragma once

#include <string>
#include <sys/stat.h>

namespace vesk {
// False, with a message for the user, when others may write the image: they could change what
// root's file system on it believes. What others may only read is served with a warning on standard
// error, as every program that makes files makes them readable. `name` is what messages call it.
bool ImageIsPrivate(const struct stat &status, const std::string &path, const std::string &name,
                    std::string &error);

// Locks an open image against a second device until the descriptor is closed: 0, EAGAIN where
// another one has it, or another errno. Readers' locks, which anybody takes on a file that he may
// read, keep nobody from the image; while there is one, a second device goes unnoticed.
int ImageLock(int fd);
} // namespace vesk
