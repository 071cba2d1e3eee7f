// The worker: takes one request at a time from the configuration file, has it carried out and
// records the outcome. Thread rule: runs on a thread of its own; takes the service lock only inside
// the configuration operations, never while a request is carried out.
#pragma once

#include "request/request_record.h"
#include "warming/work_result.h"

#include <string>

namespace vesk {
// The thread's start routine; `options` is the ToolParameters record, of which the configuration
// path is used. Ends the thread when the next request cannot be chosen.
void *DoRequests(void *options);

// Carries out a taken request: Done and recorded (or left in the file when recording failed),
// Failed and dropped, Interrupted and left in the queue.
WorkResult HandleRequestAndModifyConfig(const char *configPath, RequestRecord *record,
                                        const std::string &num);
} // namespace vesk
