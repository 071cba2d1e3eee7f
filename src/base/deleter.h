// Lets a std::unique_ptr give its object back with a function of the C kind:
// std::unique_ptr<DIR, Deleter<closedir>>.
#pragma once

#include <memory>

namespace vesk {
template <auto release> struct Deleter {
    template <typename Object> void operator()(Object *object) const { release(object); }
};
} // namespace vesk
