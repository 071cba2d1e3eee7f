// Holds every message that a test makes the tool log to the list of all (message_list.inc): its
// text, its class and the function that it names. Of these only the text can be seen at level 1,
// where an error and a notice look alike.
//
// LeakCheckedTest has it done for all its tests.
#pragma once

namespace vesk {
// From here on each message is looked up and then written as without this. One that is not in the
// list fails the test; in a process that the test has forked it ends that by SIGABRT.
void CheckMessages();

// Back to messages that are only written.
void CheckNoMessages();
} // namespace vesk
