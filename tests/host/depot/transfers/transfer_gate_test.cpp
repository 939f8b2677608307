// ctest-label: threaded
#include "host/depot/transfers/transfer_gate.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <optional>
#include <thread>
#include <vector>

#include "host/depot/transfers/transfer_call.h"
#include "host/depot/transfers/transfer_parameters.h"
#include "support/scratch_dir.h"

namespace {

using host_test::Parameters;

class AGate : public testing::Test {
protected:
    explicit AGate(bool guarded = true) {
        scratch_.makeDir("home/tmp");
        scratch_.makeDir("home/zavhost");
        rules_.emplace(depot_, scratch_.path("home"), host::CodePage("UTF-8"), guarded);
        gate_.emplace(*rules_);
    }
    /// A batch as it goes through the gate; the plug-in's status, or 6 when it was refused.
    int send(std::uint64_t association, const std::string& name, bool first, bool last,
             int status = 0) {
        Parameters given = batch(association, name, first, last);
        const ncs::Call call = given.call();
        const auto refused = gate_->before(call);
        if (refused) return host::statusOfReply(*refused);
        gate_->after(call, host::transferReply(status));
        return status;
    }
    static Parameters batch(std::uint64_t association, const std::string& name, bool first,
                            bool last) {
        Parameters given;
        given.association = association;
        given.name = name;
        given.firstBatch = first ? 1 : 0;
        given.chunks = {last ? 1U : 4096U};
        return given;
    }

