// Ending the service: SIGINT, SIGTERM and SIGQUIT end the process at once with status 0, whatever
// the worker is doing. Only the message that the receiver has in hand is stored first.
//
// The three signals are blocked in every thread and taken by a thread that does nothing else, so
// that the end never starts inside another thread's malloc or printf. No destructor runs, buffered
// standard output is written, and half a second later the process ends even if the message cannot
// be stored or that output finds no reader.
#pragma once

namespace vesk {
// Installs the handler and blocks the signals; to be called before any other thread is started,
// which inherits that. 0, or -1 after an error message; then handlers already installed stay.
int SetSignalHandler();

// Starts the thread that waits for the signals; to be called when the service's own threads run,
// which need the room for a thread more. Where there is none for this one, the handler runs on the
// calling thread, wherever that is: nobody is waited for then.
void StartSignalThread();

// Ends the process.
[[noreturn]] void SignalHandler(int signalNumber);

// The thread that waits for the signals must not keep a process alive that has nothing left to do:
// each of the service's own threads says when it ends, and with the last of them the process ends
// with status 0, as it would without that thread. To be set before they are started. Returns but
// where the calling thread is the only one that takes the signals.
void SetServiceThreads(int count);
void ServiceThreadEnds();
} // namespace vesk
