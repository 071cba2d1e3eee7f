// Bringing the receiver to rest before the process ends in order: the message that it has in hand
// is off the queue and nowhere else, so it is stored first, and no other is taken. Thread rule: the
// receiver's thread calls the first three, the thread that ends the process the last.
#pragma once

namespace vesk {
// Before each message, and before the queue and its key file are looked for, which may make them:
// from here on the receiver may have one in hand. Once it is called to rest this does not return.
void ReceiverTakesNext();

// Whether a wait for messages that was interrupted was so by the call to rest.
bool ReceiverIsCalledToRest();

// The receiver takes no more messages.
void ReceiverHasEnded();

// Calls the receiver to rest, interrupting its wait for messages, and waits until it rests, has
// ended or has not begun; at most for a third of a second, as whatever holds it up (a disk, a
// reader of its output) may do so for good.
void ReceiverAwaitRest();
} // namespace vesk
