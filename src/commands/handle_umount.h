// What happens to a volume's pins when it is unmounted.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

// Changes nothing; always 0.
int HandleSpaceUmount(const char *mountPath);

} // namespace vesk
