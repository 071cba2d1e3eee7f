// What the parts of the object that lets calls fail share.
#ifndef TESTS_FAULTS_FAIL_CALL_H
#define TESTS_FAULTS_FAIL_CALL_H

#include <dlfcn.h>

// Whether this is the call that must fail; sets errno then.
bool FailsNow(const char *kind);

// The function of that (mangled) name that would have been called without this object.
template <typename Function> Function RealFunction(const char *name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}
#define REAL(name) (RealFunction<decltype(&(name))>(#name))

#endif
