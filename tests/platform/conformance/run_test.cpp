#include "conformance/run.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "conformance/rule.h"
#include "support/scratch_dir.h"

using conformance::Bench;
using conformance::Operation;
using conformance::Rule;

/// The rules of these tests need no driver; one that asks for it finds nothing offered.
std::unique_ptr<conformance::Driver> conformance::makeDriver() {
    return std::make_unique<conformance::Driver>();
}

namespace {

using namespace std::chrono_literals;

std::string complaintOf(std::function<void(Bench&)> check, std::chrono::milliseconds limit = 30s) {
    return conformance::run({"does", std::move(check)}, limit);
}

TEST(ARule, ThatFindsNothingWrongHasNoComplaint) {
    EXPECT_EQ(complaintOf([](Bench&) {}), "");
}

TEST(ARule, SaysWhatItFound) {
    EXPECT_EQ(complaintOf([](Bench&) { conformance::requireEqual(3, 4, "the value"); }),
              "the value is 3 instead of 4");
    EXPECT_EQ(complaintOf([](Bench&) { conformance::require(false, "it is broken"); }),
              "it is broken");
}

TEST(ARule, ThatNeedsWhatTheDriverDoesNotOfferIsBroken) {
    EXPECT_EQ(complaintOf([](Bench& bench) { bench.driver().query("TABLE", {}); }),
              "the driver offers no queries");
    EXPECT_EQ(complaintOf([](Bench& bench) { bench.driver().subscribe("TABLE", {}, nullptr); }),
              "the driver offers no subscriptions");
    EXPECT_EQ(complaintOf([](Bench& bench) { bench.driver().call({}, 1, 0, ""); }),
              "the driver offers no remote calls");
    EXPECT_EQ(complaintOf([](Bench& bench) {
                  bench.driver().captureTrace(conformance::Selection::Everything);
              }),
              "the driver offers no look at traces");
}

TEST(ARule, ThatCrashesIsBroken) {
    EXPECT_EQ(complaintOf([](Bench&) { ::raise(SIGKILL); }), "ended by Killed");
}

TEST(ARule, ThatEndsItsProcessIsBrokenWhateverTheStatus) {
    EXPECT_EQ(complaintOf([](Bench&) { ::_exit(0); }), "ended the process with status 0");
}

TEST(ARule, ThatDoesNotReturnIsEndedWithWhatItStarted) {
    int ends[2];
    ASSERT_EQ(::pipe(ends), 0);
    const auto hang = [](Bench&) {
        ::fork();
        for (;;)
            ::pause();
    };
    EXPECT_EQ(complaintOf(hang, 50ms), "did not return within 50 ms");
    // The pipe ends once nobody who was started has it open any more.
    ::close(ends[1]);
    char byte = 0;
    EXPECT_EQ(::read(ends[0], &byte, 1), 0);
    ::close(ends[0]);
}

TEST(ARule, HasAnEmptyDirectoryThatGoesWithIt) {
    const ScratchDir scratch;
    const std::string note = scratch.path("note");
    EXPECT_EQ(complaintOf([&](Bench& bench) {
                  std::ofstream(note) << bench.scratch();
                  std::ofstream(bench.scratch() + "/file") << "text";
              }),
              "");
    const std::string directory = scratch.read("note");
    EXPECT_NE(directory, "");
    EXPECT_NE(::access(directory.c_str(), F_OK), 0);
}

TEST(ARule, LeavesNothingToTheNextOne) {
    static int count = 0;
    const auto check = [](Bench&) { conformance::requireEqual(++count, 1, "the count"); };
    EXPECT_EQ(complaintOf(check), "");
    EXPECT_EQ(complaintOf(check), "");
}

TEST(AVerdict, OnAnOperationWhosePromisesAreKeptIsOneLine) {
    const conformance::Verdict verdict = conformance::judge({"open", {{"works", [](Bench&) {}}}});
    EXPECT_TRUE(verdict.fulfilled);
    EXPECT_EQ(verdict.line, "ok    open");
}

TEST(AVerdict, NamesEveryBrokenPromiseInOneLine) {
    const Rule kept{"is kept", [](Bench&) {}};
    const Rule broken{"is broken", [](Bench&) { conformance::require(false, "it is"); }};
    const Rule crashed{"crashes", [](Bench&) { ::raise(SIGKILL); }};
    const conformance::Verdict verdict =
        conformance::judge(Operation{"open", {broken, kept, crashed}});
    EXPECT_FALSE(verdict.fulfilled);
    EXPECT_EQ(verdict.line, "FAIL  open: is broken (it is); crashes (ended by Killed)");
}

TEST(Values, AreShownSoThatAReaderCanTellThem) {
    EXPECT_EQ(conformance::shown(std::string("a\0\xFF", 3)), "\"a\\x00\\xFF\"");
    EXPECT_EQ(conformance::shown(std::string(100, 'x')), "\"" + std::string(60, 'x') + "...\"");
    EXPECT_EQ(conformance::shown(static_cast<const char*>(nullptr)), "null");
    EXPECT_EQ(conformance::shown(std::vector<int>{1, 2}), "{1, 2}");
    EXPECT_EQ(conformance::shown(true), "true");
}

TEST(Operations, HaveDifferentNamesAndRules) {
    std::set<std::string> names;
    for (const Operation& operation : conformance::allOperations()) {
        EXPECT_TRUE(names.insert(operation.name).second) << operation.name;
        EXPECT_FALSE(operation.rules.empty()) << operation.name;
    }
}

}  // namespace
