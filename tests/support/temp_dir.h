// A private folder for one test, removed with everything in it.
#pragma once

#include <cstdint>
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

// Dates outside 1901 to 2038, which 32 bits do not hold: of 1890, 2040 and 2106, in seconds from
// 1970 on.
constexpr int64_t kFarDates[] = {-2524521600, 2208988800, 4291747200};

// Dates a file's last access and change.
void DateFile(const std::string &path, int64_t seconds);
std::string ReadWhole(const std::string &path);
} // namespace vesk
