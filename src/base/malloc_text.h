// Text that came from malloc (lookups and the platform's libraries return such text), freed when
// its scope ends. Null stands for "not found".
#ifndef BASE_MALLOC_TEXT_H
#define BASE_MALLOC_TEXT_H

#include "base/deleter.h"

#include <cstdlib>
#include <memory>

using FreeDeleter = Deleter<std::free>;

using MallocText = std::unique_ptr<char, FreeDeleter>;

#endif
