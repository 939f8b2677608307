// ctest-label: threaded
#include "platform/bss1.h"

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <string>
#include <thread>

namespace {

constexpr const char* kName = "ZAV_BSS1_TEST";

class Environment : public testing::Test {
protected:
    ~Environment() override { ::unsetenv(kName); }
};

TEST_F(Environment, AnUnsetVariableGivesTheFallback) {
    EXPECT_STREQ("fallback", BSS1_GetEnv(kName, "fallback"));
    EXPECT_EQ(nullptr, BSS1_GetEnv(kName, nullptr));
}

TEST_F(Environment, AnEmptyVariableIsSet) {
    ASSERT_EQ(0, BSS1_PutEnv("ZAV_BSS1_TEST="));
    EXPECT_STREQ("", BSS1_GetEnv(kName, "fallback"));
}

TEST_F(Environment, ASettingIsCopiedAndReplacesTheOneBefore) {
    std::string setting = "ZAV_BSS1_TEST=one=1";
    ASSERT_EQ(0, BSS1_PutEnv(setting.c_str()));
    setting.assign(setting.size(), 'x');
    EXPECT_STREQ("one=1", BSS1_GetEnv(kName, nullptr));
    ASSERT_EQ(0, BSS1_PutEnv("ZAV_BSS1_TEST=two"));
    EXPECT_STREQ("two", BSS1_GetEnv(kName, nullptr));
}

TEST_F(Environment, WhatIsNoSettingIsRefused) {
    EXPECT_EQ(EINVAL, BSS1_PutEnv("ZAV_BSS1_TEST"));
    EXPECT_EQ(EINVAL, BSS1_PutEnv("=value"));
    EXPECT_EQ(EINVAL, BSS1_PutEnv(""));
    EXPECT_EQ(EINVAL, BSS1_PutEnv(nullptr));
    EXPECT_EQ(nullptr, BSS1_GetEnv(kName, nullptr));
}

/// The library's own operation, even if the program brings one that does not sleep.
using Sleeper = void (*)(unsigned);
Sleeper librarysSleep() {
    void* const library = ::dlopen("libzavplatform.so.1", RTLD_NOW | RTLD_NOLOAD);
    void* const found = library != nullptr ? ::dlsym(library, "BSS1_Sleep") : nullptr;
    return reinterpret_cast<Sleeper>(found);
}

TEST(Sleep, NoSecondsReturnAtOnce) {
    ASSERT_NE(nullptr, librarysSleep());
    const auto start = std::chrono::steady_clock::now();
    librarysSleep()(0);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(500));
}

TEST(Sleep, SignalsDoNotShortenIt) {
    ASSERT_NE(nullptr, librarysSleep());
    struct sigaction ignore {};
    ignore.sa_handler = [](int) {};
    struct sigaction before {};
    ASSERT_EQ(0, ::sigaction(SIGUSR1, &ignore, &before));
    const auto start = std::chrono::steady_clock::now();
    std::atomic<bool> done{false};
    std::thread sleeper([&] {
        librarysSleep()(1);
        done = true;
    });
    while (!done) {
        ::pthread_kill(sleeper.native_handle(), SIGUSR1);
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    sleeper.join();
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::seconds(1));
    ::sigaction(SIGUSR1, &before, nullptr);
}

TEST(Sleep, TheLongestSleepDoesNotEndAtOnce) {
    ASSERT_NE(nullptr, librarysSleep());
    const pid_t sleeper = ::fork();
    if (sleeper == 0) {
        librarysSleep()(0xFFFFFFFF);
        ::_exit(0);
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_EQ(0, ::waitpid(sleeper, nullptr, WNOHANG));
    ::kill(sleeper, SIGKILL);
    EXPECT_EQ(sleeper, ::waitpid(sleeper, nullptr, 0));
}

}  // namespace
