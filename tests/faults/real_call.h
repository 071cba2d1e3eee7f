// For objects that are loaded before the C library: the call that they take the place of.
#ifndef TESTS_FAULTS_REAL_CALL_H
#define TESTS_FAULTS_REAL_CALL_H

#include <dlfcn.h>

// The function of that (mangled) name that would have been called without this object.
template <typename Function> Function RealFunction(const char *name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}
#define REAL(name) (RealFunction<decltype(&(name))>(#name))

#endif
