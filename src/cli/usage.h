// The usage text. Thread rule: writes to standard output; no state.
#ifndef CLI_USAGE_H
#define CLI_USAGE_H

// Prints the usage text, with ProgramName in its example lines, to standard output.
void Usage();

#endif
