// What the system of the walk is, held against the model.
#pragma once

#include "tests/faults/walk_pins.h"

namespace vesk {
// How records, bits and driver differ from the model; empty: they do not.
std::string WalkCompare(const Pins &pins);
} // namespace vesk
