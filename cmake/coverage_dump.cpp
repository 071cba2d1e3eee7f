// Linked into the program in coverage builds only: the service ends without running destructors,
// which would write the counters.
#include <cstdlib>

extern "C" void __gcov_dump(void);

namespace {
[[maybe_unused]] const int registered = std::at_quick_exit(__gcov_dump);
} // namespace
