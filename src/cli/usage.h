// The usage text. Thread rule: writes to standard output; no state.
#pragma once

namespace vesk {

// Prints the usage text, with ProgramName in its example lines, to standard output.
void Usage();

} // namespace vesk
