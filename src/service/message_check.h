// The receiver's check of a request before it is stored. Thread rule: no state.
#pragma once

#include "request/message.h"

namespace vesk {

// 0, or -1 after an error message when the mount path is empty, or the files are in a pin or unpin
// request.
int CheckNormalMsg(const RequestMessage *message);

} // namespace vesk
