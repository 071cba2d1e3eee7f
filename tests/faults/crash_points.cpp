#include "tests/faults/crash_points.h"

#include <algorithm>
#include <memory>
#include <set>
#include <sstream>
#include <tuple>

namespace vesk {
namespace {
// A file as programs see it, and as the disk is sure to have it.
struct DiskFile {
    std::string content;
    std::string durable;
};

using Names = std::map<std::string, std::shared_ptr<DiskFile>>;

struct Disk {
    Names names;
    Names durableNames;
    std::string driverBitmap;
    int received = 0;
    std::string bitmapPath;
};

bool IsIn(const std::string &path, const std::string &folder) {
    return path.rfind(folder + "/", 0) == 0;
}

// A folder's sync makes the names in it durable, also the absence of those that are gone.
void SyncFolder(const std::string &folder, Disk *disk) {
    for (auto it = disk->durableNames.begin(); it != disk->durableNames.end();) {
        it = IsIn(it->first, folder) ? disk->durableNames.erase(it) : std::next(it);
    }
    for (const auto &[path, file] : disk->names) {
        if (IsIn(path, folder)) {
            disk->durableNames[path] = file;
        }
    }
}

void Write(std::istream &words, DiskFile *file) {
    size_t offset = 0;
    size_t bytes = 0;
    words >> offset >> bytes;
    words.get(); // the line's end
    std::string data(bytes, '\0');
    words.read(&data[0], static_cast<std::streamsize>(bytes));
    file->content.resize(std::max(file->content.size(), offset + bytes));
    file->content.replace(offset, bytes, data);
}

// Carries out the record's next operation; false at its end.
bool Step(std::istream &words, Disk *disk) {
    std::string operation;
    if (!(words >> operation)) {
        return false;
    }
    if (operation == "receive") {
        ++disk->received;
        return true;
    }
    if (operation == "driver") {
        disk->driverBitmap = disk->names[disk->bitmapPath]->content;
        return true;
    }
    std::string path;
    words >> path;
    if (operation == "create") {
        disk->names[path] = std::make_shared<DiskFile>();
    } else if (operation == "write") {
        Write(words, disk->names[path].get());
    } else if (operation == "truncate") {
        disk->names[path]->content.clear();
    } else if (operation == "sync") {
        const auto file = disk->names.find(path);
        if (file == disk->names.end()) {
            SyncFolder(path, disk);
        } else {
            file->second->durable = file->second->content;
        }
    } else if (operation == "rename") {
        std::string target;
        words >> target;
        disk->names[target] = disk->names[path];
        disk->names.erase(path);
    } else if (operation == "unlink") {
        disk->names.erase(path);
    }
    return true;
}

std::string Whole(const DiskFile &file) {
    return file.content;
}

std::string Durable(const DiskFile &file) {
    return file.durable;
}

// Half of what was not synced has reached the disk.
std::string Torn(const DiskFile &file) {
    return file.content == file.durable ? file.content
                                        : file.content.substr(0, file.content.size() / 2);
}

Files FilesOf(const Names &names, std::string (*content)(const DiskFile &)) {
    Files files;
    for (const auto &[path, file] : names) {
        files[path] = content(*file);
    }
    return files;
}
} // namespace

std::vector<CrashPoint> CrashPointsOf(const std::string &record, const Files &start,
                                      const std::string &bitmapPath) {
    Disk disk;
    disk.bitmapPath = bitmapPath;
    for (const auto &[path, content] : start) {
        disk.names[path] = std::make_shared<DiskFile>(DiskFile{content, content});
    }
    disk.durableNames = disk.names;
    disk.driverBitmap = start.at(bitmapPath);

    std::vector<CrashPoint> points;
    std::set<std::tuple<bool, Files, std::string, int>> seen;
    std::istringstream words(record);
    size_t operations = 0;
    do {
        const int acknowledged = std::max(0, disk.received - 1);
        const std::pair<bool, Files> left[] = {
            {false, FilesOf(disk.names, Whole)},
            {true, FilesOf(disk.durableNames, Durable)},
            {true, FilesOf(disk.names, Durable)},
            {true, FilesOf(disk.names, Torn)},
        };
        for (const auto &[powerCut, files] : left) {
            if (seen.insert({powerCut, files, disk.driverBitmap, acknowledged}).second) {
                points.push_back({operations, powerCut, files, disk.driverBitmap, acknowledged});
            }
        }
        ++operations;
    } while (Step(words, &disk));
    return points;
}
} // namespace vesk
