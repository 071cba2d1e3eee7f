// What becomes of a request and of the warming that it asks for.
#pragma once

namespace vesk {
enum class WorkResult : int {
    Done = 0,
    Failed = 1,      // after an error message
    Interrupted = 2, // the volume became pending while its data was read
};
} // namespace vesk
