#include "space/file_extents.h"

#include "base/log.h"
#include "space/fault_injection.h"

#include <cstdio>
#include <libgen.h>
#include <memory>
#include <unistd.h>

namespace vesk {
namespace {
const int kLookupTries = 10;
const uint32_t kFlagUninitialized = 1;

std::string DirectoryOf(const std::string &filePath) {
    char path[512 + 1];
    snprintf(path, sizeof(path), "%s", filePath.c_str());
    return dirname(path);
}
} // namespace

FileSystemDevice *CreateFileSystemDeviceByFilePath(const std::string &path) {
    std::string devicePath;
    const int result = FileSystemDevice::GetDevicePath(path, devicePath, false);
    if (result == -1) {
        LogError("Get device path of file fail. File path = \"%s\"", path.c_str());
        return nullptr;
    }
    if (result == 1) {
        LogError("Device path of file not found. File path = \"%s\"", path.c_str());
        return nullptr;
    }
    FileSystemDevice *device = FileSystemDeviceCreater::Create(devicePath);
    if (device == nullptr) {
        LogError("Create file system device \"%s\" fail.", devicePath.c_str());
    }
    return device;
}

int FileExtentsAsk(FileSystemDevice &device, const std::string &filePath, uint64_t inode,
                   FileMappingTable *table) {
    const std::string directory = filePath.substr(0, filePath.rfind('/'));
    return device.GetMappingByInode(directory, inode, *table) < 0 ? -1 : 0;
}

int GetMappingTableFromFile(FileMappingTable *table, const char *mountPath,
                            const std::string &filePath, uint32_t inode) {
    LogVerbose("Start for file (%s), inode = %lu", filePath.c_str(),
               static_cast<unsigned long>(inode));
    const std::unique_ptr<FileSystemDevice> device(
        CreateFileSystemDeviceByFilePath(std::string(mountPath)));
    if (!device) {
        LogError("Create file system device fail. Path:%s", filePath.c_str());
        return -1;
    }
    const std::string directory = DirectoryOf(filePath);
    bool failed = false;
    bool synced = false;
    for (int tries = 0; tries < kLookupTries; ++tries) {
        int result = device->GetMappingByInode(directory, inode, *table);
        if (FileSimulateGetMappingFailed(filePath) == 1) {
            LogError("Simulate %s get mapping failed", filePath.c_str());
            result = -1;
        }
        if (result < 0) {
            LogError("Get mapping result fail.");
            failed = true;
            break;
        }
        if (!table->entries.empty()) {
            break;
        }
        if (!synced) {
            sync();
            synced = true;
        }
        LogVerbose("Retry to get mapping of file (%s) Ret = %d size = %zd", filePath.c_str(),
                   result, static_cast<ssize_t>(table->entries.size()));
        sleep(1);
    }
    if (table->entries.size() == 1 && table->entries[0].flag == kFlagUninitialized) {
        LogNotice("Only get 1 unitilized entry from file (%s)", filePath.c_str());
    }
    if (failed) {
        return -1;
    }
    if (table->entries.empty()) {
        LogError("Get mapping of file (%s) timeout (%d seconds)", filePath.c_str(), kLookupTries);
        return -1;
    }
    LogVerbose("Entry number = %zu", table->entries.size());
    return 0;
}
} // namespace vesk
