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
    EXPECT_EQ("", complaintOf([](Bench&) {}));
}

TEST(ARule, SaysWhatItFound) {
    EXPECT_EQ("the value is 3 instead of 4",
              complaintOf([](Bench&) { conformance::requireEqual(3, 4, "the value"); }));
    EXPECT_EQ("it is broken",
              complaintOf([](Bench&) { conformance::require(false, "it is broken"); }));
}

TEST(ARule, ThatNeedsWhatTheDriverDoesNotOfferIsBroken) {
    EXPECT_EQ("the driver offers no queries",
              complaintOf([](Bench& bench) { bench.driver().query("TABLE", {}); }));
    EXPECT_EQ("the driver offers no subscriptions",
              complaintOf([](Bench& bench) { bench.driver().subscribe("TABLE", {}, nullptr); }));
    EXPECT_EQ("the driver offers no remote calls",
              complaintOf([](Bench& bench) { bench.driver().call({}, 1, 0, ""); }));
    EXPECT_EQ("the driver offers no look at traces", complaintOf([](Bench& bench) {
                  bench.driver().captureTrace(conformance::Selection::Everything);
              }));
}

TEST(ARule, ThatCrashesIsBroken) {
    EXPECT_EQ("ended by Killed", complaintOf([](Bench&) { ::raise(SIGKILL); }));
}

TEST(ARule, ThatEndsItsProcessIsBrokenWhateverTheStatus) {
    EXPECT_EQ("ended the process with status 0", complaintOf([](Bench&) { ::_exit(0); }));
}

TEST(ARule, ThatDoesNotReturnIsEndedWithWhatItStarted) {
    int ends[2];
    ASSERT_EQ(0, ::pipe(ends));
    const auto hang = [](Bench&) {
        ::fork();
        for (;;)
            ::pause();
    };
    EXPECT_EQ("did not return within 50 ms", complaintOf(hang, 50ms));
    // The pipe ends once nobody who was started has it open any more.
    ::close(ends[1]);
    char byte = 0;
    EXPECT_EQ(0, ::read(ends[0], &byte, 1));
    ::close(ends[0]);
}

TEST(ARule, HasAnEmptyDirectoryThatGoesWithIt) {
    const ScratchDir scratch;
    const std::string note = scratch.path("note");
    EXPECT_EQ("", complaintOf([&](Bench& bench) {
                  std::ofstream(note) << bench.scratch();
                  std::ofstream(bench.scratch() + "/file") << "text";
              }));
    const std::string directory = scratch.read("note");
    EXPECT_NE("", directory);
    EXPECT_NE(0, ::access(directory.c_str(), F_OK));
}

TEST(ARule, LeavesNothingToTheNextOne) {
    static int count = 0;
    const auto check = [](Bench&) { conformance::requireEqual(++count, 1, "the count"); };
    EXPECT_EQ("", complaintOf(check));
    EXPECT_EQ("", complaintOf(check));
}

TEST(AVerdict, OnAnOperationWhosePromisesAreKeptIsOneLine) {
    const conformance::Verdict verdict = conformance::judge({"open", {{"works", [](Bench&) {}}}});
    EXPECT_TRUE(verdict.fulfilled);
    EXPECT_EQ("ok    open", verdict.line);
}

TEST(AVerdict, NamesEveryBrokenPromiseInOneLine) {
    const Rule kept{"is kept", [](Bench&) {}};
    const Rule broken{"is broken", [](Bench&) { conformance::require(false, "it is"); }};
    const Rule crashed{"crashes", [](Bench&) { ::raise(SIGKILL); }};
    const conformance::Verdict verdict =
        conformance::judge(Operation{"open", {broken, kept, crashed}});
    EXPECT_FALSE(verdict.fulfilled);
    EXPECT_EQ("FAIL  open: is broken (it is); crashes (ended by Killed)", verdict.line);
}

TEST(Values, AreShownSoThatAReaderCanTellThem) {
    EXPECT_EQ("\"a\\x00\\xFF\"", conformance::shown(std::string("a\0\xFF", 3)));
    EXPECT_EQ("\"" + std::string(60, 'x') + "...\"", conformance::shown(std::string(100, 'x')));
    EXPECT_EQ("null", conformance::shown(static_cast<const char*>(nullptr)));
    EXPECT_EQ("{1, 2}", conformance::shown(std::vector<int>{1, 2}));
    EXPECT_EQ("true", conformance::shown(true));
}

TEST(Operations, HaveDifferentNamesAndRules) {
    std::set<std::string> names;
    for (const Operation& operation : conformance::allOperations()) {
        EXPECT_TRUE(names.insert(operation.name).second) << operation.name;
        EXPECT_FALSE(operation.rules.empty()) << operation.name;
    }
}

}  // namespace
