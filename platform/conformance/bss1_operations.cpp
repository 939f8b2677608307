// What bss1.h promises: the environment and sleeping.

#include "platform/bss1.h"

#include <pthread.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <string>
#include <thread>

#include "conformance/rule.h"

namespace conformance {
namespace {

using std::chrono::milliseconds;
using Clock = std::chrono::steady_clock;

constexpr const char* kName = "ZAV_CONFORMANCE";

std::string valueOr(const char* fallback) {
    const char* const value = BSS1_GetEnv(kName, fallback);
    return value != nullptr ? value : "(null)";
}

void givesTheFallback(Bench&) {
    ::unsetenv(kName);
    requireEqual(valueOr("fallback"), "fallback", "the value");
    require(BSS1_GetEnv(kName, nullptr) == nullptr, "a null fallback does not come back");
}

void knowsAnEmptyVariable(Bench&) {
    ::setenv(kName, "", 1);
    requireEqual(valueOr("fallback"), "", "the value");
}

void seesTheProcessesEnvironment(Bench&) {
    ::setenv(kName, "one=1", 1);
    requireEqual(valueOr("fallback"), "one=1", "the value");
}

void copiesItsText(Bench&) {
    std::string setting = std::string(kName) + "=one=1";
    requireEqual(BSS1_PutEnv(setting.c_str()), 0, "the result");
    setting.assign(setting.size(), 'x');
    requireEqual(valueOr("fallback"), "one=1", "the value");
}

void replacesTheValueBefore(Bench&) {
    const std::string name(kName);
    requireEqual(BSS1_PutEnv((name + "=one").c_str()), 0, "the result");
    requireEqual(BSS1_PutEnv((name + "=").c_str()), 0, "the result");
    requireEqual(valueOr("fallback"), "", "the value");
    const char* const seenByOthers = ::getenv(kName);
    require(seenByOthers != nullptr, "the process's environment does not have the variable");
}

void refusesWhatIsNoSetting(Bench&) {
    const char* const nothing = nullptr;
    for (const char* const setting : {kName, "=value", "", nothing})
        requireEqual(BSS1_PutEnv(setting), EINVAL, "the result for " + shown(setting));
    require(BSS1_GetEnv(kName, nullptr) == nullptr, "set the variable all the same");
}

Clock::duration timeOfSleep(unsigned seconds) {
    const auto start = Clock::now();
    BSS1_Sleep(seconds);
    return Clock::now() - start;
}

void returnsAtOnceForNoSeconds(Bench&) {
    // One in three is not held up by other programs.
    const auto none = std::min({timeOfSleep(0), timeOfSleep(0), timeOfSleep(0)});
    require(none < timeOfSleep(1) / 2, "took more than half as long as a second");
}

void sleepsThroughSignals(Bench&) {
    struct sigaction ignore {};
    ignore.sa_handler = [](int) {};
    require(::sigaction(SIGUSR1, &ignore, nullptr) == 0, "sigaction failed");
    std::atomic<bool> done{false};
    Clock::duration slept{};
    std::thread sleeper([&] {
        slept = timeOfSleep(1);
        done = true;
    });
    while (!done) {
        ::pthread_kill(sleeper.native_handle(), SIGUSR1);
        std::this_thread::sleep_for(milliseconds(20));
    }
    sleeper.join();
    require(slept >= std::chrono::seconds(1), "a second was shorter");
}

void doesNotCutTheLongestSleep(Bench&) {
    std::atomic<bool> done{false};
    std::thread([&done] {
        BSS1_Sleep(0xFFFFFFFF);
        done = true;
    }).detach();
    std::this_thread::sleep_for(milliseconds(100));
    require(!done, "returned at once");
}

}  // namespace

std::vector<Operation> bss1Operations() {
    return {
        {"BSS1_GetEnv",
         {{"gives the fallback for a variable that is not set", givesTheFallback},
          {"takes an empty variable as set", knowsAnEmptyVariable},
          {"sees what the process has set", seesTheProcessesEnvironment}}},
        {"BSS1_PutEnv",
         {{"copies its text", copiesItsText},
          {"replaces the value before, for everybody", replacesTheValueBefore},
          {"refuses what is no setting", refusesWhatIsNoSetting}}},
        {"BSS1_Sleep",
         {{"returns at once for no seconds", returnsAtOnceForNoSeconds},
          {"sleeps to the end whatever signals arrive", sleepsThroughSignals},
          {"does not end the longest sleep at once", doesNotCutTheLongestSleep}}},
    };
}

}  // namespace conformance
