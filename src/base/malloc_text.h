// Text that came from malloc (lookups and the platform's libraries return such text), freed when
// its scope ends. Null stands for "not found".
#pragma once

#include "base/deleter.h"

#include <cstdlib>
#include <memory>

namespace vesk {
using FreeDeleter = Deleter<std::free>;

using MallocText = std::unique_ptr<char, FreeDeleter>;
} // namespace vesk
