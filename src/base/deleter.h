// Lets a std::unique_ptr give its object back with a function of the C kind:
// std::unique_ptr<DIR, Deleter<closedir>>.
#ifndef BASE_DELETER_H
#define BASE_DELETER_H

#include <memory>

template <auto release> struct Deleter {
    template <typename Object> void operator()(Object *object) const { release(object); }
};

#endif
