// The functions of the appliance's libraries, which fail as one kind, "library": each in the way
// that its declaration says.
#include "tests/faults/real_call.h"

#include "vesk/flash_cache.h"
#include "vesk/storage_core.h"

using namespace vesk;

namespace {
const char kKind[] = "library";

using DevicePathFunction = int (*)(const std::string &, std::string &, bool);
using CreateFunction = FileSystemDevice *(*)(const std::string &);
#define TEXT_REFERENCE "RKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE"
} // namespace

extern "C" {

int VESKSpaceInfoEnum(int scope, VESKSpaceInfo **list) {
    static const auto real = REAL(VESKSpaceInfoEnum);
    return FailsNow(kKind) ? -1 : real(scope, list);
}
char *VESKSpaceUUIDGet(const VESKSpaceInfo *space) {
    static const auto real = REAL(VESKSpaceUUIDGet);
    return FailsNow(kKind) ? nullptr : real(space);
}
int VESKFlashCacheConfigTmpGet(const VESKFlashCacheConfigQuery *query,
                               VESKFlashCacheConfig **config) {
    static const auto real = REAL(VESKFlashCacheConfigTmpGet);
    return FailsNow(kKind) ? -1 : real(query, config);
}
int VESKFlashCacheStatGet(const VESKFlashCacheStatQuery *query, VESKFlashCacheStat **stat) {
    static const auto real = REAL(VESKFlashCacheStatGet);
    return FailsNow(kKind) ? -1 : real(query, stat);
}
int VESKFlashcacheGetCachePath(const char *ssdPath, char *buffer, size_t size) {
    static const auto real = REAL(VESKFlashcacheGetCachePath);
    return FailsNow(kKind) ? -1 : real(ssdPath, buffer, size);
}

} // extern "C"

int FileSystemDevice::GetDevicePath(const std::string &filePath, std::string &devicePath,
                                    bool reserved) {
    static const auto real = RealFunction<DevicePathFunction>(
        "_ZN16FileSystemDevice13GetDevicePathE" TEXT_REFERENCE "RS5_b");
    return FailsNow(kKind) ? -1 : real(filePath, devicePath, reserved);
}

FileSystemDevice *FileSystemDeviceCreater::Create(const std::string &devicePath) {
    static const auto real =
        RealFunction<CreateFunction>("_ZN23FileSystemDeviceCreater6CreateE" TEXT_REFERENCE);
    return FailsNow(kKind) ? nullptr : real(devicePath);
}
