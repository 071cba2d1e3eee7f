// Access to the memory of the process that sent a request, and the pointer record it passes.
//
// A driver inside the kernel reads its caller's memory directly; this one does it with
// process_vm_readv and process_vm_writev, which need the right to trace the caller (a root daemon
// has it) and a caller that is visible in the daemon's PID namespace. Thread-safe, no state. The
// caller may die or unmap its memory at any time: that is an error result, nothing else.
#pragma once

#include <cstddef>
#include <cstdint>
#include <sys/types.h>

namespace vesk {
// Who sent a request.
struct Caller {
    pid_t pid;    // process or thread id; 0: not visible from here
    bool is32bit; // its pointers have 4 bytes
};

// What the bitmap descriptor says.
struct BitmapDescriptor {
    uint64_t address; // of the first bitmap byte in the caller's memory
    uint32_t length;  // in bytes
};

constexpr size_t kDescriptorBytes32 = 8;  // {u32 address, u32 length}
constexpr size_t kDescriptorBytes64 = 16; // {u64 address, u32 length, 4 bytes of padding}

// Copies `size` bytes from `address` in the caller's memory into `buffer`. 0, or -EFAULT when not
// all of them can be had (the content of `buffer` is then undefined), or -EOVERFLOW when the
// caller's pointers are wider than this process's.
int CallerRead(const Caller &caller, uint64_t address, void *buffer, size_t size);

// Copies `size` bytes from `buffer` to `address` in the caller's memory. 0, or -EFAULT when not all
// of them could be written, or -EOVERFLOW as above.
int CallerWrite(const Caller &caller, uint64_t address, const void *buffer, size_t size);

// Size in bytes of the descriptor that a caller passes.
size_t DescriptorBytes(bool is32bit);

// Decodes a descriptor of DescriptorBytes(is32bit) bytes; the padding is ignored.
BitmapDescriptor DescriptorDecode(const unsigned char *bytes, bool is32bit);
} // namespace vesk
