// A private folder for one test, removed with everything in it.
#pragma once

#include <string>

namespace vesk {
class TempDir {
public:
    TempDir(); // below the machine's folder for such
    explicit TempDir(const std::string &parent);
    ~TempDir();
    TempDir(const TempDir &) = delete;
    TempDir &operator=(const TempDir &) = delete;

    const std::string &Path() const { return path_; }
    std::string Path(const std::string &name) const { return path_ + "/" + name; }
    // Writes a file of this name and returns its path.
    std::string FileMake(const std::string &name, const std::string &content) const;

private:
    std::string path_;
};

// Whole files, binary. ReadWhole of a missing file gives the empty text.
void WriteWhole(const std::string &path, const std::string &content);
std::string ReadWhole(const std::string &path);
} // namespace vesk
