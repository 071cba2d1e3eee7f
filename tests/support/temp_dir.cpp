#include "tests/support/temp_dir.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

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

std::string ReadWhole(const std::string &path) {
    std::ostringstream content;
    content << std::ifstream(path, std::ios::binary).rdbuf();
    return content.str();
}
} // namespace vesk
