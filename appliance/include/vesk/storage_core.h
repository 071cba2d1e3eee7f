// The appliance's storage-core library (libveskstoragecore.so): the mounted storage spaces and
// where a file's data lies on a space's block device.
//
// The tool is compiled against these declarations only. On the appliance the vendor's library
// answers them; on an ordinary Linux machine the stand-in in appliance/storage_core/ does. Layouts,
// names and the order of virtual functions are a binary interface: changing one breaks the other
// library.
//
// Thread rule: no function keeps state that a caller could see; calls from several threads are
// independent as long as each uses its own list, device and table.
#ifndef VESK_STORAGE_CORE_H
#define VESK_STORAGE_CORE_H

#include <cstdint>
#include <string>
#include <vector>

// One storage space (a mounted volume); a singly linked list.
struct VESKSpaceInfo {
    char devicePath[128];    // block device path, NUL-terminated
    char referencePath[512]; // mount path, NUL-terminated; empty: missing
    VESKSpaceInfo *next;     // null ends the list
};

extern "C" {

// Lists the spaces. `scope` is always 1. Negative: failure (the list may still be set).
// The list is released with VESKSpaceInfoFree.
int VESKSpaceInfoEnum(int scope, VESKSpaceInfo **list);
void VESKSpaceInfoFree(VESKSpaceInfo *list);

// The space's UUID, malloc'd for the caller, or null.
char *VESKSpaceUUIDGet(const VESKSpaceInfo *space);
}

// One extent of a file. Sectors are 512 bytes. 32 bytes on every platform: the explicit alignment
// keeps the tail padding on 32-bit targets whose 64-bit integers are aligned to 4 bytes.
struct FileMappingEntry {
    alignas(8) uint64_t fileStartSector; // sectors, from the start of the file
    uint64_t numSectors;                 // sectors
    uint64_t deviceStartSector;          // sectors, from the start of the block device
    uint32_t flag;                       // 1: allocated but not yet written
};
static_assert(sizeof(FileMappingEntry) == 32, "an extent is 32 bytes on every platform");

// The extents of one file, in file order.
class FileMappingTable {
public:
    ~FileMappingTable();
    std::vector<FileMappingEntry> entries;
};

// A block device that holds a file system.
// Virtual table: complete destructor, deleting destructor, Reserved, GetMappingByInode.
class FileSystemDevice {
public:
    virtual ~FileSystemDevice();
    virtual int Reserved();
    // Fills `table` with the extents of the file with this inode number in `directory`.
    // Negative: failure. An empty table: nothing of the file has a place on the device yet.
    virtual int GetMappingByInode(const std::string &directory, uint64_t inode,
                                  FileMappingTable &table) = 0;
    // The block device path of the file system that holds `filePath`: 0 found, 1 none, -1 failure.
    // `reserved` is always false.
    static int GetDevicePath(const std::string &filePath, std::string &devicePath, bool reserved);
};

class FileSystemDeviceCreater {
public:
    // A device object, deleted by the caller, or null where the device cannot be used.
    static FileSystemDevice *Create(const std::string &devicePath);
};

#endif
