// Included in front of commands/modify_bitmap.cpp when the test program compiles it once more:
// there the change of a range fails, and its functions have other names for the linker. Their names
// in the source, which messages carry, stay.
#pragma once

#include <cstdint>

// For the analysis they would only stand twice.
#ifndef __clang_analyzer__
namespace vesk {
struct PinBitmap;

int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors,
                 int op) __asm__("ModifyBitmapRefused");
int SetBitmap(const char *mountPath, uint64_t startSector,
              uint64_t numSectors) __asm__("SetBitmapRefused");
int UnsetBitmap(const char *mountPath, uint64_t startSector,
                uint64_t numSectors) __asm__("UnsetBitmapRefused");
int BitmapOperation(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors,
                    int op) __asm__("RefuseBitmapOperation");
} // namespace vesk
#endif
