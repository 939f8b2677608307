// A journal that does not do what it promises is found out by the comparison that shows that the
// real one does.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "crash/killed_host.h"

namespace {

using testing::Contains;
using testing::HasSubstr;

/// A host whose journal is sabotaged in this way.
class Sabotaged : public KilledHost {
protected:
    explicit Sabotaged(const char* way)
        : KilledHost(
              {{"LD_PRELOAD", ZAV_BUILD_DIR "/lib/libzav_sabotage.so"}, {"ZAV_SABOTAGE", way}}) {}

    /// Loads and kills it until the comparison finds this, but not for ever.
    std::vector<std::string> faultsUntil(const std::string& fault) {
        std::vector<std::string> found;
        for (int round = 0; round < 20; ++round) {
            loadAndKill(round, std::chrono::milliseconds(100));
            // Such a journal may never come to rest.
            eventually([this] { return isIdle(); });
            found = faults();
            for (const std::string& each : found) {
                if (each.find(fault) != std::string::npos) return found;
            }
        }
        return found;
    }
};

class SkippedCommits : public Sabotaged {
protected:
    SkippedCommits() : Sabotaged("skip-commits") {}
};

TEST_F(SkippedCommits, AreSeenAsTasksThatAreMissing) {
    constexpr const char* kFault = "was accepted and is missing";
    EXPECT_THAT(faultsUntil(kFault), Contains(HasSubstr(kFault)));
}

class ReversedOrder : public Sabotaged {
protected:
    ReversedOrder() : Sabotaged("reverse-order") {}
};

TEST_F(ReversedOrder, IsSeenAsTasksThatRanOutOfTheirTurn) {
    constexpr const char* kFault = "ran out of its turn";
    EXPECT_THAT(faultsUntil(kFault), Contains(HasSubstr(kFault)));
}

class LostOutcomes : public Sabotaged {
protected:
    LostOutcomes() : Sabotaged("lose-outcomes") {}
};

TEST_F(LostOutcomes, AreSeenAsTasksThatRanTwice) {
    constexpr const char* kFault = "began 2 times";
    EXPECT_THAT(faultsUntil(kFault), Contains(HasSubstr(kFault)));
}

class ForgottenHandOvers : public Sabotaged {
protected:
    ForgottenHandOvers() : Sabotaged("forget-hand-overs") {}
};

TEST_F(ForgottenHandOvers, AreSeenAsTasksThatRanTwice) {
    constexpr const char* kFault = "began 2 times";
    EXPECT_THAT(faultsUntil(kFault), Contains(HasSubstr(kFault)));
}

}  // namespace
