#include "base/deleter.h"

#include "base/malloc_text.h"

#include <gtest/gtest.h>

#include <cstring>

namespace vesk {
namespace {
int released = 0;

void Release(int *object) {
    ++released;
    *object = 0;
}
} // namespace

TEST(DeleterTest, GivesBackOnce) {
    int object = 7;
    released = 0;
    { const std::unique_ptr<int, Deleter<Release>> owner(&object); }
    EXPECT_EQ(released, 1);
    EXPECT_EQ(object, 0);
    { const std::unique_ptr<int, Deleter<Release>> owner; }
    EXPECT_EQ(released, 1) << "nothing to give back";
}

TEST(DeleterTest, CostsNoMemory) {
    EXPECT_EQ(sizeof(MallocText), sizeof(char *));
    const MallocText text(strdup("freed; the address sanitizer tells otherwise"));
    EXPECT_NE(text, nullptr);
}
} // namespace vesk
