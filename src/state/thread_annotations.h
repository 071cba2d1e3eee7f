// What clang's thread-safety analysis needs to know: which lock a function takes, gives back or
// wants held, and which lock guards a field. A violation is a compile error there; other compilers
// see nothing of it.
#pragma once

#ifdef __clang__
#define THREAD_ANNOTATION(attribute) __attribute__((attribute))
#else
#define THREAD_ANNOTATION(attribute)
#endif

#define LOCK_KIND(name) THREAD_ANNOTATION(capability(name))
#define LOCK_SCOPE THREAD_ANNOTATION(scoped_lockable)
#define TAKES_LOCK(...) THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define GIVES_LOCK_BACK(...) THREAD_ANNOTATION(release_capability(__VA_ARGS__))
#define NEEDS_LOCK(lock) THREAD_ANNOTATION(requires_capability(lock))
#define NEEDS_NO_LOCK(lock) THREAD_ANNOTATION(locks_excluded(lock))
#define GUARDED_BY_LOCK(lock) THREAD_ANNOTATION(guarded_by(lock))
#define NOT_ANALYSED THREAD_ANNOTATION(no_thread_safety_analysis)
