// ctest-label: threaded
// String: which locale it opens, when, and that the first conversions of several threads agree.
//
// This program puts its own locale functions in front of the platform's. A case that needs a
// process without a locale runs in a new one.

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <atomic>
#include <mutex>
#include <thread>

#include "platform/nls2.h"
#include "support/trace_capture.h"
#include "support/units.h"

using ZAV::String;

namespace {

/// What the fake does next and what it was asked.
struct FakeNls {
    std::mutex mutex;
    std::vector<std::string> calls;
    int defaultCodepage = NLS2_CP_UTF8;  // 0: there is no locale
    std::atomic<int> opened{0};
    std::atomic<int> released{0};
    std::atomic<unsigned> writtenAtMost{0xFFFFFFFFu};

    void note(const std::string& call) {
        const std::lock_guard<std::mutex> lock(mutex);
        calls.push_back(call);
    }
};

FakeNls& fake() {
    static FakeNls& instance = *new FakeNls;
    return instance;
}

template <typename Function>
Function* real(Function*, const char* name) {
    return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

using Calls = std::vector<std::string>;

Calls takeCalls() {
    return std::exchange(fake().calls, {});
}

}  // namespace

NLS2_LOCALE* NLS2_GetLocale(int selector, int codepage, int flags, int* status) {
    fake().note("GetLocale(" + std::to_string(selector) + ", " + std::to_string(codepage) + ", " +
                std::to_string(flags) + ")");
    const bool byDefault = selector == NLS2_BY_DEFAULT;
    if (byDefault && fake().defaultCodepage == 0) {
        *status = NLS2_NO_LOCALE;
        return nullptr;
    }
    ++fake().opened;
    // Long enough for other threads to come here too, if anything lets them.
    for (int turn = 0; turn < 1000; ++turn)
        std::this_thread::yield();
    return real(&NLS2_GetLocale, "NLS2_GetLocale")(
        NLS2_BY_CODEPAGE, byDefault ? fake().defaultCodepage : codepage, flags, status);
}

void NLS2_ReleaseLocale(NLS2_LOCALE* locale) {
    int status = NLS2_OK;
    fake().note("ReleaseLocale(" + std::to_string(NLS2_GetLocaleCodepageId(locale, &status)) + ")");
    ++fake().released;
    real(&NLS2_ReleaseLocale, "NLS2_ReleaseLocale")(locale);
}

unsigned NLS2_fromUTF16(NLS2_LOCALE* locale, const unsigned short* text, unsigned length, char* out,
                        unsigned capacity, int* status) {
    fake().note("fromUTF16(" + std::to_string(length) + ", " + std::to_string(capacity) + ")");
    const unsigned written = real(&NLS2_fromUTF16, "NLS2_fromUTF16")(
        locale, text, length, out, std::min(capacity, fake().writtenAtMost.load()), status);
    return written;
}

unsigned NLS2_toUTF16(NLS2_LOCALE* locale, const char* text, unsigned length, unsigned short* out,
                      unsigned capacity, int* status) {
    fake().note("toUTF16(" + std::to_string(length) + ", " + std::to_string(capacity) + ")");
    return real(&NLS2_toUTF16, "NLS2_toUTF16")(
        locale, text, length, out, std::min(capacity, fake().writtenAtMost.load()), status);
}

namespace {

class StringLocale : public testing::Test {
protected:
    /// Opens the process's locale, which has that code page.
    static bool initializeWith(int codepage) {
        fake().defaultCodepage = codepage;
        return String::initialize();
    }
    void SetUp() override {
        initializeWith(NLS2_CP_UTF8);
        narrow(String("the first conversion opens a locale"));
        takeCalls();
    }
    void TearDown() override { fake().writtenAtMost = 0xFFFFFFFFu; }
};

TEST_F(StringLocale, IsTheProcessesOwn) {
    const TraceCapture trace;
    EXPECT_TRUE(initializeWith(1252));
    EXPECT_EQ(takeCalls(), (Calls{"ReleaseLocale(1208)", "GetLocale(0, 0, 0)"}));
    EXPECT_EQ(trace.details("zavstr"), (Calls{"codepage=1252"}));
    EXPECT_EQ(unitsOf(String("\x80")), Units({0x20AC}));
}

TEST_F(StringLocale, WidensCodePage943) {
    const TraceCapture trace;
    EXPECT_TRUE(initializeWith(943));
    EXPECT_EQ(takeCalls(),
              (Calls{"ReleaseLocale(1208)", "GetLocale(0, 0, 0)", "GetLocale(25690123, 932, 0)"}));
    EXPECT_EQ(trace.details("zavstr"),
              (Calls{"codepage=943", "codepage NLS2_CP943 detected, switching to NLS2_CP932"}));
    initializeWith(NLS2_CP_UTF8);
    EXPECT_EQ(takeCalls()[0], "ReleaseLocale(932)");
}

TEST_F(StringLocale, WidensCodePage33722) {
    const TraceCapture trace;
    EXPECT_TRUE(initializeWith(33722));
    EXPECT_EQ(takeCalls(),
              (Calls{"ReleaseLocale(1208)", "GetLocale(0, 0, 0)", "GetLocale(25690123, 1208, 0)"}));
    EXPECT_EQ(trace.details("zavstr"),
              (Calls{"codepage=33722", "codepage 33722 detected, switching to 1208"}));
    EXPECT_EQ(unitsOf(String("\xC3\xA9")), Units({0xE9}));
}

TEST_F(StringLocale, FailsWhenThereIsNone) {
    const TraceCapture trace;
    EXPECT_FALSE(initializeWith(0));
    EXPECT_EQ(trace.details("zavstr"), (Calls{"codepage=0"}));
    EXPECT_EQ(String("abc").length(), 0u);
    EXPECT_EQ(narrow(fromUnits({'a'})), "");
}

TEST_F(StringLocale, ConversionsPassTheGivenCapacities) {
    const String text("abc");
    text.c_str();
    EXPECT_EQ(takeCalls(), (Calls{"toUTF16(4, 4)", "fromUTF16(4, 4)"}));
}

TEST_F(StringLocale, WhatAConversionLeftIsTerminated) {
    const String whole("abcdef");
    for (unsigned written = 0; written <= 8; ++written) {
        fake().writtenAtMost = written;
        const std::string expected = std::string("abcdef").substr(0, written);
        ASSERT_EQ(narrow(whole), expected);
        const String cut("abcdef");
        ASSERT_EQ(cut.length(), expected.size());
        ASSERT_TRUE(isTerminated(cut));
        unsigned short* const units = String::createUnicodeString("abcdef");
        ASSERT_EQ(units[expected.size()], 0);
        String::releaseUnicodeString(units);
    }
}

/// Cases that begin in a process which has not converted anything.
class StringFirstConversion : public testing::Test {
protected:
    void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
    [[noreturn]] static void finish() { std::_Exit(testing::Test::HasFailure() ? 1 : 0); }
};

void openOnce() {
    const String text("abc");
    narrow(text);
    EXPECT_EQ(takeCalls(), (Calls{"GetLocale(0, 0, 0)", "toUTF16(4, 4)", "fromUTF16(4, 4)"}));
}

TEST_F(StringFirstConversion, OpensTheLocaleOnce) {
    EXPECT_EXIT((openOnce(), finish()), testing::ExitedWithCode(0), "");
}

void retry() {
    fake().defaultCodepage = 0;
    EXPECT_EQ(String("abc").length(), 0u);
    EXPECT_EQ(narrow(fromUnits({'a'})), "");
    fake().defaultCodepage = NLS2_CP_UTF8;
    EXPECT_EQ(String("abc").length(), 3u);
    EXPECT_EQ(narrow(fromUnits({'a'})), "a");
    EXPECT_EQ(takeCalls(),
              (Calls{"GetLocale(0, 0, 0)", "toUTF16(4, 4)", "GetLocale(0, 0, 0)", "fromUTF16(2, 2)",
                     "GetLocale(0, 0, 0)", "toUTF16(4, 4)", "fromUTF16(2, 2)"}));
}

TEST_F(StringFirstConversion, IsTriedAgainAfterAFailure) {
    EXPECT_EXIT((retry(), finish()), testing::ExitedWithCode(0), "");
}

void openAgain() {
    EXPECT_TRUE(String::initialize());
    const String text("abc");
    EXPECT_EQ(takeCalls(), (Calls{"GetLocale(0, 0, 0)", "ReleaseLocale(1208)", "GetLocale(0, 0, 0)",
                                  "toUTF16(4, 4)"}));
}

TEST_F(StringFirstConversion, OpensItsOwnAfterAnExplicitInitialization) {
    EXPECT_EXIT((openAgain(), finish()), testing::ExitedWithCode(0), "");
}

void race() {
    std::atomic<int> ready{0};
    std::vector<std::thread> threads;
    std::atomic<int> wrong{0};
    constexpr int kThreads = 8;
    for (int i = 0; i < kThreads; ++i) {
        threads.emplace_back([&] {
            ++ready;
            while (ready < kThreads)
                std::this_thread::yield();
            for (int turn = 0; turn < 100; ++turn) {
                const String text("caf\xC3\xA9!");
                if (text.length() != 5 || narrow(text) != "caf\xC3\xA9!") ++wrong;
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(fake().opened, 1) << "a thread did not wait for another's locale";
    EXPECT_EQ(fake().released, 0) << "a locale was taken from a thread that uses it";
}

TEST_F(StringFirstConversion, OfSeveralThreadsLosesNoLocale) {
    EXPECT_EXIT((race(), finish()), testing::ExitedWithCode(0), "");
}

}  // namespace
