#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <sys/stat.h>

namespace vesk {
TempDir::TempDir() : TempDir(std::filesystem::temp_directory_path().string()) {}

TempDir::TempDir(const std::string &parent) : path_(parent + "/vesk-test-XXXXXX") {
    if (mkdtemp(&path_[0]) == nullptr) {
        abort();
    }
}

TempDir::~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

std::string TempDir::FileMake(const std::string &name, const std::string &content) const {
    WriteWhole(Path(name), content);
    return Path(name);
}

void WriteWhole(const std::string &path, const std::string &content) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
}

void DateFile(const std::string &path, int64_t seconds) {
    const auto date = static_cast<time_t>(seconds);
    ASSERT_EQ(date, seconds);
    const timespec times[] = {{date, 0}, {date, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), times, 0), 0) << path;
}

std::string ReadWhole(const std::string &path) {
    std::ostringstream content;
    content << std::ifstream(path, std::ios::binary).rdbuf();
    return content.str();
}
} // namespace vesk
