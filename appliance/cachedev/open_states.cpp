#include "cachedev/open_states.h"

#include "cachedev/state_json.h"

#include <unistd.h>
#include <utility>

namespace vesk {
uint64_t OpenStatesOpen(OpenStates &states, CacheDevice &device) {
    auto text =
        std::make_shared<const std::string>(StateJsonText(CacheDeviceSnapshot(device), getpid()));
    const std::lock_guard<std::mutex> hold(states.mutex);
    states.lastBytes = text->size();
    const uint64_t handle = states.lastHandle + 1;
    states.texts.emplace(handle, std::move(text));
    states.lastHandle = handle;
    return handle;
}

StateText OpenStatesText(OpenStates &states, uint64_t handle) {
    const std::lock_guard<std::mutex> hold(states.mutex);
    return states.texts.at(handle);
}

void OpenStatesClose(OpenStates &states, uint64_t handle) {
    const std::lock_guard<std::mutex> hold(states.mutex);
    states.texts.erase(handle);
}

uint64_t OpenStatesBytes(OpenStates &states, CacheDevice &device) {
    {
        const std::lock_guard<std::mutex> hold(states.mutex);
        if (states.lastBytes > 0) {
            return states.lastBytes;
        }
    }
    return StateJsonText(CacheDeviceSnapshot(device), getpid()).size();
}
} // namespace vesk
