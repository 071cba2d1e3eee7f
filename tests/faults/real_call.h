// For objects that are loaded before the C library: the call that they take the place of.
#pragma once

#include <cstdarg>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/types.h>

namespace vesk {
// The function of that (mangled) name that would have been called without this object.
template <typename Function> Function RealFunction(const char *name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}
#define REAL(name) (RealFunction<decltype(&(name))>(#name))

// The mode among the arguments of an open call, which is there where a file may be made.
inline mode_t ModeOf(int flags, va_list arguments) {
    return (flags & O_CREAT) != 0 ? static_cast<mode_t>(va_arg(arguments, int)) : 0;
}

// In the object that lets calls fail: whether this is the call that must; sets errno then.
bool FailsNow(const char *kind);
} // namespace vesk
