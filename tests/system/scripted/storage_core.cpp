// The storage-core library as a test scripts it.
#include "vesk/storage_core.h"

#include "base/deleter.h"
#include "tests/system/scripted/script.h"

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <memory>

using namespace vesk;

namespace {
std::atomic<unsigned> lookups{0}; // calls of GetMappingByInode so far, in this process

void FreeList(VESKSpaceInfo *list) {
    while (list != nullptr) {
        const std::unique_ptr<VESKSpaceInfo> first(list);
        list = first->next;
    }
}
using List = std::unique_ptr<VESKSpaceInfo, Deleter<FreeList>>;

List MakeList(const std::vector<ScriptLine> &spaces) {
    List list;
    for (auto space = spaces.rbegin(); space != spaces.rend(); ++space) {
        List info(new VESKSpaceInfo{});
        ScriptText(*space, 0).copy(info->devicePath, sizeof(info->devicePath) - 1);
        ScriptText(*space, 1).copy(info->referencePath, sizeof(info->referencePath) - 1);
        info->next = list.release();
        list = std::move(info);
    }
    return list;
}

FileMappingEntry ParseExtent(const std::string &text) {
    FileMappingEntry entry{};
    char *rest = nullptr;
    entry.fileStartSector = strtoull(text.c_str(), &rest, 10);
    entry.numSectors = strtoull(rest + 1, &rest, 10);
    entry.deviceStartSector = strtoull(rest + 1, &rest, 10);
    entry.flag = static_cast<uint32_t>(strtoul(rest + 1, &rest, 10));
    return entry;
}

class ScriptedDevice final : public FileSystemDevice {
public:
    ~ScriptedDevice() override { ScriptCall("destroy"); }
    int GetMappingByInode(const std::string &directory, uint64_t inode,
                          FileMappingTable &table) override {
        ScriptCall("mapping " + directory + " " + std::to_string(inode));
        table.entries.clear();
        const std::vector<ScriptLine> answers = ScriptLines("mapping");
        if (answers.empty()) {
            return -1;
        }
        const size_t call = lookups.fetch_add(1);
        const ScriptLine &answer = answers[call < answers.size() ? call : answers.size() - 1];
        for (size_t i = 1; i < answer.size(); ++i) {
            table.entries.push_back(ParseExtent(answer[i]));
        }
        return ScriptNumber(answer, 0, -1);
    }
};
} // namespace

extern "C" int VESKSpaceInfoEnum(int scope, VESKSpaceInfo **list) {
    ScriptCall("enum " + std::to_string(scope));
    *list = MakeList(ScriptLines("space")).release();
    return ScriptNumber(ScriptFirst("enum"), 0, 0);
}

extern "C" void VESKSpaceInfoFree(VESKSpaceInfo *list) {
    ScriptCall("enum-free");
    FreeList(list);
}

extern "C" char *VESKSpaceUUIDGet(const VESKSpaceInfo *space) {
    for (const ScriptLine &line : ScriptLines("space")) {
        if (ScriptText(line, 0) == space->devicePath) {
            const std::string uuid = ScriptText(line, 2);
            return uuid.empty() ? nullptr : strdup(uuid.c_str());
        }
    }
    return nullptr;
}

FileMappingTable::~FileMappingTable() = default;

FileSystemDevice::~FileSystemDevice() = default;

int FileSystemDevice::Reserved() {
    return 0;
}

int FileSystemDevice::GetDevicePath(const std::string &filePath, std::string &devicePath,
                                    bool reserved) {
    ScriptCall("device " + filePath + (reserved ? " true" : " false"));
    const ScriptLine answer = ScriptFirst("device");
    devicePath = ScriptText(answer, 1);
    return ScriptNumber(answer, 0, -1);
}

FileSystemDevice *FileSystemDeviceCreater::Create(const std::string &devicePath) {
    ScriptCall("create " + devicePath);
    return ScriptNumber(ScriptFirst("create"), 0, 1) == 0 ? nullptr : new ScriptedDevice;
}
