#include "act/interrupt.h"

#include "base/clock.h"

#include <csignal>
#include <gtest/gtest.h>
#include <thread>
#include <unistd.h>

namespace vesk {
namespace {
class InterruptTest : public testing::Test {
protected:
    void SetUp() override {
        sigaction(SIGINT, nullptr, &int_);
        sigaction(SIGTERM, nullptr, &term_);
        sigaction(SIGHUP, nullptr, &hangUp_);
        InterruptBegin();
    }
    void TearDown() override {
        InterruptBegin(); // forgets the signal that came
        sigaction(SIGINT, &int_, nullptr);
        sigaction(SIGTERM, &term_, nullptr);
        sigaction(SIGHUP, &hangUp_, nullptr);
    }
    struct sigaction int_ {};
    struct sigaction term_ {};
    struct sigaction hangUp_ {};
};
} // namespace

TEST_F(InterruptTest, WithoutASignalAPauseIsOne) {
    const int64_t began = NowMs();
    EXPECT_TRUE(InterruptPause(20));
    EXPECT_GE(NowMs() - began, 20);
    EXPECT_EQ(InterruptSignal(), 0);
}

TEST_F(InterruptTest, ASignalThatCameBeforeEndsThePause) {
    for (const int number : {SIGINT, SIGTERM, SIGHUP}) {
        InterruptBegin();
        raise(number);
        EXPECT_EQ(InterruptSignal(), number);
        EXPECT_FALSE(InterruptPause(1000000));
    }
}

TEST_F(InterruptTest, WhatIgnoresTheEndOfATerminalGoesOn) {
    signal(SIGHUP, SIG_IGN);
    InterruptBegin();
    raise(SIGHUP);
    EXPECT_EQ(InterruptSignal(), 0);
    EXPECT_TRUE(InterruptPause(1));
}

TEST_F(InterruptTest, ASignalEndsThePauseThatItComesIn) {
    std::thread sender([main = pthread_self()] {
        usleep(20000);
        pthread_kill(main, SIGTERM);
    });
    EXPECT_FALSE(InterruptPause(1000000));
    EXPECT_EQ(InterruptSignal(), SIGTERM);
    sender.join();
}

TEST_F(InterruptTest, AGraceKeepsASignalFromEndingPausesForSoLong) {
    InterruptGrace(100);
    raise(SIGINT);
    const int64_t began = NowMs();
    while (InterruptPause(10)) {
    }
    EXPECT_GE(NowMs() - began, 100);
    EXPECT_EQ(InterruptSignal(), SIGINT);
    InterruptBegin();
    InterruptGrace(1000000);
    raise(SIGINT);
    EXPECT_TRUE(InterruptPause(1));
    raise(SIGINT);
    EXPECT_FALSE(InterruptPause(1000000));
    InterruptBegin();
    InterruptGrace(1000000);
    raise(SIGINT);
    EXPECT_TRUE(InterruptPause(1));
    InterruptGrace(0);
    EXPECT_FALSE(InterruptPause(1000000));
}
} // namespace vesk
