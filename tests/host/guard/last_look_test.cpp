// A request that is handed over right after it came costs one look at the machine.
#include "host/guard/last_look.h"

#include <filesystem>

#include "host/guard/guard_fixture.h"

namespace {

using Clock = host::LastLook::Clock;
using std::chrono::milliseconds;

class LastLook : public GuardTest {
protected:
    LastLook() { translator("printf '%s\\n' \"${2%%:*}\""); }

    void comes(const Conditions& conditions, bool mayChange = false) {
        host::CommandRequest request(conditions, false);
        guards->admitEarly(request, mayChange);
    }
    std::size_t looksAtHandOver(const Conditions& conditions) {
        const std::size_t before = inventories();
        admitted(conditions);
        return inventories() - before;
    }

    struct Looks {
        std::size_t early;
        std::size_t atHandOver;
    };
    /// How often the machine is looked at for a request that is handed over as soon as it has come.
    /// Where that took longer than a look holds, it is done anew with guards that know of nothing.
    Looks looksAtOnce(const Conditions& conditions) {
        for (int rounds = 1;; ++rounds) {
            const Clock::time_point begin = Clock::now();
            const std::size_t before = inventories();
            comes(conditions);
            const std::size_t early = inventories() - before;
            const Looks looks{early, looksAtHandOver(conditions)};
            if (Clock::now() - begin <= host::LastLook::kHolds || rounds == 100) return looks;
            std::filesystem::remove(files.path("calls"));
            guards.emplace(host::Site{page, files.path("home"), files.path("depot")}, *tasks);
        }
    }

    const Conditions start = command("START", "ux", {{"TARGETMSN", "inst1:elsewhere:UX"}});
    const Conditions stop = command("STOP", "ux", {{"TARGETMSN", "inst1:elsewhere:UX"}});
};

TEST_F(LastLook, IsEnoughForARequestThatIsHandedOverAtOnce) {
    const Looks looks = looksAtOnce(start);
    EXPECT_EQ(looks.early, 1U);
    EXPECT_EQ(looks.atHandOver, 0U);
    EXPECT_EQ(files.read("calls"), "-i inst1:elsewhere:UX -pc ux\n")
        << "nor is the target asked again";
}

TEST_F(LastLook, IsGoodOnce) {
    EXPECT_EQ(looksAtOnce(start).atHandOver, 0U);
    EXPECT_EQ(looksAtHandOver(start), 1U);
}

TEST_F(LastLook, OfAnotherRequestDoesNotCount) {
    comes(start);
    EXPECT_EQ(looksAtHandOver(stop), 1U);
    EXPECT_EQ(looksAtHandOver(start), 1U) << "something was handed over in between";
}

TEST_F(LastLook, IsNotKeptWhileATaskIsAtWork) {
    accept("START", "um");
    comes(start);
    finish();
    EXPECT_EQ(looksAtHandOver(start), 1U) << "the task may have changed what there is";
}

TEST_F(LastLook, ThatLeftTheMachineOutIsNone) {
    comes(start, true);
    EXPECT_EQ(inventories(), 0U);
    EXPECT_EQ(looksAtHandOver(start), 1U);
}

TEST_F(LastLook, OfARequestThatWasRefusedIsNone) {
    const Conditions missing = command("START", "zz");
    EXPECT_THROW(comes(missing), host::Refusal);
    EXPECT_EQ(looksAtHandOver(start), 1U);
    EXPECT_EQ(refuser(missing), "product");
}

class KeptLook : public testing::Test {
protected:
    host::CommandRequest request{{{"COMMAND", OPER_EQ, "START"}}, false};
    host::LastLook look;
    const Clock::time_point now = Clock::now();
};

TEST_F(KeptLook, HoldsForASecond) {
    look.keep(request, now);
    EXPECT_TRUE(look.take(request, now + milliseconds(1000)));
    look.keep(request, now + milliseconds(5000));
    EXPECT_FALSE(look.take(request, now + milliseconds(6001)));
}

TEST_F(KeptLook, IsForTheSameConditionsWithTheSameForce) {
    const host::CommandRequest others[] = {
        {{{"COMMAND", OPER_NE, "START"}}, false},
        {{{"COMMAND", OPER_EQ, "STOP"}}, false},
        {{{"PRODUCT", OPER_EQ, "START"}}, false},
        {{{"COMMAND", OPER_EQ, "START"}, {"PRODUCT", OPER_EQ, "ux"}}, false},
        {{{"COMMAND", OPER_EQ, "START"}}, true},
    };
    int seconds = 0;
    for (const host::CommandRequest& other : others) {
        const Clock::time_point when = now + std::chrono::seconds(seconds += 10);
        look.keep(request, when);
        EXPECT_FALSE(look.take(other, when)) << seconds;
    }
}

TEST_F(KeptLook, DoesNotCountSoonAfterAHandOver) {
    EXPECT_FALSE(look.take(request, now));
    look.keep(request, now + milliseconds(999));
    EXPECT_FALSE(look.take(request, now + milliseconds(999)))
        << "what was handed over may be in the middle of its work";
    look.keep(request, now + milliseconds(1999));
    EXPECT_TRUE(look.take(request, now + milliseconds(1999)));
}

}  // namespace
