#include "service/put_off.h"

namespace vesk {
bool PutOffNote(PutOffRequests *putOff, const std::string &number, const std::string &mountPath) {
    if (++putOff->tries[number] >= kPutOffTries) {
        putOff->tries.erase(number);
        return false;
    }
    putOff->volumes.insert(mountPath);
    return true;
}

bool PutOffPasses(const PutOffRequests &putOff, const std::string &mountPath) {
    return putOff.volumes.count(mountPath) > 0;
}

void PutOffEnd(PutOffRequests *putOff) {
    putOff->volumes.clear();
}

void PutOffForget(PutOffRequests *putOff, const std::string &number) {
    putOff->tries.erase(number);
    PutOffEnd(putOff);
}
} // namespace vesk
