// Takes root's power over file modes away for the length of a scope.
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
} // namespace vesk
