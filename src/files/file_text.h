// Small text files: the message-queue key and the like. Thread rule: no state.
#pragma once

#include <string>

namespace vesk {
// What becomes of the content of a file that is there already.
enum class OldContent { Emptied, Kept };

// Creates or empties the file, or finds its end, and writes the text, nothing added. A file that is
// created has the mode 0644 whatever the umask. 0, or -1 after an error message when it cannot be
// opened or not every byte was written.
int FileWriteString(const char *path, const char *text, OldContent old = OldContent::Emptied);

// The first line of the file, with its line feed if it has one. 0, or -1 after an error message
// when the file cannot be opened or is empty.
int FileReadString(const char *path, std::string *text);

// The same of the whole file, in FileReadString's name, without blocking whatever lies there; of a
// file longer than 8 KiB the beginning. -1 without a message where it is no regular file.
int FileReadWhole(const char *path, std::string *text);
} // namespace vesk
