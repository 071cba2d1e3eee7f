// Text that came from malloc (lookups and the platform's libraries return such text), freed when
// its scope ends. Null stands for "not found".
#ifndef BASE_MALLOC_TEXT_H
#define BASE_MALLOC_TEXT_H

#include <cstdlib>
#include <memory>

struct FreeDeleter {
    void operator()(void *memory) const { std::free(memory); }
};

using MallocText = std::unique_ptr<char, FreeDeleter>;

#endif
