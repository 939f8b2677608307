// The guard of the universal agent's start-up parameters.
#include "host/guard/parameter_keeper.h"

#include <algorithm>

#include "host/guard/guard_fixture.h"
#include "host/guard/guards.h"

namespace {

using host::CommandRequest;
using host::ParameterKeeper;

class StartUpParameters : public GuardTest {
protected:
    StartUpParameters() { change("old\n"); }

    std::unique_ptr<ParameterKeeper::Hold> hold(const std::string& name = "SETCONFIG",
                                                const std::string& product = "um") {
        return keeper.hold(CommandRequest(command(name, product), false));
    }
    void change(const std::string& text) const {
        files.write("home/config/.ConfigData/kumenv", text);
    }
    /// What would be restored; "" when nothing would.
    std::string saved() const { return files.exists(kCopy) ? files.read(kCopy) : std::string(); }

    static constexpr const char* kCopy = "home/config/.ConfigData/.kumenv.saved";
    ParameterKeeper keeper{files.path("home"), *feed, *tasks};
};

TEST_F(StartUpParameters, AreSavedUntilTheTaskIsOver) {
    {
        const auto held = hold();
        EXPECT_EQ(saved(), "old\n");
        accept("SETCONFIG", "um");
    }
    EXPECT_EQ(saved(), "old\n") << "the task waits or runs";
    change("half");
    finish();
    EXPECT_EQ(saved(), "");
}

TEST_F(StartUpParameters, AreNotSavedForOtherRequests) {
    for (const auto& [name, product] : std::vector<std::pair<const char*, const char*>>{
             {"SETCONFIG", "ux"}, {"START", "um"}, {"INSTALL", "um"}}) {
        EXPECT_EQ(hold(name, product), nullptr) << name << product;
        EXPECT_EQ(saved(), "");
    }
    EXPECT_NE(hold("SETCONFIG", "UM"), nullptr);
}

TEST_F(StartUpParameters, AreDroppedWhenTheRequestIsNotAccepted) {
    {
        const auto held = hold();
        EXPECT_EQ(saved(), "old\n");
    }
    EXPECT_EQ(saved(), "");
}

TEST_F(StartUpParameters, OfTheFirstTaskAreKeptWhileItMayBeChangingThem) {
    {
        const auto held = hold();
        accept("SETCONFIG", "um");
    }
    change("ol");
    const auto next = hold();
    EXPECT_EQ(saved(), "old\n");
}

TEST_F(StartUpParameters, AreSavedAnewBetweenTwoTasks) {
    {
        const auto held = hold();
        accept("SETCONFIG", "um");
    }
    {
        const auto next = hold();
        change("of the first\n");
        finish();
        EXPECT_EQ(saved(), "of the first\n") << "the second one is on its way";
    }
    EXPECT_EQ(saved(), "") << "and was not accepted";
}

TEST_F(StartUpParameters, ThatCannotBeSavedRefuseTheRequest) {
    files.makeDir(std::string(kCopy) + "/in the way");
    try {
        hold();
        ADD_FAILURE() << "not refused";
    } catch (const host::Refusal& refusal) {
        EXPECT_EQ(refusal.guard(), "start-up-parameters");
        const std::vector<std::string> counted = host::refusingGuards();
        EXPECT_EQ(std::count(counted.begin(), counted.end(), refusal.guard()), 1);
        EXPECT_EQ(refusal.httpStatus(), 409U);
        EXPECT_NE(std::string(refusal.what()).find("cannot make "), std::string::npos);
    }
}

}  // namespace