    ScratchDir scratch_;
    host::Depot depot_{scratch_.makeDir("home/depot"), {scratch_.path("home/zavhost")}};
    std::optional<host::TransferRules> rules_;
    std::optional<host::TransferGate> gate_;
};

TEST_F(AGate, CountsFilesBytesAndFailures) {
    metrics::ByLabel<metrics::Counter> refusals({"depot-transfers"});
    gate_.emplace(*rules_, &refusals);
    EXPECT_EQ(send(1, "a", true, false), 0);
    EXPECT_EQ(send(1, "a", false, true), 0);
    EXPECT_EQ(gate_->counts().begun.value(), 1U);
    EXPECT_EQ(gate_->counts().bytes.value(), 4097U);
    EXPECT_EQ(gate_->counts().failed.value(), 0U);
    EXPECT_EQ(send(1, "b", true, false, 4), 4);
    EXPECT_EQ(gate_->counts().begun.value(), 2U);
    EXPECT_EQ(gate_->counts().bytes.value(), 4097U);
    EXPECT_EQ(gate_->counts().failed.value(), 1U);
    EXPECT_EQ(send(1, "c", true, false), 0);
    EXPECT_EQ(send(2, "c", true, true), 6);
    EXPECT_EQ(gate_->counts().begun.value(), 4U);
    EXPECT_EQ(gate_->counts().failed.value(), 2U);
    EXPECT_EQ(refusals.at("depot-transfers").value(), 1U);
}

TEST_F(AGate, LetsOneClientAtATimeSendAFile) {
    EXPECT_EQ(send(1, "a", true, false), 0);
    EXPECT_EQ(send(2, "a", true, false), 6);
    EXPECT_EQ(send(2, "a", false, false), 6) << "nor may it append";
    EXPECT_EQ(send(2, "b", true, false), 0);
    EXPECT_EQ(send(1, "a", false, true), 0);
    EXPECT_EQ(send(2, "a", true, true), 0);
}

TEST_F(AGate, KnowsAFileUnderAllItsNames) {
    scratch_.makeDir("home/depot/real");
    ASSERT_EQ(::symlink("real", scratch_.path("home/depot/link").c_str()), 0);
    EXPECT_EQ(send(1, "real/a", true, false), 0);
    for (const char* name : {"/real/a", "real\\a", "link/a", "./real//a", "real/../real/a"})
        EXPECT_EQ(send(2, name, true, false), 6) << name;
}

TEST_F(AGate, KnowsAFileWhoseDirectoryIsYetToBeMade) {
    EXPECT_EQ(send(1, "new/a", true, false), 0);
    EXPECT_EQ(send(2, "new/a", true, false), 6);
    scratch_.makeDir("home/depot/new");
    EXPECT_EQ(send(2, "new/a", true, false), 6);
}

TEST_F(AGate, TakesATransferAsOverWithTheNextFileOfItsClient) {
    EXPECT_EQ(send(1, "a", true, false), 0);
    EXPECT_EQ(send(1, "b", true, false), 0);
    EXPECT_EQ(send(2, "a", true, true), 0);
}

TEST_F(AGate, TakesATransferAsOverWithItsAssociation) {
    EXPECT_EQ(send(1, "a", true, false), 0);
    gate_->ended(1);
    EXPECT_EQ(send(2, "a", true, true), 0);
}

TEST_F(AGate, TakesATransferAsOverWhenABatchFails) {
    EXPECT_EQ(send(1, "a", true, false, 5), 5);
    EXPECT_EQ(send(2, "a", true, true), 0);
}

TEST_F(AGate, SaysWhatStandsAgainstAPush) {
    send(1, "sub/a", true, false);
    const auto at = [this](const char* name) { return rules_->destination(name); };
    EXPECT_EQ(gate_->objectionTo("sub/a", at("sub/a"))->guard, "depot-transfers");
    EXPECT_FALSE(gate_->objectionTo("sub/b", at("sub/b")));
    EXPECT_TRUE(gate_->isReceiving(at("sub/a")));
    EXPECT_TRUE(gate_->isReceiving(at("sub")));
    EXPECT_FALSE(gate_->isReceiving(at("su")));
}

TEST_F(AGate, RefusesWhatTheRulesForbid) {
    EXPECT_EQ(send(1, "bad\xFFname", true, true), 6);
}

TEST_F(AGate, RefusesTheHostsOwnFilesInADepotThatHoldsThem) {
    const host::Depot home(scratch_.path("home"), {scratch_.path("home/zavhost")});
    const host::TransferRules rules(home, scratch_.path("home"), host::CodePage("UTF-8"), true);
    gate_.emplace(rules);
    ASSERT_EQ(::symlink("../zavhost", scratch_.path("home/depot/link").c_str()), 0);
    for (const char* name : {"zavhost/a", "depot/link/a", "depot/../zavhost/new/a"})
        EXPECT_EQ(send(1, name, true, true), 6) << name;
    EXPECT_EQ(send(1, "depot/a", true, true), 0);
    gate_.emplace(*rules_);
}

TEST_F(AGate, LeavesTwoFilesOfOneNameInTwoDirectoriesAlone) {
    EXPECT_EQ(send(1, "one/a", true, false), 0);
    EXPECT_EQ(send(2, "two/a", true, false), 0);
    EXPECT_EQ(send(1, "one/a", false, true), 0);
    EXPECT_EQ(send(2, "two/a", false, true), 0);
}

TEST_F(AGate, LeavesWhatItDoesNotUnderstandToTheStub) {
    Parameters given;
    ncs::Call call = given.call();
    call.length = 10;
    EXPECT_FALSE(gate_->before(call));
    call = given.call();
    call.interface = "another";
    EXPECT_FALSE(gate_->before(call));
}

TEST_F(AGate, LetsOnlyOneOfManyBegin) {
    std::atomic<int> begun{0};
    std::vector<std::thread> threads;
    for (std::uint64_t association = 1; association <= 8; ++association) {
        threads.emplace_back([&, association] {
            if (send(association, "a", true, false) == 0) ++begun;
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(begun, 1);
}

class AnUnguardedGate : public AGate {
protected:
    AnUnguardedGate() : AGate(false) {}
};

TEST_F(AnUnguardedGate, LetsTransfersMix) {
    EXPECT_EQ(send(1, "a", true, false), 0);
    EXPECT_EQ(send(2, "a", true, false), 0);
    EXPECT_FALSE(gate_->objectionTo("a", rules_->destination("a")));
}

TEST_F(AnUnguardedGate, StillProtectsTheHostsOwnFiles) {
    const host::Depot home(scratch_.path("home"), {scratch_.path("home/zavhost")});
    const host::TransferRules rules(home, scratch_.path("home"), host::CodePage("UTF-8"), false);
    gate_.emplace(rules);
    EXPECT_EQ(send(1, "zavhost/a", true, true), 6);
    gate_.emplace(*rules_);
}

}  // namespace
