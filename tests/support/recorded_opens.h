// How the code under test opens its files, while an object of this class lives. One at a time: it
// takes FakeLibc's onOpen.
#pragma once

#include "tests/support/fake_libc.h"

#include <fcntl.h>
#include <string>
#include <vector>

namespace vesk {
struct RecordedOpen {
    std::string path; // as given
    int flags;
    unsigned mode; // of the file to be created; 0 without O_CREAT
};

class RecordedOpens {
public:
    RecordedOpens() {
        FakeLibc::onOpen = [this](const std::string &path, int flags, unsigned mode) {
            all.push_back({path, flags, mode});
        };
    }
    ~RecordedOpens() { FakeLibc::onOpen = nullptr; }
    RecordedOpens(const RecordedOpens &) = delete;
    RecordedOpens &operator=(const RecordedOpens &) = delete;

    // The flags with which this path was opened, in order.
    std::vector<int> FlagsOf(const std::string &path) const {
        std::vector<int> flags;
        for (const RecordedOpen &one : all) {
            if (one.path == path) {
                flags.push_back(one.flags);
            }
        }
        return flags;
    }

    std::vector<RecordedOpen> all;
};
} // namespace vesk
