// Acting for another user than root: for the length of a scope root's power over files is away.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

namespace vesk {
class OrdinaryUser {
public:
    OrdinaryUser() {
        if (getuid() == 0) {
            EXPECT_EQ(seteuid(65534), 0);
        }
    }
    ~OrdinaryUser() {
        if (getuid() == 0) {
            EXPECT_EQ(seteuid(0), 0);
        }
    }
    OrdinaryUser(const OrdinaryUser &) = delete;
    OrdinaryUser &operator=(const OrdinaryUser &) = delete;
};

#define SKIP_WITHOUT_ROOT()                                                                        \
    if (geteuid() != 0) {                                                                          \
        GTEST_SKIP() << "acting for another user needs root";                                      \
    }                                                                                              \
    static_assert(true, "a semicolon follows")
} // namespace vesk
