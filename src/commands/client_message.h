// The message of a client command to the pin service.
// Thread rule: no state.
#ifndef COMMANDS_CLIENT_MESSAGE_H
#define COMMANDS_CLIENT_MESSAGE_H

#include "request/message.h"

#include <cstring>

// Copies text into a field of the message; a text that fills the field has no NUL there.
template <size_t size> void CopyToField(char (&field)[size], const char *text) {
    memcpy(field, text, strnlen(text, size));
}

// A message of this type for the volume, without data.
RequestMessage BuildMessage(int requestType, const char *mountPath);

#endif
