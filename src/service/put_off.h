// Requests that could not be carried out for want of memory, and are tried again.
//
// Until another volume's request has been carried out, or none is left that could be, all requests
// of such a request's volume are passed over: the others get their turn, and no request overtakes
// an older one of its volume. After ten tries a request is given up.
//
// Thread rule: the worker's alone. Kept in memory only: a restart counts anew.
#pragma once

#include <map>
#include <set>
#include <string>

namespace vesk {
const int kPutOffTries = 10;

struct PutOffRequests {
    std::map<std::string, int> tries; // by request number: how often it has failed so far
    std::set<std::string> volumes;    // mount paths whose requests are passed over
};

// The request has failed for want of memory. Whether it may be tried again; where not, nothing of
// it is kept.
bool PutOffNote(PutOffRequests *putOff, const std::string &number, const std::string &mountPath);

// Whether the volume's requests are to be passed over.
bool PutOffPasses(const PutOffRequests &putOff, const std::string &mountPath);

// From now on no volume's requests are passed over.
void PutOffEnd(PutOffRequests *putOff);

// The request has been carried out or dropped: there may be memory again for the others.
void PutOffForget(PutOffRequests *putOff, const std::string &number);
} // namespace vesk
