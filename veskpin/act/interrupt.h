// SIGINT, SIGTERM and SIGHUP while pins are changed: they are noted, and whoever waits comes back,
// so that a command ends by itself and tells what it has done.
//
// Thread rule: one thread waits; the signals may come at any time.
#pragma once

namespace vesk {
// From here on they are noted, SIGHUP unless it is ignored, as by nohup; and output that nobody
// takes is an error of the one who writes it.
void InterruptBegin();

// The last that came, or 0.
int InterruptSignal();

// For what is not to be left half done: a signal ends pauses only so many milliseconds after this
// call, or after it came where that is later, and a second one at once. 0: at once.
void InterruptGrace(unsigned milliseconds);

// Sleeps for so long, or until one comes. False: one has come, and its grace is over.
bool InterruptPause(unsigned milliseconds);
} // namespace vesk
