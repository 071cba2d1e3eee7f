#include "tests/fuzz/fuzz_input.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace vesk {
namespace {
struct Folder {
    std::string path = "/dev/shm/vesk-fuzz.XXXXXX";
    Folder() {
        if (mkdtemp(&path[0]) == nullptr) {
            perror("vesk-fuzz: no folder in /dev/shm");
            abort();
        }
    }
    ~Folder() {
        std::error_code ignored;
        std::filesystem::remove_all(path, ignored);
    }
    Folder(const Folder &) = delete;
    Folder &operator=(const Folder &) = delete;
};
} // namespace

uint64_t FuzzInput::Number(size_t bytes) {
    uint64_t number = 0;
    for (size_t i = 0; i < bytes; ++i) {
        number |= static_cast<uint64_t>(Byte()) << (8 * i);
    }
    return number;
}

std::string FuzzInput::Text(size_t bytes) {
    const size_t length = std::min(bytes, size_ - at_);
    const std::string text(reinterpret_cast<const char *>(data_) + at_, length);
    at_ += length;
    return text;
}

std::string FuzzPath(const char *name) {
    static const Folder folder;
    return folder.path + "/" + name;
}

void FuzzWrite(const std::string &path, const std::string &content) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
}

std::string FuzzRead(const std::string &path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void FuzzExpect(bool holds, const char *what) {
    if (!holds) {
        fprintf(stderr, "broken: %s\n", what);
        abort();
    }
}
} // namespace vesk
