#include "cachedev/open_states.h"

#include <utility>

namespace vesk {
uint64_t OpenStatesOpen(OpenStates &states, CacheDevice &device) {
    auto content = std::make_shared<const std::string>(states.make(device));
    const std::lock_guard<std::mutex> hold(states.mutex);
    states.lastBytes = content->size();
    const uint64_t handle = states.lastHandle + 1;
    states.contents.emplace(handle, std::move(content));
    states.lastHandle = handle;
    return handle;
}

StateContent OpenStatesContent(OpenStates &states, uint64_t handle) {
    const std::lock_guard<std::mutex> hold(states.mutex);
    return states.contents.at(handle);
}

void OpenStatesClose(OpenStates &states, uint64_t handle) {
    const std::lock_guard<std::mutex> hold(states.mutex);
    states.contents.erase(handle);
}

uint64_t OpenStatesBytes(OpenStates &states, CacheDevice &device) {
    {
        const std::lock_guard<std::mutex> hold(states.mutex);
        if (states.lastBytes > 0) {
            return states.lastBytes;
        }
    }
    return states.make(device).size();
}
} // namespace vesk
