#include "tests/unit/cli/fake_commands.h"

#include "base/log.h"
#include "commands/commands.h"
#include "request/tool_parameters.h"
#include "service/start_service.h"

#include <cstdio>

namespace vesk {
int FakeCommands::result = 0;
std::function<void()> FakeCommands::onOperation;
uint64_t FakeCommands::bitmapSize = 0;

namespace {
int Answer(const char *operation, const char *first, const char *second = nullptr) {
    printf("[%s %s", operation, first == nullptr ? "-" : first);
    printf(second == nullptr ? "]\n" : " %s]\n", second);
    if (FakeCommands::onOperation) {
        FakeCommands::onOperation();
    }
    return FakeCommands::result;
}

int AnswerRange(const char *operation, const char *mountPath, uint64_t start, uint64_t count) {
    printf("[%s %s %llu %llu]\n", operation, mountPath, LogU64(start), LogU64(count));
    return FakeCommands::result;
}
} // namespace

int PinFilesRequest(const ToolParameters *parameters) {
    return Answer("PinFilesRequest", parameters->mountPath, parameters->files);
}
int UnpinFilesRequest(const ToolParameters *parameters) {
    return Answer("UnpinFilesRequest", parameters->mountPath, parameters->files);
}
int ReloadPinBlocksRequest(const ToolParameters *parameters) {
    return Answer("ReloadPinBlocksRequest", parameters->mountPath);
}
int AddPendingSpaceRequest(const char *mountPath) {
    return Answer("AddPendingSpaceRequest", mountPath);
}
int RemovePendingSpaceRequest(const char *mountPath) {
    return Answer("RemovePendingSpaceRequest", mountPath);
}
int StartService(const ToolParameters *parameters) {
    return Answer("StartService", parameters->configPath);
}
int HandleSpaceMount(const char *configPath, const char *mountPath) {
    return Answer("HandleSpaceMount", configPath, mountPath);
}
int HandleSpaceUmount(const char *mountPath) {
    return Answer("HandleSpaceUmount", mountPath);
}
int DeleteBitmap(const char *mountPath) {
    return Answer("DeleteBitmap", mountPath);
}
int CheckBitmapSet(const char *mountPath) {
    return Answer("CheckBitmapSet", mountPath);
}
int SendBitmap(const char *mountPath) {
    return Answer("SendBitmap", mountPath);
}
PinCheck CheckFileIsPin(const char *configPath, const char *filePath) {
    return static_cast<PinCheck>(Answer("CheckFileIsPin", configPath, filePath));
}
int UnpinAllBlocks(const ToolParameters *parameters) {
    return Answer("UnpinAllBlocks", parameters->mountPath);
}
int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    return AnswerRange("SetBitmap", mountPath, startSector, numSectors);
}
int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    return AnswerRange("UnsetBitmap", mountPath, startSector, numSectors);
}
int GetBitmapSizeByte(const char *mountPath, uint64_t *size) {
    *size = FakeCommands::bitmapSize;
    return Answer("GetBitmapSizeByte", mountPath);
}
} // namespace vesk
